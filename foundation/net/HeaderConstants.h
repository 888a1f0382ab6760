#pragma once
// Header names and media types. Names are spelled in capitals: the processor
// stores the names of response headers in capitals, so lookups with these
// constants match. Values such as media types keep their usual lower case.

#include "foundation/core/ImmutableString.h"

namespace tolmonet {

extern const ImmutableString kHEADER_CONTENT_TYPE;
extern const ImmutableString kHEADER_CONTENT_TYPE_APPLICATION_JSON;
extern const ImmutableString kHEADER_CONTENT_TYPE_APPLICATION_WWW_FORM_URLENCODED;
extern const ImmutableString kHEADER_CONTENT_LENGTH;
extern const ImmutableString kHEADER_ETAG;
extern const ImmutableString kHEADER_IF_NONE_MATCH;
extern const ImmutableString kHEADER_LOCATION;
extern const ImmutableString kHEADER_COOKIE;
extern const ImmutableString kHEADER_SET_COOKIE;
extern const ImmutableString kHEADER_USER_AGENT;
extern const ImmutableString kHEADER_CACHECONTROL;

}  // namespace tolmonet
