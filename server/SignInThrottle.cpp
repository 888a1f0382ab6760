#include "server/SignInThrottle.h"

#include <algorithm>
#include <thread>

namespace tolmonetsync {
namespace server {

namespace {

// A name with no failure for this long starts again from no wait.
const std::chrono::minutes kQuietWhile(15);
const std::size_t kMostNames = 10000;

}  // namespace

SignInThrottle::SignInThrottle(const SignInDelays& delays) : mDelays(delays) {}

std::chrono::milliseconds SignInThrottle::DelayFor(const std::string& name)
{
    std::lock_guard<std::mutex> lock(mMutex);
    const auto found = mFailures.find(name);
    if (found == mFailures.end() || found->second.mCount == 0) return std::chrono::milliseconds(0);
    if (std::chrono::steady_clock::now() - found->second.mLast > kQuietWhile) return std::chrono::milliseconds(0);
    std::chrono::milliseconds delay = std::min(mDelays.mBase, mDelays.mCap);
    // Doubling stops at the cap, so the shift never overflows.
    for (int i = 1; i < found->second.mCount && delay < mDelays.mCap; ++i) delay = std::min(delay * 2, mDelays.mCap);
    return delay;
}

void SignInThrottle::WaitBeforeAttempt(const std::string& name)
{
    const std::chrono::milliseconds delay = DelayFor(name);
    if (delay.count() <= 0) return;
    if (mDelays.mWait) {
        mDelays.mWait(delay);
    } else {
        std::this_thread::sleep_for(delay);
    }
}

void SignInThrottle::Failed(const std::string& name)
{
    const auto now = std::chrono::steady_clock::now();
    std::lock_guard<std::mutex> lock(mMutex);
    if (mFailures.size() >= kMostNames && mFailures.find(name) == mFailures.end()) ForgetQuietNames(now);
    Failures& failures = mFailures[name];
    if (now - failures.mLast > kQuietWhile) failures.mCount = 0;
    ++failures.mCount;
    failures.mLast = now;
}

void SignInThrottle::Succeeded(const std::string& name)
{
    std::lock_guard<std::mutex> lock(mMutex);
    mFailures.erase(name);
}

void SignInThrottle::ForgetQuietNames(std::chrono::steady_clock::time_point now)
{
    for (auto entry = mFailures.begin(); entry != mFailures.end();) {
        entry = now - entry->second.mLast > kQuietWhile ? mFailures.erase(entry) : std::next(entry);
    }
    // Still full of recent names (someone is trying many): the oldest goes.
    while (mFailures.size() >= kMostNames) {
        const auto oldest = std::min_element(mFailures.begin(), mFailures.end(), [](const auto& a, const auto& b) {
            return a.second.mLast < b.second.mLast;
        });
        mFailures.erase(oldest);
    }
}

}  // namespace server
}  // namespace tolmonetsync
