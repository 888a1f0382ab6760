#pragma once
// A giver of a request's body as it goes out, in place of the verb's Body
// argument, so that a large body is never held in memory. A request names one
// in its Configuration (mBodySource); it counts for PUT, POST and PATCH, and
// the caller then passes no Body. Every processor that sends such a request
// sends the source's bytes: the libcurl one streams them, and one that cannot
// stream must read the source whole first and send that. Wrappers pass the
// Configuration on unchanged.
//
// Threads: the processor calls Read and Rewind on its network thread, one
// call at a time, and never again once the transfer has ended. The handler
// runs after that, so it may read what the source kept without a lock.

#include <cstddef>
#include <cstdint>

namespace tolmonet {
namespace http {

class RequestBodySource {
public:
    virtual ~RequestBodySource() = default;
    // The body's length, known before the request leaves: it goes out as the
    // Content-Length, and Read gives exactly that many bytes.
    virtual std::uint64_t Size() const = 0;
    // Fills `buffer` with up to `max` of the next bytes and returns how many;
    // 0 only once all Size() bytes were given. An exception stops the
    // transfer before the rest of the body leaves: the handler gets status
    // kStatusNoResponse with the exception's what() as its body.
    virtual std::size_t Read(unsigned char* buffer, std::size_t max) = 0;
    // Starts again from the first byte: a request on a kept-alive connection
    // that the server had closed is sent again on a new one. False if it
    // cannot; the request then fails.
    virtual bool Rewind() = 0;
};

}  // namespace http
}  // namespace tolmonet
