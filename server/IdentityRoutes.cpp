#include "server/IdentityRoutes.h"

#include <algorithm>

#include <boost/json.hpp>

#include "server/Accounts.h"
#include "server/Sessions.h"
#include "server/SignInThrottle.h"

namespace tolmonetsync {
namespace server {

namespace {

std::string UserId(std::int64_t user)
{
    return "ovra-user-" + std::to_string(user);
}

void Refuse(Exchange& exchange, int status, const char* error, const char* description)
{
    exchange.Json(status,
                  boost::json::serialize(boost::json::object{{"error", error}, {"error_description", description}}));
}

// The person behind a user number, as every answer about a user gives it.
boost::json::object Profile(Accounts& accounts, std::int64_t user)
{
    const boost::optional<UserInfo> info = accounts.User(user);
    const std::string name = info ? info->mName : std::string();
    return boost::json::object{{"userId", UserId(user)}, {"email", info ? info->mEmail : std::string()},
                               {"name", name},           {"displayName", name},
                               {"first_name", name},     {"last_name", ""},
                               {"countryCode", "US"}};
}

void AnswerTokens(Exchange& exchange, Accounts& accounts, const IssuedTokens& issued)
{
    boost::json::object answer = Profile(accounts, issued.mUser);
    answer["access_token"] = issued.mAccess;
    answer["refresh_token"] = issued.mRefresh;
    answer["token_type"] = "bearer";
    if (!issued.mDevice.empty()) answer["device_token"] = issued.mDevice;
    exchange.Json(200, boost::json::serialize(answer));
}

}  // namespace

std::vector<Route> IdentityRoutes(Sessions& sessions, Accounts& accounts, SignInThrottle& throttle,
                                  const std::vector<std::string>& deniedUsers)
{
    const auto signIn = [&sessions, &accounts, &throttle, deniedUsers](Exchange& exchange) {
        const std::string name = exchange.Query("username");
        throttle.WaitBeforeAttempt(name);
        const boost::optional<IssuedTokens> issued = sessions.SignIn(name, exchange.Query("password"));
        if (!issued) {
            throttle.Failed(name);
            return Refuse(exchange, 401, "invalid_credentials", "wrong user name or password");
        }
        throttle.Succeeded(name);
        if (std::find(deniedUsers.begin(), deniedUsers.end(), name) != deniedUsers.end()) {
            sessions.Invalidate(issued->mDevice);
            return Refuse(exchange, 403, "access_denied_non_t1", "this account may not use the service");
        }
        AnswerTokens(exchange, accounts, *issued);
    };
    const auto refresh = [&sessions, &accounts](Exchange& exchange) {
        if (exchange.Query("grant_type") != "refresh_token")
            return Refuse(exchange, 400, "unsupported_grant_type", "grant_type must be refresh_token");
        const boost::optional<IssuedTokens> issued = sessions.Refresh(exchange.Query("refresh_token"));
        if (!issued) return Refuse(exchange, 400, "invalid_grant", "unknown or used refresh token");
        AnswerTokens(exchange, accounts, *issued);
    };
    const auto invalidate = [&sessions](Exchange& exchange) {
        if (!sessions.Invalidate(exchange.Query("token")))
            return Refuse(exchange, 400, "invalid_token", "unknown device token");
        exchange.Json(200, "{}");
    };
    const auto profile = [&accounts](Exchange& exchange) {
        const boost::optional<std::int64_t> user = accounts.UserForToken(exchange.Query("bearer_token"));
        if (!user) return Refuse(exchange, 401, "invalid_token", "unknown or expired access token");
        exchange.Json(200, boost::json::serialize(Profile(accounts, *user)));
    };
    return {
        {"POST", "/ovra/login/v1/device", signIn},
        {"POST", "/ovra/token/v1", refresh},
        {"POST", "/ovra/invalidate_token/v1", invalidate},
        {"GET", "/ovra/profile/v1", profile},
    };
}

}  // namespace server
}  // namespace tolmonetsync
