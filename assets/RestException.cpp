#include "assets/RestException.h"

#include <vector>

namespace tolmonetsync {

using tolmocore::utility::UTF16to8;
using tolmocore::utility::UTF8to16;

RestException::RestException(const Guid& requestUID, tolmonet::StatusCode status, const UTF16String& message)
    : mMessage(UTF16to8(message)), mStatus(status), mRequestUID(requestUID)
{
}

RestException::~RestException() = default;

const char* RestException::what() const noexcept { return mMessage.Chars(); }

void ThrowResponse(const Guid& requestUID, const boost::shared_ptr<tolmonet::Response>& response)
{
    if (!response) throw UnknownException(requestUID, tolmonet::kStatusNoResponse, u"No Response");
    const UTF16String text = UTF8to16(response->BodyText());
    const tolmonet::StatusCode status = response->status;
    switch (status) {
    case 400:
        throw BadRequestException(requestUID, status, text);
    case 401:
        throw UnauthorizedException(requestUID, status, text);
    case 403:
        throw ForbiddenException(requestUID, status, text);
    case 404:
        throw NotFoundException(requestUID, status, text);
    default:
        throw UnknownException(requestUID, status, text);
    }
}

boost::shared_ptr<tolmonet::Response> MakeErrorResponse(const UTF16String& text)
{
    const UTF8String bytes = UTF16to8(text);
    boost::shared_ptr<RecycledMemory const> body;
    if (!bytes.empty()) {
        boost::shared_ptr<std::vector<unsigned char> > copy(
            new std::vector<unsigned char>(bytes.begin(), bytes.end()));
        body = RecycledMemory::AdaptAsRecycledMemory(copy);
    }
    return boost::shared_ptr<tolmonet::Response>(
        new tolmonet::Response(tolmonet::kStatusNoResponse, tolmonet::HeaderList(), body));
}

}  // namespace tolmonetsync
