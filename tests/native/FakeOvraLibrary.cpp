#include "FakeOvraLibrary.h"

#include <dlfcn.h>

#include <stdexcept>

namespace nativetest {

FakeOvraState& LoadFake(const std::string& path)
{
    // The bridge's own flags, so that this is the copy it loads.
    void* handle = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    const auto state = handle ? reinterpret_cast<FakeOvra_State_Function>(dlsym(handle, "FakeOvra_State")) : nullptr;
    if (state == nullptr) throw std::runtime_error("cannot load the fake at " + path);
    return *state();
}

boost::shared_ptr<tolmonetsync::OvraConnection> Connect(const std::string& path)
{
    return boost::shared_ptr<tolmonetsync::OvraConnection>(new tolmonetsync::OvraConnection(path));
}

tolmonetsync::OvraAsyncCompletionFunction Completion(const Completions& completions, const std::string& name)
{
    return [completions, name](OVRA_STATUS status, const char* text) {
        completions.Add(name + " " + std::to_string(status) + " " + (text != nullptr ? text : "(null)"));
    };
}

}  // namespace nativetest
