#pragma once
// The failure family of the asset and identity services. A failure travels
// through error callbacks as a Response; where a caller must act on its class
// or show its text, ThrowResponse turns it into one of these, and the caller
// catches it at once: exceptions never cross a callback boundary.

#include <exception>

#include <boost/shared_ptr.hpp>

#include "foundation/core/Guid.h"
#include "foundation/core/Strings.h"
#include "foundation/net/Response.h"

namespace tolmonetsync {

class RestException : public std::exception {
public:
    RestException(const Guid& requestUID, tolmonet::StatusCode status, const UTF16String& message);
    ~RestException() override;

    // The message as UTF-8, NUL-terminated.
    const char* what() const noexcept override;

    UTF8String mMessage;
    tolmonet::StatusCode mStatus;  // the HTTP status, or -100 for one no server sent
    Guid mRequestUID;
};

// The classes callers tell apart; nothing but ThrowResponse makes them.
class UnknownException : public RestException {
    using RestException::RestException;
};
class BadRequestException : public RestException {
    using RestException::RestException;
};
class UnauthorizedException : public RestException {
    using RestException::RestException;
};
class ForbiddenException : public RestException {
    using RestException::RestException;
};
class NotFoundException : public RestException {
    using RestException::RestException;
};

// Throws the exception of the response's class, with the body's text (UTF-8
// decoded) as message: 400, 401, 403 and 404 have classes of their own;
// every other status, -100 and a stray 200 included, is UnknownException.
// A null response throws UnknownException(-100, "No Response"). Never returns.
[[noreturn]] void ThrowResponse(const Guid& requestUID, const boost::shared_ptr<tolmonet::Response>& response);

// A response for a failure that no server sent: status -100, no headers, the
// text as body (no body for empty text).
boost::shared_ptr<tolmonet::Response> MakeErrorResponse(const UTF16String& text);

}  // namespace tolmonetsync
