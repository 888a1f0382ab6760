#pragma once
// The tests' hold on a fake native identity library (tests/fixtures): the
// same file the bridge loads, opened again with dlopen so that its control
// functions script and inspect the very copy the bridge calls. Also
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

class FakeOvraLibrary {
public:
    // Throws std::runtime_error if the file cannot be loaded.
    explicit FakeOvraLibrary(const std::string& path);

    void SetStatus(const char* function, int status) const { mSetStatus(function, status); }
    void SetCallbackStatus(const char* function, int status) const { mSetCallbackStatus(function, status); }
    void SetText(const char* function, const char* text) const { mSetText(function, text); }
    void HoldCallbacks(bool hold) const { mHoldCallbacks(hold ? 1 : 0); }
    // True once every queued callback has returned (30 s at most).
    bool WaitUntilIdle() const { return mWaitUntilIdle(30000) != 0; }
    int Calls(const char* function) const { return mCallCount(function); }
    // Argument `index` of the function's last call; "<no call>" if none.
    std::string Argument(const char* function, int index) const;

private:
    void* mHandle;
    FakeOvra_SetStatus_Function mSetStatus;
    FakeOvra_SetCallbackStatus_Function mSetCallbackStatus;
    FakeOvra_SetText_Function mSetText;
    FakeOvra_HoldCallbacks_Function mHoldCallbacks;
    FakeOvra_WaitUntilIdle_Function mWaitUntilIdle;
    FakeOvra_CallCount_Function mCallCount;
    FakeOvra_CopyArgument_Function mCopyArgument;
};

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
