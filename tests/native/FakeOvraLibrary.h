#pragma once
// The tests' hold on a fake native identity library (tests/fixtures): the
// same file the bridge loads, opened again with dlopen so that its control
// functions script and inspect the very copy the bridge calls. Also a
// recorder of completions that a test can wait on.
//
// The bridge loads its library once per process, so a test that needs
// another library, or none, is a TEST of its own (ctest runs each alone).

#include <condition_variable>
#include <mutex>
#include <string>

#include <boost/shared_ptr.hpp>

#include "FakeOvraControl.h"
#include "identity/OvraConnection.h"

namespace nativetest {

class FakeOvraLibrary {
public:
    // Throws std::runtime_error if the file cannot be loaded.
    explicit FakeOvraLibrary(const std::string& path);

    void SetStatus(const char* function, int status) const { mSetStatus(function, status); }
    void SetCallbackStatus(const char* function, int status) const { mSetCallbackStatus(function, status); }
    void SetText(const char* function, const char* text) const { mSetText(function, text); }
    void SetCallbackDelay(int milliseconds) const { mSetCallbackDelay(milliseconds); }
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
    FakeOvra_SetCallbackDelay_Function mSetCallbackDelay;
    FakeOvra_HoldCallbacks_Function mHoldCallbacks;
    FakeOvra_WaitUntilIdle_Function mWaitUntilIdle;
    FakeOvra_CallCount_Function mCallCount;
    FakeOvra_CopyArgument_Function mCopyArgument;
};

// A connection as a host holds it, naming the library's path.
boost::shared_ptr<tolmonetsync::OvraConnection> Connect(const std::string& path);

// Records every call of the completions it hands out.
class CompletionRecorder {
public:
    tolmonetsync::OvraAsyncCompletionFunction Function(const std::string& name);
    // Waits (30 s at most) until `count` calls came; true if they did.
    bool WaitForCalls(int count);
    int Calls();
    // "name status text" of each call, one per line; "(null)" for no text.
    std::string Log();

private:
    std::mutex mMutex;
    std::condition_variable mCame;
    int mCalls = 0;
    std::string mLog;
};

inline UTF8String Text(const std::string& text)
{
    return UTF8String(text);
}

}  // namespace nativetest
