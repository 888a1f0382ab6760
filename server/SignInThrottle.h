#pragma once
// Slows the guessing of passwords: after failed sign-ins under a user name,
// each further attempt under that name waits before its password is
// checked, base * 2^(failures - 1), at most the cap. Never a lock-out: the
// right password still signs in, after the wait, and a success clears the
// count. A count is forgotten after a quiet while, and the number of names
// remembered is bounded, so unknown names cannot fill the memory.
//
// The wait holds the request's worker; with the cap at a few seconds that
// is bounded, and other names are not slowed.
//
// Threads: any; one mutex guards the counts, never held while waiting.

#include <chrono>
#include <cstddef>
#include <functional>
#include <map>
#include <mutex>
#include <string>

namespace tolmonetsync {
namespace server {

struct SignInDelays {
    std::chrono::milliseconds mBase{250};
    std::chrono::milliseconds mCap{4000};  // zero: no waiting at all
    // Waits that long; empty: sleeps the calling thread. Tests record here.
    std::function<void(std::chrono::milliseconds)> mWait;
};

class SignInThrottle {
public:
    explicit SignInThrottle(const SignInDelays& delays);

    // The wait that an attempt under that name has before it now.
    std::chrono::milliseconds DelayFor(const std::string& name);
    // Waits DelayFor(name).
    void WaitBeforeAttempt(const std::string& name);
    void Failed(const std::string& name);
    void Succeeded(const std::string& name);

private:
    struct Failures {
        int mCount = 0;
        std::chrono::steady_clock::time_point mLast;
    };
    void ForgetQuietNames(std::chrono::steady_clock::time_point now);

    SignInDelays mDelays;
    std::mutex mMutex;  // guards mFailures
    std::map<std::string, Failures> mFailures;
};

}  // namespace server
}  // namespace tolmonetsync
