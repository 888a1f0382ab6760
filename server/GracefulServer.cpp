#include "server/GracefulServer.h"

#include <poll.h>

#include <array>
#include <chrono>
#include <cstring>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <unistd.h>

namespace tolmonetsync {
namespace server {

namespace {

// Set by a handler, read by the loop of the same worker thread.
thread_local bool tCloseAfterAnswer = false;
// The request line and headers are read before any handler can judge the
// sender, and the library gathers each line whole: bound what one request's
// head may take, so that memory never grows with what an unknown client sends.
const std::size_t kMaxHeadBytes = 64 * 1024;
thread_local std::size_t tHeadBytes = 0;
thread_local bool tReadingBody = false;

const int kIdleSliceMs = 50;  // how often an idle connection looks for a stop
const int kDrainMs = 1000;    // how long a closing connection still reads
const std::size_t kBufferSize = 4096;

int Milliseconds(time_t seconds, time_t microseconds)
{
    return static_cast<int>(seconds * 1000 + microseconds / 1000);
}

bool Poll(int fd, short events, int timeoutMs)
{
    pollfd entry{fd, events, 0};
    int rc = 0;
    do {
        rc = ::poll(&entry, 1, timeoutMs);
    } while (rc < 0 && errno == EINTR);
    return rc > 0;
}

void Address(int fd, bool peer, std::string& ip, int& port)
{
    sockaddr_storage address{};
    socklen_t size = sizeof(address);
    const int rc = peer ? ::getpeername(fd, reinterpret_cast<sockaddr*>(&address), &size)
                        : ::getsockname(fd, reinterpret_cast<sockaddr*>(&address), &size);
    if (rc != 0) return;
    char text[INET6_ADDRSTRLEN] = {};
    if (address.ss_family == AF_INET) {
        const auto* v4 = reinterpret_cast<const sockaddr_in*>(&address);
        ::inet_ntop(AF_INET, &v4->sin_addr, text, sizeof(text));
        port = ntohs(v4->sin_port);
    } else if (address.ss_family == AF_INET6) {
        const auto* v6 = reinterpret_cast<const sockaddr_in6*>(&address);
        ::inet_ntop(AF_INET6, &v6->sin6_addr, text, sizeof(text));
        port = ntohs(v6->sin6_port);
    }
    ip = text;
}

struct LoopSettings {
    int mReadMs;
    int mWriteMs;
    int mKeepAliveMs;
    std::size_t mKeepAliveCount;
};

// One connection, plain or TLS, read through a small buffer as the
// library's own stream does.
class ConnectionStream : public httplib::Stream {
public:
    ConnectionStream(int fd, SSL* ssl, const LoopSettings& settings) : mFd(fd), mSsl(ssl), mSettings(settings) {}

    bool is_readable() const override { return WaitReadable(mSettings.mReadMs); }
    bool is_writable() const override { return Poll(mFd, POLLOUT, mSettings.mWriteMs); }

    ssize_t read(char* ptr, size_t size) override
    {
        if (mBegin == mEnd) {
            if (!is_readable()) return -1;
            const ssize_t n = Receive(mBuffer.data(), mBuffer.size());
            if (n <= 0) return n;
            mBegin = 0;
            mEnd = static_cast<std::size_t>(n);
        }
        const std::size_t n = std::min(size, mEnd - mBegin);
        if (!tReadingBody && (tHeadBytes += n) > kMaxHeadBytes) return -1;
        std::memcpy(ptr, mBuffer.data() + mBegin, n);
        mBegin += n;
        return static_cast<ssize_t>(n);
    }

    ssize_t write(const char* ptr, size_t size) override
    {
        if (!is_writable()) return -1;
        if (mSsl) {
            const int n = SSL_write(mSsl, ptr, static_cast<int>(std::min<size_t>(size, INT32_MAX)));
            return n > 0 ? n : -1;
        }
        ssize_t n = 0;
        do {
            n = ::send(mFd, ptr, size, MSG_NOSIGNAL);
        } while (n < 0 && errno == EINTR);
        return n;
    }

    void get_remote_ip_and_port(std::string& ip, int& port) const override { Address(mFd, true, ip, port); }
    void get_local_ip_and_port(std::string& ip, int& port) const override { Address(mFd, false, ip, port); }
    socket_t socket() const override { return mFd; }

    // Waits for the next request of a kept-alive connection; false once the
    // idle time has passed or the server stops.
    bool WaitForRequest(const std::atomic<socket_t>& listener) const
    {
        const auto start = std::chrono::steady_clock::now();
        while (listener != INVALID_SOCKET) {
            if (WaitReadable(kIdleSliceMs)) return true;
            if (std::chrono::steady_clock::now() - start > std::chrono::milliseconds(mSettings.mKeepAliveMs))
                return false;
        }
        return false;
    }

    // Shuts the sending side (after TLS's own close), then reads and drops
    // what still comes until the client closes or time is up.
    void CloseGracefully()
    {
        if (mSsl) SSL_shutdown(mSsl);
        ::shutdown(mFd, SHUT_WR);
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(kDrainMs);
        for (;;) {
            const auto left =
                std::chrono::duration_cast<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now());
            if (left.count() <= 0 || !Poll(mFd, POLLIN, static_cast<int>(left.count()))) break;
            const ssize_t n = ::recv(mFd, mBuffer.data(), mBuffer.size(), 0);
            if (n == 0 || (n < 0 && errno != EINTR)) break;
        }
    }

private:
    bool WaitReadable(int timeoutMs) const
    {
        if (mBegin < mEnd || (mSsl && SSL_pending(mSsl) > 0)) return true;
        return Poll(mFd, POLLIN, timeoutMs);
    }

    ssize_t Receive(char* ptr, std::size_t size)
    {
        if (mSsl) {
            const int n = SSL_read(mSsl, ptr, static_cast<int>(size));
            if (n > 0) return n;
            return SSL_get_error(mSsl, n) == SSL_ERROR_ZERO_RETURN ? 0 : -1;
        }
        ssize_t n = 0;
        do {
            n = ::recv(mFd, ptr, size, 0);
        } while (n < 0 && errno == EINTR);
        return n;
    }

    int mFd;
    SSL* mSsl;
    LoopSettings mSettings;
    std::array<char, kBufferSize> mBuffer{};
    std::size_t mBegin = 0;
    std::size_t mEnd = 0;
};

// The library's keep-alive loop, ending after an answer a handler marked.
// Gives whether the last request went well.
template <class Process>
bool RunConnection(ConnectionStream& stream, const std::atomic<socket_t>& listener, std::size_t keepAliveCount,
                   Process process)
{
    tCloseAfterAnswer = false;
    bool ok = false;
    for (std::size_t left = keepAliveCount; left > 0 && stream.WaitForRequest(listener); --left) {
        bool closed = false;
        tHeadBytes = 0;
        tReadingBody = false;
        ok = process(stream, left == 1, closed);
        if (!ok || closed || tCloseAfterAnswer) break;
    }
    if (tCloseAfterAnswer) stream.CloseGracefully();
    tCloseAfterAnswer = false;
    return ok;
}

void SetSocketTimeouts(int fd, int readMs, int writeMs)
{
    // TLS reads and writes block: these bound them as poll bounds plain ones.
    const timeval receive{readMs / 1000, (readMs % 1000) * 1000};
    const timeval send{writeMs / 1000, (writeMs % 1000) * 1000};
    ::setsockopt(fd, SOL_SOCKET, SO_RCVTIMEO, &receive, sizeof(receive));
    ::setsockopt(fd, SOL_SOCKET, SO_SNDTIMEO, &send, sizeof(send));
}

}  // namespace

void StartReadingBody()
{
    tReadingBody = true;
}

void CloseAfterAnswer(httplib::Response& response)
{
    tCloseAfterAnswer = true;
    response.set_header("Connection", "close");
}

bool GracefulServer::process_and_close_socket(socket_t sock)
{
    const LoopSettings settings{Milliseconds(read_timeout_sec_, read_timeout_usec_),
                                Milliseconds(write_timeout_sec_, write_timeout_usec_),
                                Milliseconds(keep_alive_timeout_sec_, 0), keep_alive_max_count_};
    ConnectionStream stream(sock, nullptr, settings);
    const bool ok = RunConnection(stream, svr_sock_, settings.mKeepAliveCount,
                                  [this](httplib::Stream& strm, bool last, bool& closed) {
                                      return process_request(strm, last, closed, nullptr);
                                  });
    ::shutdown(sock, SHUT_RDWR);
    ::close(sock);
    return ok;
}

GracefulSslServer::GracefulSslServer(const char* certificateFile, const char* privateKeyFile)
    : httplib::SSLServer(certificateFile, privateKeyFile)
{
}

bool GracefulSslServer::process_and_close_socket(socket_t sock)
{
    const LoopSettings settings{Milliseconds(read_timeout_sec_, read_timeout_usec_),
                                Milliseconds(write_timeout_sec_, write_timeout_usec_),
                                Milliseconds(keep_alive_timeout_sec_, 0), keep_alive_max_count_};
    SetSocketTimeouts(sock, settings.mReadMs, settings.mWriteMs);
    bool ok = false;
    SSL* ssl = SSL_new(ssl_context());
    if (ssl && SSL_set_fd(ssl, sock) == 1 && SSL_accept(ssl) == 1) {
        ConnectionStream stream(sock, ssl, settings);
        ok = RunConnection(
            stream, svr_sock_, settings.mKeepAliveCount, [this, ssl](httplib::Stream& strm, bool last, bool& closed) {
                return process_request(strm, last, closed, [ssl](httplib::Request& request) { request.ssl = ssl; });
            });
    }
    if (ssl) SSL_free(ssl);
    ::shutdown(sock, SHUT_RDWR);
    ::close(sock);
    return ok;
}

}  // namespace server
}  // namespace tolmonetsync
