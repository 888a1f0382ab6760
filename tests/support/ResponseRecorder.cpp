#include "support/ResponseRecorder.h"

namespace testsupport {

ResponseRecorder::ResponseRecorder(const tolmonet::http::RequestProcessor& processor)
    : mProcessor(processor), mState(new State)
{
}

tolmonet::http::ResponseHandler ResponseRecorder::Handler(Then then) const
{
    boost::shared_ptr<State> state = mState;
    const tolmonet::http::RequestProcessor* processor = &mProcessor;
    return [state, processor, then](const Guid& requestUID, const boost::shared_ptr<tolmonet::Response>& response) {
        {
            std::lock_guard<std::mutex> lock(state->mMutex);
            if (state->mRunning++ > 0) ++state->mOverlaps;
        }
        const bool onCompletionThread = processor->CurrentThreadIsCompletionThread();
        if (then) then(requestUID, response);
        std::lock_guard<std::mutex> lock(state->mMutex);
        --state->mRunning;
        state->mResponses.push_back(RecordedResponse{requestUID, response, onCompletionThread});
        state->mChanged.notify_all();
    };
}

bool ResponseRecorder::WaitFor(size_t count, std::chrono::milliseconds bound) const
{
    std::unique_lock<std::mutex> lock(mState->mMutex);
    return mState->mChanged.wait_for(lock, bound, [&] { return mState->mResponses.size() >= count; });
}

std::vector<RecordedResponse> ResponseRecorder::Responses() const
{
    std::lock_guard<std::mutex> lock(mState->mMutex);
    return mState->mResponses;
}

size_t ResponseRecorder::Overlaps() const
{
    std::lock_guard<std::mutex> lock(mState->mMutex);
    return mState->mOverlaps;
}

}  // namespace testsupport
