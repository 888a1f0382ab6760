// Fetching a token through the native library: which user, client and secret
// the library is asked for, how each outcome of its callback, delivered on
// its own thread, shows in the fetch state, and the token opening the asset
// service.

#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <string>
#include <thread>

#include "FakeOvraLibrary.h"
#include "identity/OvraAuth.h"
#include "support/IdentityService.h"
#include "support/TestScopes.h"

namespace {

using namespace nativetest;
using tolmonetsync::OvraConnection;

const char kUserInfo[] = "OVRA_fetchDefaultUserInfoForClientId";
const char kFetch[] = "OVRA_fetchAccessToken";

TEST(NativeTokenFetch, StagingTakesTheStagingSecretAndGivenValuesPassAsTheyAre)
{
    FakeOvraState& fake = LoadFake(FAKE_OVRA_LIB);
    auto connection = Connect(FAKE_OVRA_LIB);
    ASSERT_TRUE(connection->GetUserInfoAndFetchToken(false, Text("ann"), UTF8String(), UTF8String(), UTF8String()));
    EXPECT_EQ(fake.Calls(kUserInfo), 0);  // a named user is not looked up
    EXPECT_EQ(fake.Arguments("OVRA_createRef").at(1), "0");
    EXPECT_EQ(fake.Arguments(kFetch), (Strings{tolmonetsync::kTOLMO_OVRA_CLIENT_ID.ToStdString(),
                                               tolmonetsync::kTOLMO_OVRA_CLIENT_SECRET_STAGE.ToStdString(), "ann", "",
                                               "openid,HalvaneID,pellucid"}));

    // The handle exists now: a later production flag changes nothing.
    ASSERT_TRUE(connection->GetUserInfoAndFetchToken(true, Text("ann"), Text("cid"), Text("s<cret"), Text("sc")));
    EXPECT_EQ(fake.Calls("OVRA_createRef"), 1);
    EXPECT_EQ(fake.Arguments(kFetch), (Strings{"cid", "s<cret", "ann", "", "sc"}));
    EXPECT_TRUE(fake.WaitUntilIdle());
}

// How each outcome of the library shows in the return value and the state.
TEST(NativeTokenFetch, EachOutcomeOfTheLibraryShowsInTheFetchState)
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

TEST(NativeTokenFetch, AnObjectGoneBeforeItsCallbackIsLeftAlone)
{
    FakeOvraState& fake = LoadFake(FAKE_OVRA_LIB);
    auto connection = Connect(FAKE_OVRA_LIB);
    fake.SetText(kFetch, "{\"access_token\": \"late\"}");
    fake.HoldCallbacks(true);
    Completions late;
    auto other = Connect(FAKE_OVRA_LIB);
    ASSERT_TRUE(connection->GetUserInfoAndFetchToken(true, Text("ann"), UTF8String(), UTF8String(), UTF8String()));
    ASSERT_TRUE(other->AsyncFetchAccessToken(true, Text("ann"), Text("cid"), Text("secret"), Text("scope"),
                                             Completion(late, "late")));
    connection.reset();
    other.reset();

    fake.HoldCallbacks(false);
    ASSERT_TRUE(fake.WaitUntilIdle());
    EXPECT_EQ(fake.Calls(kFetch), 2);  // both callbacks were delivered...
    EXPECT_EQ(late.Count(), 0u);       // ...and found nobody
}

// The whole way of a native sign-in for the library's default user: the
// library hands out a real access token of the local service on its own
// thread, and the credentials a host builds from the connection open the
// asset service.
TEST(NativeSignIn, TheLibrarysTokenForTheDefaultUserOpensTheAssetService)
{
    testsupport::PrefDirScope prefs;
    testsupport::IdentityService service;
    const testsupport::Answered signedIn = testsupport::SignIn("ann", "secret");
    ASSERT_EQ(signedIn.Status(), 200);
    const std::string token = signedIn.mAnswer.access_token.ToStdString();

    FakeOvraState& fake = LoadFake(FAKE_OVRA_LIB);
    fake.SetText(kUserInfo, "<UserInfo><UserID>u-42</UserID><Name>Ann</Name></UserInfo>");
    fake.SetText(kFetch, ("{\"access_token\": \"" + token + "\", \"email\": \"ann@example.test\"}").c_str());
    fake.HoldCallbacks(true);  // the answer comes after the call has returned
    auto connection = Connect(FAKE_OVRA_LIB);
    EXPECT_EQ(connection->GetFetchState(), OvraConnection::kFetchState_None);
    ASSERT_TRUE(connection->GetUserInfoAndFetchToken(true, UTF8String(), UTF8String(), UTF8String(), UTF8String()));
    EXPECT_EQ(connection->GetFetchState(), OvraConnection::kFetchState_Fetching);
    EXPECT_EQ(connection->GetUserID(), Text("u-42"));
    fake.HoldCallbacks(false);
    ASSERT_TRUE(fake.WaitUntilIdle());
    ASSERT_EQ(connection->GetFetchState(), OvraConnection::kFetchState_Received);
    EXPECT_EQ(connection->GetEmail(), Text("ann@example.test"));

    // Production, the built-in client and its production secret, the default scope.
    EXPECT_EQ(fake.Arguments("OVRA_createRef"), (Strings{"context", "1"}));
    const std::string client = tolmonetsync::kTOLMO_OVRA_CLIENT_ID.ToStdString();
    EXPECT_EQ(fake.Arguments(kUserInfo), Strings{client});
    EXPECT_EQ(fake.Arguments(kFetch), (Strings{client, tolmonetsync::kTOLMO_OVRA_CLIENT_SECRET_GM.ToStdString(), "u-42",
                                               "", "openid,HalvaneID,pellucid"}));

    tolmonetsync::OvraCredentials credentials;
    credentials.accessToken = connection->GetAccessToken();
    credentials.userID = connection->GetEmail();
    const auto assets = service.Client();
    EXPECT_EQ(testsupport::SetCredentials(assets, credentials), tolmonetsync::SyncServer_Connected);
    EXPECT_EQ(testsupport::RootStatus(assets), 200);
}

// Spins until the fetch has ended; bounded so a lost callback fails instead of hanging.
int AwaitEndOfFetch(const OvraConnection& connection)
{
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(30);
    int state = connection.fetchState.load(std::memory_order_acquire);
    while (state < OvraConnection::kFetchState_Received && std::chrono::steady_clock::now() < deadline) {
        std::this_thread::yield();
        state = connection.fetchState.load(std::memory_order_acquire);
    }
    return state;
}

// A host polls the public fetch state from its own thread and, once it reads
// 2, 3 or 4, reads the user's fields directly while the library's thread
// may still be running. ThreadSanitizer checks that the fields were
// published before the state.
TEST(NativeFetchPublication, FieldsAreCompleteOnceTheStateSaysReceived)
{
    FakeOvraState& fake = LoadFake(FAKE_OVRA_LIB);
    const boost::shared_ptr<OvraConnection> connection = Connect(FAKE_OVRA_LIB);
    for (int round = 0; round < 20; ++round) {
        const std::string n = std::to_string(round);
        fake.SetText("OVRA_fetchAccessToken",
                     ("{\"access_token\": \"tok-" + n + "\", \"email\": \"u" + n + "@example.test\"}").c_str());
        ASSERT_TRUE(connection->GetUserInfoAndFetchToken(true, UTF8String("user-" + n), UTF8String(), UTF8String(),
                                                         UTF8String()));
        ASSERT_EQ(AwaitEndOfFetch(*connection), OvraConnection::kFetchState_Received) << round;
        // Read at once, with no lock and no wait for the library's thread.
        EXPECT_EQ(connection->accessToken.ToStdString(), "tok-" + n);
        EXPECT_EQ(connection->email.ToStdString(), "u" + n + "@example.test");
        EXPECT_EQ(connection->userID.ToStdString(), "user-" + n);
        ASSERT_TRUE(fake.WaitUntilIdle());
    }
}

}  // namespace
