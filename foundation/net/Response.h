#pragma once
// What a response handler receives, and the value types that travel with a request.

#include <cstdint>
#include <utility>

#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/core/Guid.h"
#include "foundation/core/ImmutableString.h"
#include "foundation/core/SmallBlockAllocator.h"
#include "foundation/net/RecycledMemory.h"

namespace tolmonet {
namespace http {
class RequestBodySource;  // RequestBodySource.h
class ResponseBodySink;   // ResponseBodySink.h
}  // namespace http

using StatusCode = std::int32_t;

// Status of a response that no server sent: no connection, a time-out,
// a cancelled request, or a failure the library made itself.
constexpr StatusCode kStatusNoResponse = -100;

// The most bytes an answer's body may have unless a request asks for more:
// every answer that is read whole (JSON above all) stays within it.
constexpr std::uint64_t kDefaultMaxResponseBody = std::uint64_t(64) << 20;

// Body of the kStatusNoResponse response to a request whose answer grew past
// its Configuration's mMaxResponseBody: the transfer was stopped there.
extern const char kResponseTooLargeText[];

// Header name to value. Names compare by content; where a name occurs more
// than once, the entry that sorts last among them is the one used.
using HeaderList = SmallBlockAllocator::multimap<ImmutableString, ImmutableString, std::less<ImmutableString> >;

// Names and values of a form or a query, in order.
using FormList = SmallBlockAllocator::vector<std::pair<ImmutableString, UTF8String> >;

// The value of `name` (the last entry of that name), or null when absent.
const ImmutableString* FindHeader(const HeaderList& headers, const ImmutableString& name);

struct Response {
    Response() : status(0), reserved(0) {}
    Response(StatusCode status_, HeaderList headers_, boost::shared_ptr<RecycledMemory const> body_)
        : status(status_), headers(std::move(headers_)), body(std::move(body_)), reserved(0)
    {
    }

    StatusCode status;
    HeaderList headers;
    boost::shared_ptr<RecycledMemory const> body;  // null when there is none
    std::int32_t reserved;                         // zero; nothing reads it

    // The body's bytes as text; empty without a body.
    UTF8String BodyText() const;
};

// Whether the request was stopped because its answer passed its
// mMaxResponseBody. No server can send this: its status is
// kStatusNoResponse and its body is kResponseTooLargeText.
bool IsResponseTooLarge(const Response& response);

// Per-request options. Callers start from the default; the authorising layer
// sets mAuthorized. A processor reads mMaxResponseBody, mBodySink and
// mBodySource; the other fields are carried and not interpreted.
struct Configuration {
    boost::shared_ptr<void> mExtension;
    bool mAuthorized = false;
    bool mFollowRedirects = true;
    bool mUseCookies = true;
    UTF8String mProxy;
    UTF8String mUserAgent;
    UTF8String mCAFile;
    // The bound on the answer's body. An answer that passes it is stopped
    // while it arrives, its bytes are dropped, and the handler gets status
    // kStatusNoResponse with kResponseTooLargeText. It travels with the
    // request, so the verbs keep their signatures: a download raises it to
    // its own limit, everything else keeps the default.
    std::uint64_t mMaxResponseBody = kDefaultMaxResponseBody;
    // Null: the body comes in the Response. Else the body of an answer the
    // sink accepts streams into it as it arrives (still bounded by
    // mMaxResponseBody), and the Response carries none; the body of one it
    // declines comes in the Response, bounded by kDefaultMaxResponseBody at
    // most.
    boost::shared_ptr<http::ResponseBodySink> mBodySink;
    // Null: a PUT, POST or PATCH sends the verb's Body. Else it sends the
    // source's bytes as they are read, with the source's Size() as its
    // Content-Length, and the Body is ignored (the caller gives none).
    boost::shared_ptr<http::RequestBodySource> mBodySource;
};

namespace http {

using ResponseHandler = boost::function<void(const Guid&, const boost::shared_ptr<Response>&)>;

}  // namespace http
}  // namespace tolmonet
