#include "SyncHarness.h"

#include <chrono>
#include <memory>

#include "foundation/core/Strings.h"

namespace synctest {

namespace {

// Gathers callbacks from whatever thread they come on. The pass's callbacks
// may come after an error too; the state says when to stop waiting.
class Waiter {
public:
    void Succeed(const std::function<void(RunResult&)>& fill)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mResult.mFinished = true;
        fill(mResult);
        mDone.notify_all();
    }
    void Fail(const UTF16String& text)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        // Texts are widened byte by byte; narrow them the same way.
        std::string narrow;
        for (char16_t unit : text) narrow.push_back(static_cast<char>(unit));
        if (mResult.mErrorCount++ == 0) mResult.mError = narrow;
        mDone.notify_all();
    }
    // Waits for success or an error; after an error, a little longer for a
    // success that may still follow.
    RunResult Wait(bool started)
    {
        std::unique_lock<std::mutex> lock(mMutex);
        mResult.mStarted = started;
        if (started) {
            mDone.wait_for(lock, std::chrono::seconds(60),
                           [this] { return mResult.mFinished || mResult.mErrorCount > 0; });
            if (!mResult.mFinished)
                mDone.wait_for(lock, std::chrono::milliseconds(200), [this] { return mResult.mFinished; });
        }
        return mResult;
    }

private:
    std::mutex mMutex;
    std::condition_variable mDone;
    RunResult mResult;
};

}  // namespace

RunResult SyncHarness::Prepare(const ItemToFileCallback& itemToFile)
{
    auto waiter = std::make_shared<Waiter>();
    const bool started = mService.PrepareSync(
        [waiter](const boost::shared_ptr<SyncCache>& cache) {
            waiter->Succeed([&](RunResult& result) { result.mCache = cache; });
        },
        [waiter](const UTF16String& text) { waiter->Fail(text); }, ProgressCallback(), itemToFile);
    return waiter->Wait(started);
}

RunResult SyncHarness::Pass(const boost::shared_ptr<SyncCache>& cache, SyncMode mode)
{
    auto waiter = std::make_shared<Waiter>();
    const bool started = mService.DoSync(
        cache, [waiter](int moved) { waiter->Succeed([&](RunResult& result) { result.mMoved = moved; }); },
        [waiter](const UTF16String& text) { waiter->Fail(text); }, mode);
    RunResult result = waiter->Wait(started);
    result.mCache = cache;
    return result;
}

RunResult SyncHarness::Preview(SyncMode mode)
{
    auto waiter = std::make_shared<Waiter>();
    const bool started = mService.PreviewSync(
        [waiter](const boost::shared_ptr<SyncPreview>& preview) {
            waiter->Succeed([&](RunResult& result) { result.mPreview = preview; });
        },
        [waiter](const UTF16String& text) { waiter->Fail(text); }, mode, ItemToFileCallback());
    return waiter->Wait(started);
}

RunResult SyncHarness::Sync(SyncMode mode)
{
    RunResult prepared = Prepare();
    if (!prepared.Ok()) return prepared;
    return Pass(prepared.mCache, mode);
}

}  // namespace synctest
