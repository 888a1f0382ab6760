#pragma once
// Tokens of a signed-in user, as a sign-in hands them to the host and the
// host hands them to SetCredentials.

#include "foundation/core/Strings.h"

namespace tolmonetsync {

struct OvraCredentials {
    UTF8String accessToken;
    UTF8String refreshToken;
    UTF8String userID;
    UTF8String tokenUserID;
};

}  // namespace tolmonetsync
