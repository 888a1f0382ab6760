#include "foundation/net/CompletionQueue.h"

#include <exception>

#include <pthread.h>

#include "foundation/core/Trace.h"

namespace tolmonet {
namespace http {

void CompletionJob::Run()
{
    // A handler that throws must not take the thread, and every later
    // handler, down with it.
    try {
        if (mFunction)
            mFunction();
        else
            mHandler(mRequestUID, mResponse);
    } catch (const std::exception& error) {
        TOLMO_TRACE("tolmonetsync", 1, "completion handler of " << mRequestUID << " threw: " << error.what());
    } catch (...) {
        TOLMO_TRACE("tolmonetsync", 1, "completion handler of " << mRequestUID << " threw");
    }
}

CompletionQueue::CompletionQueue() = default;

boost::shared_ptr<CompletionQueue> CompletionQueue::Start()
{
    boost::shared_ptr<CompletionQueue> queue(new CompletionQueue);
    // The thread's first step takes the mutex, so it sees mThreadId set.
    std::lock_guard<std::mutex> lock(queue->mMutex);
    queue->mThread = std::thread([queue] { queue->Run(); });
    queue->mThreadId = queue->mThread.get_id();
    return queue;
}

CompletionQueue::~CompletionQueue()
{
    // Defensive: a joinable std::thread must never be destroyed. Stop leaves
    // none behind, and the queue of StopForExit is never destroyed.
    if (mThread.joinable()) mThread.detach();
}

void CompletionQueue::Post(CompletionJob job)
{
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mReady.push_back(std::move(job));
    }
    mWake.notify_one();
}

void CompletionQueue::PostAfter(CompletionJob job, std::chrono::milliseconds delay)
{
    if (delay.count() <= 0) return Post(std::move(job));
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mTimed.emplace(Clock::now() + delay, std::move(job));
    }
    mWake.notify_one();
}

void CompletionQueue::SetBacklogWaker(std::size_t mark, const boost::function<void()>& waker)
{
    std::lock_guard<std::mutex> lock(mMutex);
    mBacklogMark = mark;
    mBacklogWaker = waker;
    mBacklogWakerArmed = false;
}

bool CompletionQueue::IsBacklogged()
{
    std::lock_guard<std::mutex> lock(mMutex);
    if (!mBacklogWaker || mReady.size() < mBacklogMark) return false;
    mBacklogWakerArmed = true;
    return true;
}

void CompletionQueue::Run()
{
    pthread_setname_np(pthread_self(), "tolmo-handlers");
    std::unique_lock<std::mutex> lock(mMutex);
    while (!mStopping) {
        if (!mTimed.empty()) {
            const Clock::time_point now = Clock::now();
            while (!mTimed.empty() && mTimed.begin()->first <= now) {
                mReady.push_back(std::move(mTimed.begin()->second));
                mTimed.erase(mTimed.begin());
            }
        }
        if (!mReady.empty()) {
            CompletionJob job(std::move(mReady.front()));
            mReady.pop_front();
            if (mBacklogWakerArmed && mReady.size() < mBacklogMark) {
                mBacklogWakerArmed = false;
                mBacklogWaker();
            }
            lock.unlock();
            job.Run();
            // Destroyed before the lock is taken again: what the job held may
            // post new work as it goes.
            job = CompletionJob();
            lock.lock();
            continue;
        }
        if (mTimed.empty())
            mWake.wait(lock);
        else
            mWake.wait_until(lock, mTimed.begin()->first);
    }
}

void CompletionQueue::Stop()
{
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mStopping = true;
    }
    mWake.notify_all();
    if (IsCurrentThread())
        mThread.detach();
    else if (mThread.joinable())
        mThread.join();

    std::deque<CompletionJob> ready;
    std::multimap<Clock::time_point, CompletionJob> timed;
    {
        std::lock_guard<std::mutex> lock(mMutex);
        ready.swap(mReady);
        timed.swap(mTimed);
    }
    // Destroyed here, outside the lock, without being run.
}

void CompletionQueue::StopForExit()
{
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mStopping = true;
    }
    mWake.notify_all();
    if (!IsCurrentThread() && mThread.joinable()) mThread.join();
}

}  // namespace http
}  // namespace tolmonet
