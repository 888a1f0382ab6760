#pragma once
// What the sign-in extension sends with its token event.

#include "foundation/core/Strings.h"
#include "foundation/json/JSONConvert.h"

namespace tolmonetsync {

// Each field is read from the JSON key of its name, when present.
struct OvraTokenResponse {
    UTF8String token;
    UTF8String userID;
    UTF8String email;
};

}  // namespace tolmonetsync

namespace tolmocore {
namespace serialization {

template <>
class JSONConvert<tolmonetsync::OvraTokenResponse> {
public:
    // Throws boost::bad_any_cast for a value that is not an object or a key
    // whose value is not text.
    static tolmonetsync::OvraTokenResponse FromJSON(const boost::any& value);
};

}  // namespace serialization
}  // namespace tolmocore
