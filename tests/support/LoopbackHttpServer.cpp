#include "support/LoopbackHttpServer.h"

#include <algorithm>
#include <stdexcept>

#include <netinet/in.h>
#include <strings.h>
#include <sys/socket.h>
#include <unistd.h>

#include "server/GracefulServer.h"

namespace testsupport {
namespace {

// Headers the server library adds to a request; the client never sent them.
bool AddedByServer(const std::string& name)
{
    return name == "REMOTE_ADDR" || name == "REMOTE_PORT" || name == "LOCAL_ADDR" || name == "LOCAL_PORT";
}

}  // namespace

std::string HttpRequest::Header(const std::string& name) const
{
    for (const auto& header : mHeaders)
        if (strcasecmp(header.first.c_str(), name.c_str()) == 0) return header.second;
    return std::string();
}

bool HttpRequest::HasHeader(const std::string& name) const
{
    for (const auto& header : mHeaders)
        if (strcasecmp(header.first.c_str(), name.c_str()) == 0) return true;
    return false;
}

LoopbackHttpServer::LoopbackHttpServer(Handler handler)
    : mHandler(std::move(handler)), mServer(new tolmonetsync::server::GracefulServer)
{
    // A worker per connection a test may hold open, stalled ones included.
    mServer->new_task_queue = [] { return new httplib::ThreadPool(64); };
    mServer->set_keep_alive_max_count(100000);
    mServer->set_keep_alive_timeout(1);
    mServer->set_tcp_nodelay(true);
    const auto bodiless = [this](const httplib::Request& in, httplib::Response& out) { Answer(in, in.body, out); };
    // Bodies are read here: the server loop bounds what it reads before a handler.
    const auto withBody = [this](const httplib::Request& in, httplib::Response& out,
                                 const httplib::ContentReader& reader) {
        tolmonetsync::server::StartReadingBody();
        std::string body;
        reader([&body](const char* data, size_t size) {
            body.append(data, size);
            return true;
        });
        Answer(in, std::move(body), out);
    };
    mServer->Get(".*", bodiless).Options(".*", bodiless);
    mServer->Post(".*", withBody).Put(".*", withBody).Patch(".*", withBody).Delete(".*", withBody);
    mPort = mServer->bind_to_any_port("127.0.0.1");
    if (mPort <= 0) throw std::runtime_error("cannot listen on 127.0.0.1");
    mListenThread = std::thread([this] { mServer->listen_after_bind(); });
    // A stop before the accept loop runs would be lost, and the join would hang.
    while (!mServer->is_running()) std::this_thread::sleep_for(std::chrono::milliseconds(1));
}

LoopbackHttpServer::~LoopbackHttpServer()
{
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mStopping = true;
    }
    mChanged.notify_all();
    mServer->stop();
    mListenThread.join();
}

std::string LoopbackHttpServer::Url(const std::string& target) const
{
    return "http://127.0.0.1:" + std::to_string(mPort) + target;
}

size_t LoopbackHttpServer::RequestsReceived() const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mRequests;
}

size_t LoopbackHttpServer::BodyBytesSent() const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mBodyBytesSent;
}

bool LoopbackHttpServer::WaitForRequests(size_t count, std::chrono::milliseconds bound) const
{
    std::unique_lock<std::mutex> lock(mMutex);
    return mChanged.wait_for(lock, bound, [&] { return mRequests >= count; });
}

void LoopbackHttpServer::WaitForStop() const
{
    std::unique_lock<std::mutex> lock(mMutex);
    mChanged.wait(lock, [this] { return mStopping; });
}

void LoopbackHttpServer::Answer(const httplib::Request& in, std::string body, httplib::Response& out)
{
    HttpRequest request{in.method, in.target, {}, std::move(body)};
    for (const auto& header : in.headers)
        if (!AddedByServer(header.first)) request.mHeaders.push_back(header);
    {
        std::lock_guard<std::mutex> lock(mMutex);
        ++mRequests;
    }
    mChanged.notify_all();
    const HttpAnswer answer = mHandler(request);
    if (answer.mFault == HttpAnswer::Fault_NeverAnswer) WaitForStop();

    out.status = answer.mStatus;
    std::string type;
    for (const auto& header : answer.mHeaders) {
        if (strcasecmp(header.first.c_str(), "Content-Type") == 0)
            type = header.second;
        else
            out.set_header(header.first, header.second);
    }
    // The whole length is announced; a fault sends only the first half of
    // mBody, then hangs up or goes quiet.
    const size_t length = answer.mBody.size() + answer.mFillBytes;
    const size_t sendable = answer.mFault == HttpAnswer::Fault_None ? length : answer.mBody.size() / 2;
    out.set_content_provider(length, type, [this, answer, sendable](size_t offset, size_t, httplib::DataSink& sink) {
        if (offset >= sendable) {
            if (answer.mFault == HttpAnswer::Fault_StallMidBody) WaitForStop();
            return false;
        }
        const bool inBody = offset < answer.mBody.size();
        const size_t end = std::min(sendable, inBody ? answer.mBody.size() : offset + 65536);
        const std::string part =
            inBody ? answer.mBody.substr(offset, end - offset) : std::string(end - offset, answer.mFill);
        if (!sink.write(part.data(), part.size())) return false;
        std::lock_guard<std::mutex> lock(mMutex);
        mBodyBytesSent += part.size();
        return true;
    });
    if (type.empty()) out.headers.erase("Content-Type");
}

int ClosedLoopbackPort()
{
    const int listener = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t length = sizeof address;
    if (::bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0 ||
        ::getsockname(listener, reinterpret_cast<sockaddr*>(&address), &length) != 0)
        throw std::runtime_error("cannot bind on 127.0.0.1");
    ::close(listener);  // bound, never listening: the port is free and refuses
    return ntohs(address.sin_port);
}

}  // namespace testsupport
