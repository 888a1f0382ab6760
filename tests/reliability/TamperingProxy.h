#pragma once
// A hostile server made of a well-behaved one: a loopback HTTP server that
// passes every request on to the local service and lets a test rewrite each
// JSON answer before the client sees it (the bytes of a download pass
// untouched).
//
// Threads: the rewrite runs on the proxy's connection threads, one call per
// answer, possibly several at once.

#include <atomic>
#include <functional>
#include <string>

#include "support/LoopbackHttpServer.h"

namespace reliability {

class TamperingProxy {
public:
    // Gives the JSON body the client is to see instead of `body`.
    using Rewrite = std::function<std::string(const std::string& body)>;

    TamperingProxy(int servicePort, Rewrite rewrite);

    // "http://127.0.0.1:PORT/api", the base URL for the client.
    std::string ApiUrl() const { return mServer.Url("/api"); }
    // Answers the rewrite changed so far: none means the case never met the client.
    int Changed() const { return mChanged.load(); }

private:
    testsupport::HttpAnswer Forward(const testsupport::HttpRequest& request) const;

    const int mServicePort;
    const Rewrite mRewrite;
    mutable std::atomic<int> mChanged{0};
    testsupport::LoopbackHttpServer mServer;  // last: its threads use the above
};

}  // namespace reliability
