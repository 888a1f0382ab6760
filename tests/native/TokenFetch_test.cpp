// Fetching a token through the native library: which user, client and secret
// the library is asked for, and how each outcome of its callback, delivered
// on its own thread, shows in the fetch state.

#include <gtest/gtest.h>

#include <functional>

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
    NativeTokenFetch() : mFake(LoadFake(FAKE_OVRA_LIB)), mConnection(Connect(FAKE_OVRA_LIB)) {}

    FakeOvraState& mFake;
    boost::shared_ptr<OvraConnection> mConnection;
};

TEST_F(NativeTokenFetch, StagingTakesTheStagingSecretAndGivenValuesPassAsTheyAre)
{
    ASSERT_TRUE(mConnection->GetUserInfoAndFetchToken(false, Text("ann"), UTF8String(), UTF8String(), UTF8String()));
    EXPECT_EQ(mFake.Calls(kUserInfo), 0);  // a named user is not looked up
    EXPECT_EQ(mFake.Arguments("OVRA_createRef").at(1), "0");
    EXPECT_EQ(mFake.Arguments(kFetch), (Strings{tolmonetsync::kTOLMO_OVRA_CLIENT_ID.ToStdString(),
                                                tolmonetsync::kTOLMO_OVRA_CLIENT_SECRET_STAGE.ToStdString(), "ann", "",
                                                "openid,HalvaneID,pellucid"}));

    // The handle exists now: a later production flag changes nothing.
    ASSERT_TRUE(mConnection->GetUserInfoAndFetchToken(true, Text("ann"), Text("cid"), Text("s<cret"), Text("sc")));
    EXPECT_EQ(mFake.Calls("OVRA_createRef"), 1);
    EXPECT_EQ(mFake.Arguments(kFetch), (Strings{"cid", "s<cret", "ann", "", "sc"}));
    EXPECT_TRUE(mFake.WaitUntilIdle());
}

// How each outcome of the library shows in the return value and the state.
TEST_F(NativeTokenFetch, EachOutcomeOfTheLibraryShowsInTheFetchState)
{
    struct Outcome {
        const char* mLabel;
        std::function<void(FakeOvraState&)> mScript;
        bool mStarted;
        int mState;
        const char* mUserAsked;  // null: the token was never asked for
        const char* mToken;
    };
    const Outcome outcomes[] = {
        {"no default user", [](FakeOvraState& fake) { fake.SetStatus(kUserInfo, 3); }, false,
         OvraConnection::kFetchState_NotStarted, nullptr, ""},
        {"user info without its closing tag: an empty user",
         [](FakeOvraState& fake) { fake.SetText(kUserInfo, "<UserInfo><UserID>u-42"); }, true,
         OvraConnection::kFetchState_Received, "", "tok-1"},
        {"token text that is not JSON", [](FakeOvraState& fake) { fake.SetText(kFetch, "<html>not json</html>"); },
         true, OvraConnection::kFetchState_Fetching, "u-42", ""},
        {"failure reported by the callback",
         [](FakeOvraState& fake) {
             fake.SetText(kFetch, "{\"access_token\": \"ignored\"}");
             fake.SetCallbackStatus(kFetch, 9);
         },
         true, OvraConnection::kFetchState_Failed, "u-42", ""},
        // A refusal at once stays under way: a host polling the state keeps waiting.
        {"fetch refused at once", [](FakeOvraState& fake) { fake.SetStatus(kFetch, 2); }, false,
         OvraConnection::kFetchState_Fetching, "u-42", ""},
    };
    testsupport::TraceCapture trace("OvraConnection:1");
    for (const Outcome& outcome : outcomes) {
        SCOPED_TRACE(outcome.mLabel);
        FakeOvraState& fake = LoadFake(FAKE_OVRA_LIB);
        fake.Reset();
        fake.SetText(kUserInfo, "<UserID>u-42</UserID>");
        fake.SetText(kFetch, "{\"access_token\": \"tok-1\"}");
        outcome.mScript(fake);
        auto connection = Connect(FAKE_OVRA_LIB);
        EXPECT_EQ(connection->GetUserInfoAndFetchToken(true, UTF8String(), UTF8String(), UTF8String(), UTF8String()),
                  outcome.mStarted);
        ASSERT_TRUE(fake.WaitUntilIdle());
        EXPECT_EQ(connection->GetFetchState(), outcome.mState);
        EXPECT_EQ(connection->GetAccessToken(), Text(outcome.mToken));
        EXPECT_EQ(fake.Calls(kFetch), outcome.mUserAsked != nullptr ? 1 : 0);
        if (outcome.mUserAsked != nullptr) {
            EXPECT_EQ(fake.Arguments(kFetch).at(2), outcome.mUserAsked);
        }
    }
    EXPECT_TRUE(trace.Contains("ParseAccessTokenDetails error: "));
}

TEST_F(NativeTokenFetch, AnObjectGoneBeforeItsCallbackIsLeftAlone)
{
    mFake.SetText(kFetch, "{\"access_token\": \"late\"}");
    mFake.HoldCallbacks(true);
    Completions late;
    auto other = Connect(FAKE_OVRA_LIB);
    ASSERT_TRUE(mConnection->GetUserInfoAndFetchToken(true, Text("ann"), UTF8String(), UTF8String(), UTF8String()));
    ASSERT_TRUE(other->AsyncFetchAccessToken(true, Text("ann"), Text("cid"), Text("secret"), Text("scope"),
                                             Completion(late, "late")));
    mConnection.reset();
    other.reset();

    mFake.HoldCallbacks(false);
    ASSERT_TRUE(mFake.WaitUntilIdle());
    EXPECT_EQ(mFake.Calls(kFetch), 2);  // both callbacks were delivered...
    EXPECT_EQ(late.Count(), 0u);        // ...and found nobody
}

}  // namespace
