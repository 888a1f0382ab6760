// Fetching a token through the native library: which user, client and secret
// the library is asked for, and how each outcome of its callback, delivered
// on its own thread, shows in the fetch state.

#include <gtest/gtest.h>

#include "FakeOvraLibrary.h"
#include "identity/OvraAuth.h"
#include "support/TestScopes.h"

namespace {

using namespace nativetest;
using tolmonetsync::OvraConnection;

const char kUserInfo[] = "OVRA_fetchDefaultUserInfoForClientId";
const char kFetch[] = "OVRA_fetchAccessToken";

class NativeTokenFetch : public ::testing::Test {
protected:
    NativeTokenFetch() : mFake(FAKE_OVRA_LIB), mConnection(Connect(FAKE_OVRA_LIB)) {}

    // Fetches for the library's default user and waits for its callback.
    bool FetchForDefaultUser(bool production)
    {
        const bool started =
            mConnection->GetUserInfoAndFetchToken(production, UTF8String(), UTF8String(), UTF8String(), UTF8String());
        EXPECT_TRUE(mFake.WaitUntilIdle());
        return started;
    }

    FakeOvraLibrary mFake;
    boost::shared_ptr<OvraConnection> mConnection;
};

TEST_F(NativeTokenFetch, DefaultUserGetsATokenDeliveredOnTheLibrarysThread)
{
    mFake.SetText(kUserInfo, "<UserInfo><UserID>u-42</UserID><Name>Ann</Name></UserInfo>");
    mFake.SetText(kFetch, "{\"access_token\": \"tok-1\", \"email\": \"ann@example.test\", \"token_type\": \"bearer\"}");
    mFake.HoldCallbacks(true);
    EXPECT_EQ(mConnection->GetFetchState(), OvraConnection::kFetchState_None);
    ASSERT_TRUE(mConnection->GetUserInfoAndFetchToken(true, UTF8String(), UTF8String(), UTF8String(), UTF8String()));
    EXPECT_EQ(mConnection->GetFetchState(), OvraConnection::kFetchState_Fetching);
    EXPECT_EQ(mConnection->GetUserID(), Text("u-42"));

    mFake.HoldCallbacks(false);
    ASSERT_TRUE(mFake.WaitUntilIdle());
    EXPECT_EQ(mConnection->GetFetchState(), OvraConnection::kFetchState_Received);
    EXPECT_EQ(mConnection->GetAccessToken(), Text("tok-1"));
    EXPECT_EQ(mConnection->GetEmail(), Text("ann@example.test"));

    // Production, the built-in client and its production secret, the default scope.
    EXPECT_EQ(mFake.Argument("OVRA_createRef", 0), "context");
    EXPECT_EQ(mFake.Argument("OVRA_createRef", 1), "1");
    EXPECT_EQ(mFake.Argument(kUserInfo, 0), tolmonetsync::kTOLMO_OVRA_CLIENT_ID.ToStdString());
    EXPECT_EQ(mFake.Argument(kFetch, 0), tolmonetsync::kTOLMO_OVRA_CLIENT_ID.ToStdString());
    EXPECT_EQ(mFake.Argument(kFetch, 1), tolmonetsync::kTOLMO_OVRA_CLIENT_SECRET_GM.ToStdString());
    EXPECT_EQ(mFake.Argument(kFetch, 2), "u-42");
    EXPECT_EQ(mFake.Argument(kFetch, 3), "");
    EXPECT_EQ(mFake.Argument(kFetch, 4), "openid,HalvaneID,pellucid");
}

TEST_F(NativeTokenFetch, StagingTakesTheStagingSecretAndGivenValuesPassAsTheyAre)
{
    ASSERT_TRUE(mConnection->GetUserInfoAndFetchToken(false, Text("ann"), UTF8String(), UTF8String(), UTF8String()));
    EXPECT_EQ(mFake.Calls(kUserInfo), 0);  // a named user is not looked up
    EXPECT_EQ(mFake.Argument("OVRA_createRef", 1), "0");
    EXPECT_EQ(mFake.Argument(kFetch, 0), tolmonetsync::kTOLMO_OVRA_CLIENT_ID.ToStdString());
    EXPECT_EQ(mFake.Argument(kFetch, 1), tolmonetsync::kTOLMO_OVRA_CLIENT_SECRET_STAGE.ToStdString());
    EXPECT_EQ(mFake.Argument(kFetch, 2), "ann");

    // The handle exists now: a later production flag changes nothing.
    ASSERT_TRUE(mConnection->GetUserInfoAndFetchToken(true, Text("ann"), Text("cid"), Text("s<cret"), Text("sc")));
    EXPECT_EQ(mFake.Calls("OVRA_createRef"), 1);
    EXPECT_EQ(mFake.Argument(kFetch, 0), "cid");
    EXPECT_EQ(mFake.Argument(kFetch, 1), "s<cret");
    EXPECT_EQ(mFake.Argument(kFetch, 4), "sc");
    EXPECT_TRUE(mFake.WaitUntilIdle());
}

TEST_F(NativeTokenFetch, NoDefaultUserMeansTheFetchNeverStarts)
{
    mFake.SetStatus(kUserInfo, 3);
    EXPECT_FALSE(FetchForDefaultUser(true));
    EXPECT_EQ(mConnection->GetFetchState(), OvraConnection::kFetchState_NotStarted);
    EXPECT_EQ(mFake.Calls(kFetch), 0);
}

TEST_F(NativeTokenFetch, UserInfoWithoutItsClosingTagFetchesForAnEmptyUser)
{
    mFake.SetText(kUserInfo, "<UserInfo><UserID>u-42");
    EXPECT_TRUE(FetchForDefaultUser(true));
    EXPECT_EQ(mFake.Argument(kFetch, 2), "");
    EXPECT_TRUE(mConnection->GetUserID().empty());
}

TEST_F(NativeTokenFetch, FailureReportedByTheCallbackIsState3)
{
    mFake.SetText(kFetch, "{\"access_token\": \"ignored\"}");
    mFake.SetCallbackStatus(kFetch, 9);
    EXPECT_TRUE(mConnection->GetUserInfoAndFetchToken(true, Text("ann"), UTF8String(), UTF8String(), UTF8String()));
    ASSERT_TRUE(mFake.WaitUntilIdle());
    EXPECT_EQ(mConnection->GetFetchState(), OvraConnection::kFetchState_Failed);
    EXPECT_TRUE(mConnection->GetAccessToken().empty());
}

TEST_F(NativeTokenFetch, AFetchRefusedAtOnceStaysUnderWay)
{
    mFake.SetStatus(kFetch, 2);
    EXPECT_FALSE(mConnection->GetUserInfoAndFetchToken(true, Text("ann"), UTF8String(), UTF8String(), UTF8String()));
    EXPECT_EQ(mConnection->GetFetchState(), OvraConnection::kFetchState_Fetching);
}

TEST_F(NativeTokenFetch, TokenTextThatIsNotJsonLeavesState1AndIsTraced)
{
    testsupport::TraceCapture trace("OvraConnection:1");
    mFake.SetText(kUserInfo, "<UserID>u-42</UserID>");
    mFake.SetText(kFetch, "<html>not json</html>");
    EXPECT_TRUE(FetchForDefaultUser(true));
    EXPECT_EQ(mConnection->GetFetchState(), OvraConnection::kFetchState_Fetching);
    EXPECT_TRUE(mConnection->GetAccessToken().empty());
    EXPECT_TRUE(trace.Contains("ParseAccessTokenDetails error: ")) << trace.Count() << " lines";
}

TEST_F(NativeTokenFetch, AnObjectGoneBeforeItsCallbackIsLeftAlone)
{
    mFake.SetText(kFetch, "{\"access_token\": \"late\"}");
    mFake.HoldCallbacks(true);
    CompletionRecorder recorder;
    auto other = Connect(FAKE_OVRA_LIB);
    ASSERT_TRUE(mConnection->GetUserInfoAndFetchToken(true, Text("ann"), UTF8String(), UTF8String(), UTF8String()));
    ASSERT_TRUE(other->AsyncFetchAccessToken(true, Text("ann"), Text("cid"), Text("secret"), Text("scope"),
                                             recorder.Function("late")));
    mConnection.reset();
    other.reset();

    mFake.HoldCallbacks(false);
    ASSERT_TRUE(mFake.WaitUntilIdle());
    EXPECT_EQ(mFake.Calls(kFetch), 2);  // both callbacks were delivered...
    EXPECT_EQ(recorder.Calls(), 0);     // ...and found nobody
}

}  // namespace
