// The identity calls as they reach the wire, read by a plain recording
// server rather than by the local service's lenient parser: method, whole
// target (path, query keys in order, fixed values, quoting), content type
// and body.

#include <gtest/gtest.h>

#include "support/CallRecorder.h"
#include "support/IdentityService.h"
#include "support/LoopbackHttpServer.h"

namespace {

using namespace testsupport;
using namespace tolmonetsync;

// "https://host" as a query value: only A-Z a-z 0-9 _ . - go out as they are.
std::string QuotedURL(const std::string& url)
{
    std::string quoted;
    for (const char c : url) quoted += c == ':' ? "%3a" : c == '/' ? "%2f" : std::string(1, c);
    return quoted;
}

TEST(IdentityWire, EachCallPutsItsRequestOnTheWireAsTheServiceReadsIt)
{
    CallRecorder<HttpRequest> arrived;
    LoopbackHttpServer server([arrived](const HttpRequest& request) {
        arrived.Add(request);
        HttpAnswer answer;
        answer.mBody = "{}";
        return answer;
    });
    IdentityURLScope url(server.Url("/ovra"));
    // The built-in client, its production secret and redirect: GUID-like
    // texts and a URL whose host needs no quoting.
    const std::string client = "client_id=" + kTOLMO_OVRA_CLIENT_ID.ToStdString() +
                               "&client_secret=" + kTOLMO_OVRA_CLIENT_SECRET_GM.ToStdString();
    const std::string redirect = "redirect_uri=" + QuotedURL(kOVRA_GM_SERVER_REDIRECT.ToStdString());
    const std::string token = "tok/+=1";  // needs quoting in a query

    const struct {
        const char* mLabel;
        std::function<void()> mCall;
        std::string mMethod;
        std::string mTarget;
        bool mForm;
    } cases[] = {
        {"sign-in", [] { SignIn("ann", "p&ss w=rd"); }, "POST",
         "/ovra/login/v1/device?username=ann&password=p%26ss%20w%3drd&" + client +
             "&device_id=device-1&device_name=Desktop&scope=openid%2cpellucid&" + redirect + "&locale=en_US",
         true},
        {"refresh", [&] { Refresh(token); }, "POST",
         "/ovra/token/v1?" + client + "&grant_type=refresh_token&scope=openid%2cpellucid&" + redirect +
             "&refresh_token=tok%2f%2b%3d1",
         true},
        {"sign-out", [&] { SignOut(token); }, "POST",
         "/ovra/invalidate_token/v1?token_type=device_token&token=tok%2f%2b%3d1&cascading=all", true},
        // The profile's token goes out as it stands.
        {"profile", [&] { Profile(token); }, "GET", "/ovra/profile/v1?bearer_token=tok/+=1", false},
    };
    for (const auto& wire : cases) {
        SCOPED_TRACE(wire.mLabel);
        const size_t before = arrived.Count();
        wire.mCall();
        ASSERT_EQ(arrived.Count(), before + 1);
        const HttpRequest request = arrived.Last();
        EXPECT_EQ(request.mMethod, wire.mMethod);
        EXPECT_EQ(request.mTarget, wire.mTarget);
        EXPECT_EQ(request.Header("Content-Type"), wire.mForm ? "application/x-www-form-urlencoded" : "");
        EXPECT_TRUE(request.mBody.empty());
    }
}

}  // namespace
