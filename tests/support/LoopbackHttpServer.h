#pragma once
// A small HTTP/1.1 server on 127.0.0.1 and a free port, for tests of the
// HTTP client, on the service's own server loop. Besides normal answers it
// can misbehave on purpose: never answer, hang up in the middle of a body, or
// stall there.

#include <chrono>
#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace httplib {
class Server;
struct Request;
struct Response;
}  // namespace httplib

namespace testsupport {

using HttpHeaders = std::vector<std::pair<std::string, std::string> >;

struct HttpRequest {
    std::string mMethod;
    std::string mTarget;   // path and query, as sent
    HttpHeaders mHeaders;  // names as sent
    std::string mBody;

    // The value of the first header of that name (any case); empty if none.
    std::string Header(const std::string& name) const;
    bool HasHeader(const std::string& name) const;
};

struct HttpAnswer {
    enum Fault {
        Fault_None,
        Fault_NeverAnswer,    // keeps the connection open and says nothing
        Fault_HangUpMidBody,  // announces the whole body, sends half, closes
        Fault_StallMidBody,   // announces the whole body, sends half, goes quiet
    };
    int mStatus = 200;
    HttpHeaders mHeaders;  // Content-Length is added
    std::string mBody;     // not sent for HEAD
    // Sent after mBody, made as it goes out: a body larger than a test
    // would want to hold. Counted in Content-Length.
    size_t mFillBytes = 0;
    char mFill = ' ';
    Fault mFault = Fault_None;
};

class LoopbackHttpServer {
public:
    using Handler = std::function<HttpAnswer(const HttpRequest&)>;

    // Listens at once. The handler runs on the connection's thread.
    explicit LoopbackHttpServer(Handler handler);
    // Cuts every connection, even a stalled one, and joins all threads.
    ~LoopbackHttpServer();
    LoopbackHttpServer(const LoopbackHttpServer&) = delete;
    LoopbackHttpServer& operator=(const LoopbackHttpServer&) = delete;

    int Port() const { return mPort; }
    // "http://127.0.0.1:PORT" followed by `target`.
    std::string Url(const std::string& target) const;

    size_t RequestsReceived() const;
    // Bytes of answer bodies handed to the network so far, over all
    // connections: less than was scripted when a client hung up early.
    size_t BodyBytesSent() const;
    // Waits until `count` requests have arrived, at most `bound`; true if they did.
    bool WaitForRequests(size_t count, std::chrono::milliseconds bound) const;

private:
    void Answer(const httplib::Request& in, std::string body, httplib::Response& out);
    // Blocks until the server stops: how a fault goes quiet.
    void WaitForStop() const;

    const Handler mHandler;
    std::unique_ptr<httplib::Server> mServer;
    int mPort = 0;
    mutable std::mutex mMutex;
    mutable std::condition_variable mChanged;
    size_t mRequests = 0;       // guarded by mMutex
    size_t mBodyBytesSent = 0;  // guarded by mMutex
    bool mStopping = false;     // guarded by mMutex
    std::thread mListenThread;
};

// A port on 127.0.0.1 where nothing listens: a connection to it is refused.
int ClosedLoopbackPort();

}  // namespace testsupport
