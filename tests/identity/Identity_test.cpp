// The identity calls against the local service: what each answers, how a
// refusal and an unreadable answer reach the handler, what goes out on the
// wire; a host's stored sign-in from the first check to a refreshed token,
// and the sign-in from the environment.

#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>

#include "server/FaultHooks.h"
#include "support/CallRecorder.h"
#include "support/IdentityService.h"
#include "support/LoopbackHttpServer.h"
#include "support/TestScopes.h"

namespace {

using namespace testsupport;
using namespace tolmonetsync;
using tolmocore::utility::ToNarrow;
using tolmonetsync::server::FaultAction_Status;
using tolmonetsync::server::FaultRule;

const char kDeniedText[] =
    "You do not have access to this service. Contact your IT administrator to gain access or sign in with an "
    "Halvane ID.";

std::string S(const UTF8String& text)
{
    return text.ToStdString();
}

TEST(IdentityCalls, SignInRefreshProfileAndSignOutAgainstTheService)
{
    IdentityService service;
    const Answered signedIn = SignIn("ann", "secret");
    ASSERT_EQ(signedIn.Status(), 200);
    EXPECT_EQ(signedIn.mCalls, 1);
    const OvraResponse& tokens = signedIn.mAnswer;
    EXPECT_FALSE(tokens.access_token.empty() || tokens.refresh_token.empty() || tokens.device_token.empty());
    EXPECT_EQ(S(tokens.email), "ann@example.test");
    EXPECT_TRUE(tokens.errorMessage.empty());

    const Answered profile = Profile(S(tokens.access_token));
    ASSERT_EQ(profile.Status(), 200);
    EXPECT_EQ(profile.mAnswer.userId, tokens.userId);
    EXPECT_TRUE(profile.mAnswer.access_token.empty());

    // A refresh rotates: the new refresh token works once, the old one never again.
    const Answered refreshed = Refresh(S(tokens.refresh_token));
    ASSERT_EQ(refreshed.Status(), 200);
    EXPECT_NE(refreshed.mAnswer.access_token, tokens.access_token);
    EXPECT_NE(refreshed.mAnswer.refresh_token, tokens.refresh_token);
    const Answered reused = Refresh(S(tokens.refresh_token));
    EXPECT_EQ(reused.Status(), 400);
    EXPECT_EQ(S(reused.mAnswer.error), "invalid_grant");
    EXPECT_EQ(ToNarrow(reused.mAnswer.errorMessage), kFailedText);

    // Signing out withdraws every access token of the device at once.
    const Answered signedOut = SignOut(S(tokens.device_token));
    EXPECT_EQ(signedOut.Status(), 200);
    EXPECT_EQ(signedOut.mCalls, 1);
    EXPECT_EQ(Profile(S(tokens.access_token)).Status(), 401);
    EXPECT_EQ(Profile(S(refreshed.mAnswer.access_token)).Status(), 401);
}

TEST(IdentityCalls, RefusalsCarryTheirLocalisedText)
{
    IdentityService service;
    for (const auto& attempt : {std::make_pair("ann", "wrong"), std::make_pair("nobody", "secret")}) {
        const Answered refused = SignIn(attempt.first, attempt.second);
        EXPECT_EQ(refused.Status(), 401) << attempt.first;
        EXPECT_EQ(refused.mCalls, 1);
        EXPECT_TRUE(refused.mAnswer.access_token.empty());
        EXPECT_EQ(ToNarrow(refused.mAnswer.errorMessage), kFailedText);
    }
    const Answered denied = SignIn("bob", "secret");
    EXPECT_EQ(denied.Status(), 403);
    EXPECT_EQ(S(denied.mAnswer.error), "access_denied_non_t1");
    EXPECT_EQ(ToNarrow(denied.mAnswer.errorMessage), kDeniedText);
}

TEST(IdentityCalls, UnreadableAnswersReachTheHandlerOnce)
{
    IdentityService service;
    const struct {
        const char* mLabel;
        std::function<Answered()> mCall;
        int mStatus;
        std::string mBody;
        int mSeenStatus;
        const char* mText;  // null: not looked at
    } cases[] = {
        // A success that cannot be read becomes the library's own error response.
        {"html", [] { return SignIn("ann", "secret"); }, 200, "<html>", tolmonet::kStatusNoResponse, nullptr},
        {"array", [] { return SignIn("ann", "secret"); }, 200, "[1, 2]", tolmonet::kStatusNoResponse, nullptr},
        {"wrong types", [] { return SignIn("ann", "secret"); }, 200, "{\"userId\": 7, \"access_token\": \"t\"}",
         tolmonet::kStatusNoResponse, nullptr},
        // An empty success is an empty answer with the service's response.
        {"empty profile", [] { return Profile("anything"); }, 200, "", 200, ""},
        // A failure whose body is not JSON still gets the default text.
        {"failed refresh", [] { return Refresh("r"); }, 500, "<html>down</html>", 500, kFailedText},
        // The sign-out's answer is never read.
        {"sign-out", [] { return SignOut("d"); }, 200, "<html>not json</html>", 200, nullptr},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.mLabel);
        FaultRule rule;
        rule.mPathPattern = "/ovra/.*";
        rule.mAction = FaultAction_Status;
        rule.mStatus = c.mStatus;
        rule.mBody = c.mBody;
        const auto fault = service.Service().Faults().Install(rule);
        const Answered answered = c.mCall();
        EXPECT_TRUE(fault->Fired());
        EXPECT_EQ(answered.mCalls, 1);
        EXPECT_EQ(answered.Status(), c.mSeenStatus);
        EXPECT_TRUE(answered.mAnswer.access_token.empty() && answered.mAnswer.userId.empty());
        if (c.mText != nullptr) {
            EXPECT_EQ(ToNarrow(answered.mAnswer.errorMessage), c.mText);
        }
        service.Service().Faults().Clear();
    }
}

// "https://host" as a query value: only A-Z a-z 0-9 _ . - go out as they are.
std::string QuotedURL(const std::string& url)
{
    std::string quoted;
    for (const char c : url) quoted += c == ':' ? "%3a" : c == '/' ? "%2f" : std::string(1, c);
    return quoted;
}

// The identity calls as they reach the wire, read by a plain recording
// server rather than by the local service's lenient parser: method, whole
// target (path, query keys in order, fixed values, quoting), content type
// and body.
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

TEST(StoredSignIn, SurvivesANewClientFailsOnceWithdrawnIsRefreshedAndForgottenOnLogout)
{
    PrefDirScope prefs;
    IdentityService service;
    const Answered signedIn = SignIn("ann", "secret");
    ASSERT_EQ(signedIn.Status(), 200);
    const auto client = service.Client();
    EXPECT_EQ(SetCredentials(client, CredentialsOf(signedIn.mAnswer)), SyncServer_Connected);
    auto check = [](const boost::shared_ptr<tarnvault::Tarnvault>& client) {
        return WaitForState([&](const ConnectionStateCallback& report) { return client->CheckConnection(report); });
    };

    const auto restarted = service.Client();  // as after a restart of the host
    EXPECT_EQ(check(restarted), SyncServer_Connected);
    EXPECT_EQ(RootStatus(restarted), 200);

    // The service withdraws the token: the check fails until the host refreshes.
    service.Service().GetAccounts().ExpireTokensOf("ann");
    EXPECT_EQ(check(client), SyncServer_ConnectionFailed);
    std::string refusal;
    EXPECT_EQ(RootStatus(client, &refusal), 401);
    EXPECT_NE(refusal.find("missing or unknown access token"), std::string::npos) << refusal;
    const Answered refreshed = Refresh(S(signedIn.mAnswer.refresh_token));
    ASSERT_EQ(refreshed.Status(), 200);
    EXPECT_EQ(SetCredentials(client, CredentialsOf(refreshed.mAnswer)), SyncServer_Connected);
    EXPECT_EQ(RootStatus(client), 200);

    // Logging out clears the stored tokens, not only this object's.
    EXPECT_EQ(WaitForState([&](const ConnectionStateCallback& report) { return client->Logout(report); }),
              SyncServer_NotLoggedIn);
    EXPECT_EQ(check(service.Client()), SyncServer_NotLoggedIn);
}

// The environment sign-in keeps its state for the whole process and never
// resets it, so its whole life is one test: a refusal keeps nothing, one
// sign-in serves every client, and a refused token brings a new sign-in.
TEST(EnvironmentLogin, OneSignInServesTheProcessUntilTheServiceRefusesItsToken)
{
    IdentityService service;
    const auto signIns = testsupport::CountRequests(service.Service(), "/ovra/login/.*");
    setenv("TOLMONETSYNC_USERNAME", "ann", 1);

    setenv("TOLMONETSYNC_PASSWORD", "wrong", 1);
    try {
        service.Client(true);
        FAIL() << "no exception";
    } catch (const std::runtime_error& e) {
        EXPECT_STREQ(e.what(), "doOvraLogin failed");
    }

    setenv("TOLMONETSYNC_PASSWORD", "secret", 1);  // the next try signs in
    const auto first = service.Client(true);
    const auto second = service.Client(true);
    EXPECT_EQ(signIns->Seen(), 2);
    EXPECT_EQ(RootStatus(second), 200);
    // Such a client holds a working token, yet nothing is stored for a check.
    EXPECT_EQ(WaitForState([&](const ConnectionStateCallback& report) { return second->CheckConnection(report); }),
              SyncServer_NotLoggedIn);

    service.Service().GetAccounts().ExpireTokensOf("ann");
    const auto later = service.Client(true);
    EXPECT_EQ(signIns->Seen(), 3);
    EXPECT_EQ(RootStatus(later), 200);
    unsetenv("TOLMONETSYNC_USERNAME");
    unsetenv("TOLMONETSYNC_PASSWORD");
}

}  // namespace
