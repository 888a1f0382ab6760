#include "foundation/net/Response.h"

namespace tolmonet {

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

}  // namespace tolmonet
