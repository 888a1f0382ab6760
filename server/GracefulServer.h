#pragma once
// The HTTP servers of the service (plain and TLS) with their own connection
// loop, for one thing the library's loop cannot do: end a connection
// gracefully after a refusal. A handler that answers before reading the
// whole body calls CloseAfterAnswer; the answer goes out with
// "Connection: close", the sending side is shut, and what the client still
// sends is read and dropped for a moment before the socket closes. Closing
// at once with unread bytes would reset the connection, and the client could
// lose the answer it has not read yet.
//
// Everything else is as the library does it: keep-alive up to its count and
// idle time, its read and write time-outs, and a stop ends idle connections.
//
// Threads: CloseAfterAnswer from the worker thread running the handler.

#include <httplib.h>

namespace tolmonetsync {
namespace server {

// A request's line and headers may take 64 KiB; past that the connection
// ends without an answer. A handler calls StartReadingBody before it reads a
// body, which has limits of its own.
void StartReadingBody();

// Marks the connection whose request this thread is handling, and adds
// "Connection: close" to the answer.
void CloseAfterAnswer(httplib::Response& response);

class GracefulServer : public httplib::Server {
private:
    bool process_and_close_socket(socket_t sock) override;
};

class GracefulSslServer : public httplib::SSLServer {
public:
    GracefulSslServer(const char* certificateFile, const char* privateKeyFile);

private:
    bool process_and_close_socket(socket_t sock) override;
};

}  // namespace server
}  // namespace tolmonetsync
