#pragma once
// The floor: how fast a plain libcurl multi loop, with the library's limit of
// parallel connections and kept-alive connections, gets one kind of request
// answered by the service.

#include <string>
#include <vector>

namespace wholebench {

struct FloorRequest {
    std::string mMethod;  // "GET" or "POST"
    std::string mUrl;
    std::vector<std::string> mHeaders;
    const std::string* mBody = nullptr;  // POST only
    long mExpectStatus = 200;
    std::string mSaveAs;  // when set, the answer's body is written to this file, as a download must
};

// How a body given mSaveAs reaches its file.
enum class Saving {
    Plain,    // straight into the file, nothing made durable
    Durable,  // a naive safe writer: a temporary beside the file, fsynced and
              // renamed into place as each answer completes, one at a time;
              // each directory fsynced once at the end
};

// Runs every request with at most `parallel` in flight; gives the seconds the
// whole took. Throws if an answer has another status than expected.
double RunFloor(const std::vector<FloorRequest>& requests, long parallel, Saving saving = Saving::Plain);

}  // namespace wholebench
