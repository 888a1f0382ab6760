#pragma once
// A receiver of an answer's body as it arrives, in place of the Response's
// body, so that a large body is never held in memory. A request names one in
// its Configuration (mBodySink); a processor that does not stream ignores it
// and gives the body in the Response as usual, so a handler takes both.
//
// Threads: the processor calls Accepts and Write on its network thread, one
// call at a time, and never again once the transfer has ended. The handler
// runs after that, so it may read what the sink kept without a lock.

#include <cstddef>

namespace tolmonet {
namespace http {

class ResponseBodySink {
public:
    virtual ~ResponseBodySink() = default;
    // Asked once, at the first bytes of the body: whether the body of an
    // answer of this status goes to the sink. If not, it is gathered into
    // the Response, as without a sink.
    virtual bool Accepts(long status) = 0;
    // Takes the next bytes. False (or an exception) stops the transfer: the
    // handler gets status -100 with kBodySinkRefusedText, and the sink knows
    // why.
    virtual bool Write(const unsigned char* data, std::size_t size) = 0;
};

// Body of the -100 response to a request whose sink refused its bytes.
extern const char kBodySinkRefusedText[];

}  // namespace http
}  // namespace tolmonet
