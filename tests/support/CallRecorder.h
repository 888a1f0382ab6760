#pragma once
// Records what a callback was given, so that a test can wait for the calls
// and look at them afterwards. Copies share one record: a handler holding a
// copy may outlive the test's recorder, and a late call is still safe.
//
//   testsupport::CallRecorder<std::string> calls;
//   Start([calls](const char* text) mutable { calls.Add(text); });
//   ASSERT_TRUE(calls.WaitFor(1));

#include <chrono>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <vector>

namespace testsupport {

template <typename Record>
class CallRecorder {
public:
    void Add(Record record) const
    {
        std::lock_guard<std::mutex> lock(mState->mMutex);
        mState->mRecords.push_back(std::move(record));
        mState->mChanged.notify_all();
    }
    // Waits until `count` calls came, at most `bound`; true if they did.
    bool WaitFor(size_t count, std::chrono::milliseconds bound = std::chrono::seconds(30)) const
    {
        std::unique_lock<std::mutex> lock(mState->mMutex);
        return mState->mChanged.wait_for(lock, bound, [&] { return mState->mRecords.size() >= count; });
    }
    size_t Count() const
    {
        std::lock_guard<std::mutex> lock(mState->mMutex);
        return mState->mRecords.size();
    }
    std::vector<Record> All() const
    {
        std::lock_guard<std::mutex> lock(mState->mMutex);
        return mState->mRecords;
    }
    // The latest call's record; a default one before any call.
    Record Last() const
    {
        std::lock_guard<std::mutex> lock(mState->mMutex);
        return mState->mRecords.empty() ? Record() : mState->mRecords.back();
    }

private:
    struct State {
        std::mutex mMutex;
        std::condition_variable mChanged;
        std::vector<Record> mRecords;
    };
    std::shared_ptr<State> mState = std::make_shared<State>();
};

}  // namespace testsupport
