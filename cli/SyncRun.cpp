#include "cli/SyncRun.h"

#include <chrono>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <string>

namespace tolmonetsync {
namespace cli {

namespace {

// Set when the last handler of a run has let go of the run's callbacks.
struct RunEnd {
    std::mutex mMutex;
    std::condition_variable mOver;
    bool mDone = false;
    RunOutcome mOutcome;
};

// What the callbacks hold. Its destruction is the end of the run.
class RunState {
public:
    explicit RunState(const std::shared_ptr<RunEnd>& end) : mEnd(end) {}
    ~RunState()
    {
        std::lock_guard<std::mutex> lock(mEnd->mMutex);
        mEnd->mOutcome = mOutcome;
        mEnd->mDone = true;
        mEnd->mOver.notify_all();
    }
    // Callbacks come on one thread at a time, but not always the same one.
    template <typename Fill>
    void Succeed(const Fill& fill)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mOutcome.mSucceeded = true;
        fill(mOutcome);
    }
    void Fail(const UTF16String& text)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        if (mOutcome.mError.empty())
            mOutcome.mError = text.empty() ? "unknown error" : tolmocore::utility::ToNarrow(text);
    }

private:
    std::shared_ptr<RunEnd> mEnd;
    std::mutex mMutex;
    RunOutcome mOutcome;
};

// Starts a run through `start` (given the run's shared state) and waits for
// its end. A run that could not start has no handler; its state goes at once.
template <typename Start>
RunOutcome Run(const Start& start, const WhileWaiting& tick)
{
    auto end = std::make_shared<RunEnd>();
    bool started = false;
    std::string thrown;
    {
        auto state = std::make_shared<RunState>(end);
        try {
            started = start(state);
        } catch (const std::exception& e) {
            thrown = e.what();
        }
    }
    std::unique_lock<std::mutex> lock(end->mMutex);
    while (!end->mOver.wait_for(lock, std::chrono::milliseconds(100), [&] { return end->mDone; })) {
        if (tick) {
            lock.unlock();
            tick();
            lock.lock();
        }
    }
    RunOutcome outcome = end->mOutcome;
    outcome.mStarted = started;
    if (!thrown.empty()) outcome.mError = thrown;
    return outcome;
}

}  // namespace

RunOutcome RunPreview(SyncFilesService& service, SyncMode mode, const WhileWaiting& tick)
{
    return Run(
        [&](const std::shared_ptr<RunState>& state) {
            return service.PreviewSync(
                [state](const boost::shared_ptr<SyncPreview>& preview) {
                    state->Succeed([&](RunOutcome& outcome) { outcome.mPreview = preview; });
                },
                [state](const UTF16String& text) { state->Fail(text); }, mode, ItemToFileCallback());
        },
        tick);
}

RunOutcome RunPrepare(SyncFilesService& service, const ProgressCallback& progress, const WhileWaiting& tick)
{
    return Run(
        [&](const std::shared_ptr<RunState>& state) {
            return service.PrepareSync(
                [state](const boost::shared_ptr<SyncCache>& cache) {
                    state->Succeed([&](RunOutcome& outcome) { outcome.mCache = cache; });
                },
                [state](const UTF16String& text) { state->Fail(text); }, progress, ItemToFileCallback());
        },
        tick);
}

RunOutcome RunPass(SyncFilesService& service, const boost::shared_ptr<SyncCache>& cache, SyncMode mode,
                   const WhileWaiting& tick)
{
    RunOutcome outcome = Run(
        [&](const std::shared_ptr<RunState>& state) {
            return service.DoSync(
                cache, [state](int moved) { state->Succeed([&](RunOutcome& done) { done.mMoved = moved; }); },
                [state](const UTF16String& text) { state->Fail(text); }, mode);
        },
        tick);
    outcome.mCache = cache;
    return outcome;
}

SyncServer_ConnectionState WaitForConnectionState(const ConnectionCall& call)
{
    struct Reported {
        std::mutex mMutex;
        std::condition_variable mCame;
        bool mDone = false;
        SyncServer_ConnectionState mState = SyncServer_Unknown;
    };
    const auto reported = std::make_shared<Reported>();
    const bool started = call([reported](SyncServer_ConnectionState state) {
        std::lock_guard<std::mutex> lock(reported->mMutex);
        reported->mState = state;
        reported->mDone = true;
        reported->mCame.notify_all();
    });
    if (!started) return SyncServer_Unknown;
    std::unique_lock<std::mutex> lock(reported->mMutex);
    reported->mCame.wait(lock, [&] { return reported->mDone; });
    return reported->mState;
}

}  // namespace cli
}  // namespace tolmonetsync
