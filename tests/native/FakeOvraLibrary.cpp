#include "FakeOvraLibrary.h"

#include <dlfcn.h>

#include <stdexcept>
#include <vector>

namespace nativetest {

namespace {

template <typename Function>
void Take(void* handle, const char* name, Function& function)
{
    function = reinterpret_cast<Function>(dlsym(handle, name));
    if (function == nullptr) throw std::runtime_error(std::string("the fake lacks ") + name);
}

}  // namespace

FakeOvraLibrary::FakeOvraLibrary(const std::string& path)
{
    // The bridge's own flags, so that this is the copy it loads.
    mHandle = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (mHandle == nullptr) throw std::runtime_error("cannot load " + path);
    Take(mHandle, "FakeOvra_SetStatus", mSetStatus);
    Take(mHandle, "FakeOvra_SetCallbackStatus", mSetCallbackStatus);
    Take(mHandle, "FakeOvra_SetText", mSetText);
    Take(mHandle, "FakeOvra_HoldCallbacks", mHoldCallbacks);
    Take(mHandle, "FakeOvra_WaitUntilIdle", mWaitUntilIdle);
    Take(mHandle, "FakeOvra_CallCount", mCallCount);
    Take(mHandle, "FakeOvra_CopyArgument", mCopyArgument);
}

std::string FakeOvraLibrary::Argument(const char* function, int index) const
{
    const long length = mCopyArgument(function, index, nullptr, 0);
    if (length < 0) return "<no call>";
    std::vector<char> buffer(static_cast<std::size_t>(length) + 1);
    mCopyArgument(function, index, buffer.data(), buffer.size());
    return std::string(buffer.data(), static_cast<std::size_t>(length));
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
