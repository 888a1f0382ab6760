// What each kind of token event leads to: credentials at once, after a
// profile request, empty ones, or nothing; whether the dialog closes; and
// that the credentials open the asset service.

#include "WebSignInFixture.h"
#include "server/FaultHooks.h"
#include "support/TestScopes.h"

namespace {

using namespace weblogin;

TEST_F(WebSignIn, ATokenWithAnEmailGivesCredentialsAtOnceAndClosesTheDialog)
{
    Extension(TokenEvent("token-1", "user-1", "ann@example.test"));
    SignInRun run(mRecorder);
    ASSERT_TRUE(OpenAndInitialise());
    EXPECT_TRUE(run.Result());

    ASSERT_EQ(mRecorder.Calls(), 1);
    const OvraCredentials credentials = mRecorder.Last();
    EXPECT_EQ(Text(credentials.accessToken), "token-1");
    EXPECT_EQ(Text(credentials.userID), "ann@example.test");
    EXPECT_EQ(Text(credentials.tokenUserID), "user-1");
    EXPECT_TRUE(credentials.refreshToken.empty());
    EXPECT_TRUE(mRecorder.LastOnExtensionHostThread());

    EXPECT_TRUE(mExtension->WaitForUnloads(1, kWaitMs));
    EXPECT_TRUE(LauncherGoneAfter(*mExtension, 1));
}

// The ready event comes on the host's thread while the dialog that loaded
// the extension is still being built: the launcher must already be in place.
TEST_F(WebSignIn, AReadyEventRightAfterTheLoadStillGetsTheInitialisation)
{
    mExtension = RegisterSignInExtension(TokenEvent("token-2", "user-2", "ann@example.test"), false, true);
    SignInRun run(mRecorder);
    EXPECT_TRUE(run.Result());
    ASSERT_TRUE(mExtension->WaitForInitialization(1, kWaitMs));
    ASSERT_EQ(mRecorder.Calls(), 1);
    EXPECT_EQ(Text(mRecorder.Last().accessToken), "token-2");
}

TEST_F(WebSignIn, ATokenWithoutAnEmailTakesTheEmailFromTheProfile)
{
    idtest::IdentityService identity;
    const std::string token = SignInToken(identity);
    ASSERT_FALSE(token.empty());
    Extension(TokenEvent(token, "user-1", ""));
    SignInRun run(mRecorder);
    const std::thread::id uiThread = run.UIThread();
    ASSERT_TRUE(OpenAndInitialise());
    EXPECT_TRUE(run.Result());

    ASSERT_EQ(mRecorder.Calls(), 1);
    const OvraCredentials credentials = mRecorder.Last();
    EXPECT_EQ(Text(credentials.accessToken), token);
    EXPECT_EQ(Text(credentials.userID), "ann@example.test");
    EXPECT_TRUE(credentials.tokenUserID.empty());
    EXPECT_TRUE(credentials.refreshToken.empty());
    // The request processor's completion thread: neither the UI's nor the extension host's.
    EXPECT_FALSE(mRecorder.LastOnExtensionHostThread());
    EXPECT_NE(mRecorder.LastThread(), uiThread);
    EXPECT_TRUE(LauncherGoneAfter(*mExtension, 1));
}

TEST_F(WebSignIn, AProfileWithoutAnEmailGivesEmptyCredentialsAndClosesUnsuccessfully)
{
    idtest::IdentityService identity;
    const std::string token = SignInToken(identity);
    ASSERT_FALSE(token.empty());
    server::FaultRule noEmail;
    noEmail.mMethod = "GET";
    noEmail.mPathPattern = "/ovra/profile/v1";
    noEmail.mStatus = 200;
    noEmail.mBody = R"({"userId":"ovra-user-1","name":"ann"})";
    const auto fault = identity.Service().Faults().Install(noEmail);

    Extension(TokenEvent(token, "user-1", ""));
    SignInRun run(mRecorder);
    ASSERT_TRUE(OpenAndInitialise());
    EXPECT_FALSE(run.Result());  // closed without the user
    EXPECT_TRUE(fault->Fired());
    ASSERT_EQ(mRecorder.Calls(), 1);
    EXPECT_TRUE(mRecorder.Last().accessToken.empty());
    EXPECT_TRUE(mRecorder.Last().userID.empty());
}

TEST_F(WebSignIn, AFailedProfileRequestGivesEmptyCredentialsAndClosesUnsuccessfully)
{
    idtest::IdentityService identity;  // knows no such token: 401
    Extension(TokenEvent("no-such-token", "user-1", ""));
    SignInRun run(mRecorder);
    ASSERT_TRUE(OpenAndInitialise());
    EXPECT_FALSE(run.Result());
    ASSERT_EQ(mRecorder.Calls(), 1);
    EXPECT_TRUE(mRecorder.Last().accessToken.empty());
    EXPECT_TRUE(mRecorder.Last().userID.empty());
}

TEST_F(WebSignIn, AnEmptyTokenTextIsIgnored)
{
    testsupport::TraceCapture trace("OVRA:8");
    Extension(std::string());
    SignInRun run(mRecorder);
    const auto dialog = OpenAndInitialise();
    ASSERT_TRUE(dialog);
    EXPECT_EQ(WaitForSignInDialog(), dialog);  // still open
    EXPECT_EQ(mRecorder.Calls(), 0);
    EXPECT_FALSE(trace.Contains("OnAuthorizationToken"));
    ASSERT_TRUE(CloseByHand());
    EXPECT_FALSE(run.Result());
    EXPECT_EQ(mRecorder.Calls(), 0);
}

TEST_F(WebSignIn, AnUnreadableTokenTextGivesEmptyCredentialsAndLeavesTheDialogOpen)
{
    testsupport::TraceCapture trace("OVRA:8");
    Extension(std::string("{\"token\": \"cut off"));
    SignInRun run(mRecorder);
    const auto dialog = OpenAndInitialise();
    ASSERT_TRUE(dialog);
    ASSERT_TRUE(mRecorder.WaitForCalls(1, kWaitMs));
    EXPECT_TRUE(mRecorder.Last().accessToken.empty());
    EXPECT_TRUE(mRecorder.Last().userID.empty());
    // Even a broken body shows its keys and not the token's value.
    EXPECT_TRUE(trace.Contains("OnAuthorizationToken, body: {\"token\": \"***"));
    EXPECT_FALSE(trace.Contains("cut off"));
    EXPECT_TRUE(trace.Contains("OvraDeserializeResponse error: "));
    EXPECT_EQ(WaitForSignInDialog(), dialog);

    ASSERT_TRUE(CloseByHand());
    EXPECT_FALSE(run.Result());
    EXPECT_EQ(mRecorder.Calls(), 1);
}

TEST_F(WebSignIn, TheUserClosingTheDialogReturnsFalseWithoutCallingBack)
{
    Extension(boost::none);
    SignInRun run(mRecorder);
    ASSERT_TRUE(OpenAndInitialise());
    ASSERT_TRUE(CloseByHand());
    EXPECT_FALSE(run.Result());
    EXPECT_EQ(mRecorder.Calls(), 0);
    EXPECT_TRUE(mExtension->WaitForUnloads(1, kWaitMs));
    EXPECT_TRUE(LauncherGoneAfter(*mExtension, 1));
}

TEST_F(WebSignIn, CredentialsFromTheWebFlowOpenTheAssetService)
{
    testsupport::PrefDirScope prefs;
    idtest::IdentityService identity;
    const std::string token = SignInToken(identity);
    ASSERT_FALSE(token.empty());
    Extension(TokenEvent(token, "user-1", ""));
    SignInRun run(mRecorder);
    ASSERT_TRUE(OpenAndInitialise());
    ASSERT_TRUE(run.Result());

    const auto client = identity.Client();
    EXPECT_TRUE(Connects(client, mRecorder.Last()));
    EXPECT_EQ(idtest::RootStatus(client), 200);
}

}  // namespace
