#pragma once
// Collects what response handlers receive, so that a test can wait for them
// and look at them afterwards.

#include <chrono>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <vector>

#include <boost/shared_ptr.hpp>

#include "foundation/net/RequestProcessor.h"

namespace testsupport {

struct RecordedResponse {
    Guid mRequestUID;
    boost::shared_ptr<tolmonet::Response> mResponse;
    bool mOnCompletionThread = false;
};

class ResponseRecorder {
public:
    // Handlers tell whether they run on this processor's completion thread.
    explicit ResponseRecorder(const tolmonet::http::RequestProcessor& processor);

    // A handler that records its call, then runs `then` (if given). The
    // recording outlives the recorder as long as a handler does.
    using Then = std::function<void(const Guid&, const boost::shared_ptr<tolmonet::Response>&)>;
    tolmonet::http::ResponseHandler Handler(Then then = Then()) const;

    // Waits until `count` handlers have run, at most `bound`; true if they did.
    bool WaitFor(size_t count, std::chrono::milliseconds bound = std::chrono::seconds(30)) const;
    std::vector<RecordedResponse> Responses() const;
    // Calls that began while another recorded call was still running.
    size_t Overlaps() const;

private:
    struct State {
        std::mutex mMutex;
        std::condition_variable mChanged;
        std::vector<RecordedResponse> mResponses;
        int mRunning = 0;
        size_t mOverlaps = 0;
    };
    const tolmonet::http::RequestProcessor& mProcessor;
    boost::shared_ptr<State> mState;
};

}  // namespace testsupport
