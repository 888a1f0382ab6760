#pragma once
// The identity service's REST calls: sign in with a name and a password,
// swap a refresh token for new tokens, invalidate a device token, read the
// profile behind an access token. Each sends one request through the
// process-wide processor and returns at once; the outcome reaches `handler`
// on the completion thread (see OvraResponse.h). Each returns the request's
// identifier, or the nil Guid if the processor refused it (the handler is
// then never called).
//
// Empty `server`, `redirect`, `clientID` or `clientSecret` arguments mean the
// scheme's built-in values. The built-in base URLs of both instances can be
// replaced for the whole process: by SetOvraServiceURL, or else by the
// environment variable TOLMONETSYNC_IDENTITY_SERVICE_URL, read on first use.

#include "foundation/core/Guid.h"
#include "foundation/core/ImmutableString.h"
#include "identity/OvraResponse.h"

namespace tolmonetsync {

extern const ImmutableString kOVRA_GM_SERVER;
extern const ImmutableString kOVRA_GM_SERVER_REDIRECT;
extern const ImmutableString kOVRA_STAGE_SERVER;
extern const ImmutableString kOVRA_STAGE_SERVER_REDIRECT;
extern const ImmutableString kTOLMO_OVRA_CLIENT_ID;
extern const ImmutableString kTOLMO_OVRA_CLIENT_SECRET_GM;
extern const ImmutableString kTOLMO_OVRA_CLIENT_SECRET_STAGE;

// Replaces the base URL of both instances ("http://127.0.0.1:8080/ovra");
// empty text restores the built-in ones. Call before the first identity
// request. Any thread.
void SetOvraServiceURL(const UTF8String& url);
// The base URL in use for the scheme.
UTF8String GetOvraServiceURL(OvraAuth_Scheme scheme);

Guid OvraAuthenticate(OvraAuth_Scheme scheme, const OvraResponseHandler& handler, const UTF8String& userName,
                      const UTF8String& password, const UTF8String& deviceID, const UTF8String& locale,
                      const UTF8String& server, const UTF8String& redirect, const UTF8String& clientID,
                      const UTF8String& clientSecret);
Guid OvraRefreshAuthenticate(OvraAuth_Scheme scheme, const OvraResponseHandler& handler, const UTF8String& refreshToken,
                             const UTF8String& server, const UTF8String& redirect, const UTF8String& clientID,
                             const UTF8String& clientSecret);
Guid OvraLogout(OvraAuth_Scheme scheme, const OvraResponseHandler& handler, const UTF8String& token,
                const UTF8String& server);
// The token goes into the URL as it stands, unquoted.
Guid OvraProfile(OvraAuth_Scheme scheme, const UTF8String& bearerToken, const OvraResponseHandler& handler);

}  // namespace tolmonetsync
