#include "foundation/net/Response.h"

#include "foundation/net/ResponseBodySink.h"

#include <cstring>

namespace tolmonet {

const char kResponseTooLargeText[] = "The answer is larger than the request allows";
const char http::kBodySinkRefusedText[] = "The receiver of the answer's body refused it";

const ImmutableString* FindHeader(const HeaderList& headers, const ImmutableString& name)
{
    auto range = headers.equal_range(name);
    if (range.first == range.second) return nullptr;
    return &std::prev(range.second)->second;
}

UTF8String Response::BodyText() const
{
    if (!body || !body->Data()) return UTF8String();
    return UTF8String(body->Data(), body->Size());
}

bool IsResponseTooLarge(const Response& response)
{
    if (response.status != kStatusNoResponse || !response.body || !response.body->Data()) return false;
    const size_t length = sizeof kResponseTooLargeText - 1;
    return response.body->Size() == length && std::memcmp(response.body->Data(), kResponseTooLargeText, length) == 0;
}

}  // namespace tolmonet
