#include "foundation/net/HeaderConstants.h"

namespace tolmonet {

const ImmutableString kHEADER_CONTENT_TYPE = ImmutableString::CreateStatic("CONTENT-TYPE");
const ImmutableString kHEADER_CONTENT_TYPE_APPLICATION_JSON = ImmutableString::CreateStatic("application/json");
const ImmutableString kHEADER_CONTENT_TYPE_APPLICATION_WWW_FORM_URLENCODED =
    ImmutableString::CreateStatic("application/x-www-form-urlencoded");
const ImmutableString kHEADER_CONTENT_LENGTH = ImmutableString::CreateStatic("CONTENT-LENGTH");
const ImmutableString kHEADER_ETAG = ImmutableString::CreateStatic("ETAG");
const ImmutableString kHEADER_IF_NONE_MATCH = ImmutableString::CreateStatic("IF-NONE-MATCH");
const ImmutableString kHEADER_LOCATION = ImmutableString::CreateStatic("LOCATION");
const ImmutableString kHEADER_COOKIE = ImmutableString::CreateStatic("COOKIE");
const ImmutableString kHEADER_SET_COOKIE = ImmutableString::CreateStatic("SET-COOKIE");
const ImmutableString kHEADER_USER_AGENT = ImmutableString::CreateStatic("USER-AGENT");
const ImmutableString kHEADER_CACHECONTROL = ImmutableString::CreateStatic("CACHE-CONTROL");

}  // namespace tolmonet
