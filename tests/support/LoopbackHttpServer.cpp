#include "support/LoopbackHttpServer.h"

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstdlib>
#include <stdexcept>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <strings.h>
#include <sys/socket.h>
#include <unistd.h>

namespace testsupport {
namespace {

int ListenOnLoopback(int& port)
{
    const int listener = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (listener < 0) throw std::runtime_error("socket failed");
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    address.sin_port = 0;
    socklen_t length = sizeof address;
    if (::bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0 || ::listen(listener, 128) != 0 ||
        ::getsockname(listener, reinterpret_cast<sockaddr*>(&address), &length) != 0) {
        ::close(listener);
        throw std::runtime_error("cannot listen on 127.0.0.1");
    }
    port = ntohs(address.sin_port);
    return listener;
}

bool SendAll(int connection, const std::string& bytes)
{
    size_t sent = 0;
    while (sent < bytes.size()) {
        const ssize_t count = ::send(connection, bytes.data() + sent, bytes.size() - sent, MSG_NOSIGNAL);
        if (count < 0 && errno == EINTR) continue;
        if (count <= 0) return false;
        sent += static_cast<size_t>(count);
    }
    return true;
}

// Appends what arrives; false once the connection is closed or cut.
bool Receive(int connection, std::string& buffer)
{
    char chunk[65536];
    for (;;) {
        const ssize_t count = ::recv(connection, chunk, sizeof chunk, 0);
        if (count < 0 && errno == EINTR) continue;
        if (count <= 0) return false;
        buffer.append(chunk, static_cast<size_t>(count));
        return true;
    }
}

const char* ReasonPhrase(int status)
{
    switch (status) {
        case 200:
            return "OK";
        case 201:
            return "Created";
        case 204:
            return "No Content";
        case 304:
            return "Not Modified";
        case 404:
            return "Not Found";
        case 500:
            return "Internal Server Error";
        default:
            return "Status";
    }
}

HttpRequest ParseHead(const std::string& head)
{
    HttpRequest request;
    size_t lineEnd = head.find("\r\n");
    const std::string requestLine = head.substr(0, lineEnd);
    const size_t firstBlank = requestLine.find(' ');
    const size_t secondBlank = requestLine.find(' ', firstBlank + 1);
    request.mMethod = requestLine.substr(0, firstBlank);
    request.mTarget = requestLine.substr(firstBlank + 1, secondBlank - firstBlank - 1);
    while (lineEnd != std::string::npos) {
        const size_t start = lineEnd + 2;
        lineEnd = head.find("\r\n", start);
        const std::string line = head.substr(start, lineEnd == std::string::npos ? std::string::npos : lineEnd - start);
        const size_t colon = line.find(':');
        if (colon == std::string::npos) continue;
        const size_t valueStart = line.find_first_not_of(' ', colon + 1);
        request.mHeaders.emplace_back(line.substr(0, colon),
                                      valueStart == std::string::npos ? std::string() : line.substr(valueStart));
    }
    return request;
}

std::string ResponseHead(const HttpAnswer& answer)
{
    std::string head = "HTTP/1.1 " + std::to_string(answer.mStatus) + " " + ReasonPhrase(answer.mStatus) + "\r\n";
    for (const auto& header : answer.mHeaders) head += header.first + ": " + header.second + "\r\n";
    head += "Content-Length: " + std::to_string(answer.mBody.size() + answer.mFillBytes) + "\r\n\r\n";
    return head;
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

LoopbackHttpServer::LoopbackHttpServer(Handler handler) : mHandler(std::move(handler))
{
    mListener = ListenOnLoopback(mPort);
    mAcceptThread = std::thread([this] { AcceptLoop(); });
}

LoopbackHttpServer::~LoopbackHttpServer()
{
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mStopping = true;
        for (int connection : mConnections) ::shutdown(connection, SHUT_RDWR);
    }
    ::shutdown(mListener, SHUT_RDWR);  // wakes accept()
    mAcceptThread.join();
    std::vector<std::thread> threads;
    {
        std::lock_guard<std::mutex> lock(mMutex);
        threads.swap(mThreads);
    }
    for (std::thread& thread : threads) thread.join();
    ::close(mListener);
}

std::string LoopbackHttpServer::Url(const std::string& target) const
{
    return "http://127.0.0.1:" + std::to_string(mPort) + target;
}

size_t LoopbackHttpServer::BodyBytesSent() const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mBodyBytesSent;
}

void LoopbackHttpServer::CountBodyBytes(size_t count)
{
    std::lock_guard<std::mutex> lock(mMutex);
    mBodyBytesSent += count;
}

bool LoopbackHttpServer::SendAnswer(int connection, const std::string& head, const HttpAnswer& answer)
{
    if (!SendAll(connection, head + answer.mBody)) return false;
    CountBodyBytes(answer.mBody.size());
    const std::string chunk(65536, answer.mFill);
    for (size_t left = answer.mFillBytes; left > 0;) {
        const size_t part = std::min(left, chunk.size());
        if (!SendAll(connection, chunk.substr(0, part))) return false;
        CountBodyBytes(part);
        left -= part;
    }
    return true;
}

size_t LoopbackHttpServer::RequestsReceived() const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mRequests;
}

bool LoopbackHttpServer::WaitForRequests(size_t count, std::chrono::milliseconds bound) const
{
    std::unique_lock<std::mutex> lock(mMutex);
    return mArrived.wait_for(lock, bound, [&] { return mRequests >= count; });
}

void LoopbackHttpServer::AcceptLoop()
{
    for (;;) {
        const int connection = ::accept4(mListener, nullptr, nullptr, SOCK_CLOEXEC);
        if (connection < 0 && errno == EINTR) continue;
        if (connection < 0) return;
        const int one = 1;
        ::setsockopt(connection, IPPROTO_TCP, TCP_NODELAY, &one, sizeof one);
        std::lock_guard<std::mutex> lock(mMutex);
        if (mStopping) {
            ::close(connection);
            return;
        }
        mConnections.insert(connection);
        mThreads.emplace_back([this, connection] { Serve(connection); });
    }
}

void LoopbackHttpServer::Serve(int connection)
{
    std::string buffer;
    for (;;) {
        size_t headEnd;
        bool open = true;
        while (open && (headEnd = buffer.find("\r\n\r\n")) == std::string::npos) {
            open = Receive(connection, buffer);
            // Not HTTP (a TLS hello, say): hang up, as a plain server would.
            if (!buffer.empty() && !std::isupper(static_cast<unsigned char>(buffer[0]))) open = false;
        }
        if (!open) break;
        HttpRequest request = ParseHead(buffer.substr(0, headEnd));
        buffer.erase(0, headEnd + 4);
        const size_t bodyLength = std::strtoull(request.Header("Content-Length").c_str(), nullptr, 10);
        while (open && buffer.size() < bodyLength) open = Receive(connection, buffer);
        if (!open) break;
        request.mBody = buffer.substr(0, bodyLength);
        buffer.erase(0, bodyLength);
        {
            std::lock_guard<std::mutex> lock(mMutex);
            ++mRequests;
        }
        mArrived.notify_all();

        const HttpAnswer answer = mHandler(request);
        if (answer.mFault == HttpAnswer::Fault_NeverAnswer) {
            WaitForClose(connection);
            break;
        }
        const std::string head = ResponseHead(answer);
        if (answer.mFault != HttpAnswer::Fault_None) {
            const std::string body = request.mMethod == "HEAD" ? std::string() : answer.mBody;
            SendAll(connection, head + body.substr(0, body.size() / 2));
            if (answer.mFault == HttpAnswer::Fault_StallMidBody) WaitForClose(connection);
            break;
        }
        if (request.mMethod == "HEAD" ? !SendAll(connection, head) : !SendAnswer(connection, head, answer)) break;
        if (strcasecmp(request.Header("Connection").c_str(), "close") == 0) break;
    }
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mConnections.erase(connection);
    }
    ::close(connection);
}

void LoopbackHttpServer::WaitForClose(int connection)
{
    std::string ignored;
    while (Receive(connection, ignored)) ignored.clear();
}

int ClosedLoopbackPort()
{
    int port = 0;
    ::close(ListenOnLoopback(port));
    return port;
}

}  // namespace testsupport
