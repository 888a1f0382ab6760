#pragma once
// The one thread that runs response handlers and asynchronous calls, one at a
// time, each after the previous one has returned.

#include <chrono>
#include <condition_variable>
#include <deque>
#include <map>
#include <mutex>
#include <thread>

#include <boost/enable_shared_from_this.hpp>
#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/net/Response.h"

namespace tolmonet {
namespace http {

// One call to make on the completion thread: a response handler with its
// arguments, or a plain function.
struct CompletionJob {
    ResponseHandler mHandler;
    Guid mRequestUID;
    boost::shared_ptr<Response> mResponse;
    boost::function<void()> mFunction;

    void Run();
};

// Jobs run in the order they became due; a job posted without delay is due at
// once. The thread holds the queue through a shared pointer, so the owner may
// drop the queue from inside a job.
class CompletionQueue : public boost::enable_shared_from_this<CompletionQueue> {
public:
    using Clock = std::chrono::steady_clock;

    // Makes the queue and starts its thread.
    static boost::shared_ptr<CompletionQueue> Start();
    ~CompletionQueue();
    CompletionQueue(const CompletionQueue&) = delete;
    CompletionQueue& operator=(const CompletionQueue&) = delete;

    // Any thread, also a job. After a stop the job is kept and never run.
    void Post(CompletionJob job);
    void PostAfter(CompletionJob job, std::chrono::milliseconds delay);

    bool IsCurrentThread() const { return std::this_thread::get_id() == mThreadId; }

    // Back-pressure for a producer that must not run far ahead of the
    // handlers. `waker` is called on the completion thread, under the
    // queue's lock (so it must only wake someone), once the jobs due fall
    // below `mark` after IsBacklogged() has found them at or above it. An
    // empty waker removes it; after that returns, it is never called again.
    void SetBacklogWaker(std::size_t mark, const boost::function<void()>& waker);
    // Whether `mark` jobs or more are due; if so, arms the waker.
    bool IsBacklogged();

    // Ends the thread once the job that runs now has returned, and destroys
    // every pending job without running it. Called from a job, the thread is
    // left to end by itself when that job returns.
    void Stop();

    // Ends the thread like Stop, but keeps every pending job allocated and
    // uncalled, for good: at process exit, destroying a job could run code
    // that acts as if its request had ended. Waits for a job that runs now,
    // unless called from that job.
    void StopForExit();

private:
    CompletionQueue();
    void Run();

    mutable std::mutex mMutex;
    std::condition_variable mWake;
    std::deque<CompletionJob> mReady;                        // guarded by mMutex
    std::multimap<Clock::time_point, CompletionJob> mTimed;  // guarded by mMutex; equal times keep post order
    bool mStopping = false;                                  // guarded by mMutex
    std::size_t mBacklogMark = 0;                            // guarded by mMutex
    boost::function<void()> mBacklogWaker;                   // guarded by mMutex
    bool mBacklogWakerArmed = false;                         // guarded by mMutex
    std::thread mThread;
    std::thread::id mThreadId;  // written before any job can run, then constant
};

}  // namespace http
}  // namespace tolmonet
