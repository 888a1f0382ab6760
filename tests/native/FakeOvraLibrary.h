#pragma once
// The tests' hold on a fake native identity library (tests/fixtures): the
// same file the bridge loads, opened again with dlopen so that the test
// scripts and inspects the very state the bridge's copy uses. Also
// completions that record their calls.
//
// The bridge loads its library once per process, so a test that needs
// another library, or none, is a TEST of its own (ctest runs each alone).

#include <dlfcn.h>

#include <stdexcept>
#include <string>

#include <boost/shared_ptr.hpp>

#include "FakeOvraControl.h"
#include "identity/OvraConnection.h"
#include "support/CallRecorder.h"

namespace nativetest {

// The state of the fake at `path`; throws std::runtime_error if it cannot be loaded.
inline FakeOvraState& LoadFake(const std::string& path)
{
    // The bridge's own flags, so that this is the copy it loads.
    void* handle = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    const auto state = handle ? reinterpret_cast<FakeOvra_State_Function>(dlsym(handle, "FakeOvra_State")) : nullptr;
    if (state == nullptr) throw std::runtime_error("cannot load the fake at " + path);
    return *state();
}

// A connection as a host holds it, naming the library's path.
inline boost::shared_ptr<tolmonetsync::OvraConnection> Connect(const std::string& path)
{
    return boost::shared_ptr<tolmonetsync::OvraConnection>(new tolmonetsync::OvraConnection(path));
}

// "name status text" of each call of a completion; "(null)" for no text.
using Completions = testsupport::CallRecorder<std::string>;
inline tolmonetsync::OvraAsyncCompletionFunction Completion(const Completions& completions, const std::string& name)
{
    return [completions, name](OVRA_STATUS status, const char* text) {
        completions.Add(name + " " + std::to_string(status) + " " + (text != nullptr ? text : "(null)"));
    };
}

inline UTF8String Text(const std::string& text)
{
    return UTF8String(text);
}

using Strings = std::vector<std::string>;

}  // namespace nativetest
