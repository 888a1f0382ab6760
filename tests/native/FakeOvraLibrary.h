#pragma once
// The tests' hold on a fake native identity library (tests/fixtures): the
// same file the bridge loads, opened again with dlopen so that the test
// scripts and inspects the very state the bridge's copy uses. Also
// completions that record their calls.
//
// The bridge loads its library once per process, so a test that needs
// another library, or none, is a TEST of its own (ctest runs each alone).

#include <string>

#include <boost/shared_ptr.hpp>

#include "FakeOvraControl.h"
#include "identity/OvraConnection.h"
#include "support/CallRecorder.h"

namespace nativetest {

// The state of the fake at `path`; throws std::runtime_error if it cannot be loaded.
FakeOvraState& LoadFake(const std::string& path);

// A connection as a host holds it, naming the library's path.
boost::shared_ptr<tolmonetsync::OvraConnection> Connect(const std::string& path);

// "name status text" of each call of a completion; "(null)" for no text.
using Completions = testsupport::CallRecorder<std::string>;
tolmonetsync::OvraAsyncCompletionFunction Completion(const Completions& completions, const std::string& name);

inline UTF8String Text(const std::string& text)
{
    return UTF8String(text);
}

}  // namespace nativetest
