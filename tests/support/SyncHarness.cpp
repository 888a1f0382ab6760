#include "support/SyncHarness.h"

#include <gtest/gtest.h>

#include <chrono>
#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>

namespace synctest {

std::string CacheFileIn(const std::filesystem::path& prefDir)
{
    const std::filesystem::path path = prefDir / "tolmonetsynccache.json";
    return std::filesystem::exists(path) ? testsupport::ReadFileBytes(path) : std::string("<none>");
}

namespace {

// Set when the last holder of a run's callbacks lets go of them.
struct RunEnd {
    std::mutex mMutex;
    std::condition_variable mOver;
    bool mDone = false;
    RunResult mResult;
};

// What the callbacks share. Its destruction is the end of the run: no
// callback can come after it, so nothing is left to wait for.
class RunState {
public:
    explicit RunState(const std::shared_ptr<RunEnd>& end) : mEnd(end) {}
    ~RunState()
    {
        std::lock_guard<std::mutex> lock(mEnd->mMutex);
        mEnd->mResult = mResult;
        mEnd->mDone = true;
        mEnd->mOver.notify_all();
    }
    void Succeed(const std::function<void(RunResult&)>& fill)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mResult.mFinished = true;
        fill(mResult);
    }
    void Fail(const UTF16String& text)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        if (mResult.mErrorCount++ == 0) mResult.mError = tolmocore::utility::ToNarrow(text);
    }

private:
    std::shared_ptr<RunEnd> mEnd;
    std::mutex mMutex;
    RunResult mResult;
};

using State = std::shared_ptr<RunState>;

// Starts a run through `start` and waits for its end. The bound only keeps a
// lost handler from hanging the test.
RunResult Run(const std::function<bool(const State&)>& start)
{
    auto end = std::make_shared<RunEnd>();
    const bool started = start(std::make_shared<RunState>(end));
    std::unique_lock<std::mutex> lock(end->mMutex);
    if (!end->mOver.wait_for(lock, std::chrono::minutes(2), [&] { return end->mDone; }))
        ADD_FAILURE() << "a handler of the run never let go of its callbacks";
    RunResult result = end->mResult;
    result.mStarted = started;
    return result;
}

}  // namespace

RunResult SyncHarness::Prepare(const ProgressCallback& progress, const ItemToFileCallback& itemToFile)
{
    return Run([&](const State& state) {
        return mService.PrepareSync(
            [state](const boost::shared_ptr<SyncCache>& cache) {
                state->Succeed([&](RunResult& result) { result.mCache = cache; });
            },
            [state](const UTF16String& text) { state->Fail(text); }, progress, itemToFile);
    });
}

RunResult SyncHarness::Pass(const boost::shared_ptr<SyncCache>& cache, SyncMode mode)
{
    RunResult result = Run([&](const State& state) {
        return mService.DoSync(
            cache, [state](int moved) { state->Succeed([&](RunResult& done) { done.mMoved = moved; }); },
            [state](const UTF16String& text) { state->Fail(text); }, mode);
    });
    result.mCache = cache;
    return result;
}

RunResult SyncHarness::Preview(SyncMode mode)
{
    return Run([&](const State& state) {
        return mService.PreviewSync(
            [state](const boost::shared_ptr<SyncPreview>& preview) {
                state->Succeed([&](RunResult& result) { result.mPreview = preview; });
            },
            [state](const UTF16String& text) { state->Fail(text); }, mode, ItemToFileCallback());
    });
}

RunResult SyncHarness::Sync(SyncMode mode, const ProgressCallback& progress, const ItemToFileCallback& itemToFile)
{
    RunResult prepared = Prepare(progress, itemToFile);
    if (!prepared.Ok()) return prepared;
    return Pass(prepared.mCache, mode);
}

}  // namespace synctest
