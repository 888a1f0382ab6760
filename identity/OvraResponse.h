#pragma once
// What the identity service answers, read into an OvraResponse and handed to
// the caller's handler on the request processor's completion thread, with a
// localised message on failure.

#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

#include "assets/Credentials.h"
#include "foundation/core/Guid.h"
#include "foundation/core/Strings.h"
#include "foundation/json/JSONConvert.h"
#include "foundation/net/Response.h"

namespace tolmonetsync {

// The instance of the identity service.
enum OvraAuth_Scheme {
    OvraAuth_GM = 0,     // production
    OvraAuth_Stage = 1,  // staging
};

// Every field is the JSON key of the same name, read as text when present.
struct OvraResponse {
    UTF8String access_token;
    UTF8String countryCode;
    UTF8String device_token;
    UTF8String displayName;
    UTF8String email;
    UTF8String first_name;
    UTF8String last_name;
    UTF8String name;
    UTF8String refresh_token;
    UTF8String jump;
    UTF8String token_type;
    UTF8String userId;
    UTF8String error;          // the service's error code, or empty
    UTF16String errorMessage;  // localised text, set on failure only
};

using OvraResponseHandler =
    boost::function<void(OvraAuth_Scheme, const OvraResponse&, const boost::shared_ptr<tolmonet::Response>&)>;

// Overwrites every field of `out` (errorMessage emptied). A body that parses
// to JSON null gives an empty response. Parse errors and keys that are not
// text throw.
void OvraDeserializeResponse(const UTF8String& body, OvraResponse& out);

// The body as text, traced in "OVRA" (level 8 on success, 1 otherwise).
UTF8String HandleOvraResponseBody(const char* name, const Guid& requestUID,
                                  const boost::shared_ptr<tolmonet::Response>& response);
// Handler of the sign-in, refresh and profile calls; calls `handler` once
// (twice only if the handler throws on a failure's path, see the source).
void HandleOvraResponse(OvraAuth_Scheme scheme, const char* name, const OvraResponseHandler& handler,
                        const Guid& requestUID, const boost::shared_ptr<tolmonet::Response>& response);
// Handler of the logout call: the body is never read.
void HandleOvraLogout(OvraAuth_Scheme scheme, const OvraResponseHandler& handler, const Guid& requestUID,
                      const boost::shared_ptr<tolmonet::Response>& response);

}  // namespace tolmonetsync

namespace tolmocore {
namespace serialization {

template <>
class JSONConvert<tolmonetsync::OvraResponse> {
public:
    // Throws boost::bad_any_cast for a value that is not an object or a key
    // whose value is not text.
    static tolmonetsync::OvraResponse FromJSON(const boost::any& value);
};

}  // namespace serialization
}  // namespace tolmocore
