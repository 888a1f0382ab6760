// What each kind of token event leads to: credentials at once, after a
// profile request, empty ones, or nothing; whether the dialog closes; and
// that the credentials open the asset service.

#include "WebSignInHarness.h"
#include "server/FaultHooks.h"
#include "support/IdentityService.h"
#include "support/TestScopes.h"

namespace {

using namespace weblogin;

TEST_F(WebSignIn, EachTokenEventLeadsToItsCredentials)
{
    testsupport::PrefDirScope prefs;
    testsupport::IdentityService identity;
    const std::string token = Text(testsupport::SignIn("ann", "secret").mAnswer.access_token);
    ASSERT_FALSE(token.empty());
    server::FaultRule noEmail;
    noEmail.mMethod = "GET";
    noEmail.mPathPattern = "/ovra/profile/v1";
    noEmail.mStatus = 200;
    noEmail.mBody = R"({"userId":"ovra-user-1","name":"ann"})";

    const struct {
        const char* mLabel;
        std::string mEvent;
        bool mProfileWithoutEmail;
        bool mSignedIn;      // what DoMerrowLoginDialog returns
        std::string mToken;  // the credentials, empty on failure
        std::string mUserID;
        std::string mTokenUserID;
    } cases[] = {
        {"token and email: at once", TokenEvent("token-1", "user-1", "ann@example.test"), false, true, "token-1",
         "ann@example.test", "user-1"},
        {"token only: the email from the profile", TokenEvent(token, "user-1", ""), false, true, token,
         "ann@example.test", ""},
        {"a profile without an email", TokenEvent(token, "user-1", ""), true, false, "", "", ""},
        {"a token the service does not know", TokenEvent("no-such-token", "user-1", ""), false, false, "", "", ""},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.mLabel);
        identity.Service().Faults().Clear();
        const auto fault = c.mProfileWithoutEmail ? identity.Service().Faults().Install(noEmail) : nullptr;
        Extension(c.mEvent);
        CredentialsRecorder delivered;
        SignInRun run(delivered);
        const std::thread::id uiThread = run.UIThread();
        ASSERT_TRUE(OpenAndInitialise());
        EXPECT_EQ(run.Result(), c.mSignedIn);
        EXPECT_TRUE(!fault || fault->Fired());

        ASSERT_EQ(delivered.Count(), 1u);
        const Delivered last = delivered.Last();
        EXPECT_EQ(Text(last.mCredentials.accessToken), c.mToken);
        EXPECT_EQ(Text(last.mCredentials.userID), c.mUserID);
        EXPECT_EQ(Text(last.mCredentials.tokenUserID), c.mTokenUserID);
        EXPECT_TRUE(last.mCredentials.refreshToken.empty());
        // At once on the extension host's thread; after a profile request on
        // the request processor's completion thread, never the UI's.
        EXPECT_EQ(last.mOnExtensionHostThread, c.mTokenUserID == "user-1");
        EXPECT_NE(last.mThread, uiThread);
        EXPECT_TRUE(LauncherGoneAfter(*mExtension, 1));
        if (c.mSignedIn && c.mToken == token) {
            const auto client = identity.Client();
            EXPECT_EQ(testsupport::SetCredentials(client, last.mCredentials), SyncServer_Connected);
            EXPECT_EQ(testsupport::RootStatus(client), 200);
        }
    }
}

// The ready event comes on the host's thread while the dialog that loaded
// the extension is still being built: the launcher must already be in place.
TEST_F(WebSignIn, AReadyEventRightAfterTheLoadStillGetsTheInitialisation)
{
    Extension(TokenEvent("token-2", "user-2", "ann@example.test"), false, true);
    SignInRun run(mRecorder);
    EXPECT_TRUE(run.Result());  // the answer went out only on the initialisation
    ASSERT_EQ(mRecorder.Count(), 1u);
    EXPECT_EQ(Text(mRecorder.Last().mCredentials.accessToken), "token-2");
}

TEST_F(WebSignIn, AnEmptyOrUnreadableTokenTextLeavesTheDialogOpen)
{
    for (const std::string answer : {"", "{\"token\": \"cut off"}) {
        SCOPED_TRACE(answer);
        testsupport::TraceCapture trace("OVRA:8");
        Extension(answer);
        CredentialsRecorder delivered;
        SignInRun run(delivered);
        const auto dialog = OpenAndInitialise();
        ASSERT_TRUE(dialog);
        // An empty text is ignored; an unreadable one gives empty credentials.
        const size_t calls = answer.empty() ? 0 : 1;
        ASSERT_TRUE(delivered.WaitFor(calls));
        EXPECT_EQ(delivered.Count(), calls);
        EXPECT_TRUE(delivered.Last().mCredentials.accessToken.empty());
        EXPECT_TRUE(delivered.Last().mCredentials.userID.empty());
        EXPECT_EQ(WaitForSignInDialog(), dialog);  // still open
        if (calls > 0) {
            // Even a broken body shows its keys and not the token's value.
            EXPECT_TRUE(trace.Contains("OnAuthorizationToken, body: {\"token\": \"***"));
            EXPECT_FALSE(trace.Contains("cut off"));
            EXPECT_TRUE(trace.Contains("OvraDeserializeResponse error: "));
        } else {
            EXPECT_FALSE(trace.Contains("OnAuthorizationToken"));
        }
        ASSERT_TRUE(CloseByHand());
        EXPECT_FALSE(run.Result());
        EXPECT_EQ(delivered.Count(), calls);
        EXPECT_TRUE(LauncherGoneAfter(*mExtension, 1));
    }
}

}  // namespace
