#pragma once
// The identity service under /ovra, on the local service's users:
//   POST /ovra/login/v1/device?username=&password=&client_id=&...   sign in on a device
//   POST /ovra/token/v1?grant_type=refresh_token&refresh_token=&... new tokens, the refresh token rotated
//   POST /ovra/invalidate_token/v1?token_type=device_token&token=&cascading=all   sign out
//   GET  /ovra/profile/v1?bearer_token=TOKEN                           who the token belongs to
// Fields come in the query of a POST with an empty body. Every key of an
// answer is a JSON string. A refusal is JSON with an "error" code.

#include <string>
#include <vector>

#include "server/Router.h"

namespace tolmonetsync {
namespace server {

class Accounts;
class Sessions;
class SignInThrottle;

// `deniedUsers` sign in with the right password and are still refused
// ("access_denied_non_t1"). Every sign-in first waits as `throttle` says
// for its user name.
std::vector<Route> IdentityRoutes(Sessions& sessions, Accounts& accounts, SignInThrottle& throttle,
                                  const std::vector<std::string>& deniedUsers);

}  // namespace server
}  // namespace tolmonetsync
