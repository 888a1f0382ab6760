// The operations with a completion, the jump to a URL and the accounts: one
// pending completion per connection, what the library is handed, and what a
// host sees of its answers.

#include <gtest/gtest.h>

#include "FakeOvraLibrary.h"
#include "support/OpenerRecorder.h"

namespace {

using namespace nativetest;
using tolmonetsync::OvraConnection;

const char kFetch[] = "OVRA_fetchAccessToken";
const char kRevoke[] = "OVRA_revokeDeviceToken";
const char kRegister[] = "OVRA_fetchIDPResponseForKey";
const char kContinue[] = "OVRA_fetchContinueToken";
const char kFetched[] = "{\"access_token\": \"tok-7\", \"email\": \"ann@example.test\"}";

class NativeOperations : public ::testing::Test {
protected:
    NativeOperations() : mFake(LoadFake(FAKE_OVRA_LIB)), mConnection(Connect(FAKE_OVRA_LIB))
    {
        mFake.SetText(kFetch, kFetched);
        mFake.SetText(kRevoke, "revoked");
    }
    ~NativeOperations() override { EXPECT_TRUE(mFake.WaitUntilIdle()); }

    bool Revoke(const std::string& name)
    {
        return mConnection->AsyncRevokeDeviceToken(true, Text("a"), Text("b"), Text("c"), Completion(mDone, name));
    }

    FakeOvraState& mFake;
    boost::shared_ptr<OvraConnection> mConnection;
    Completions mDone;
};

TEST_F(NativeOperations, ASecondOperationWhileOneIsPendingIsRefusedAndLeavesTheFirstAlone)
{
    mFake.HoldCallbacks(true);
    ASSERT_TRUE(mConnection->AsyncFetchAccessToken(true, Text("ann"), Text("cid"), Text("secret"), Text("scope"),
                                                   Completion(mDone, "first")));
    EXPECT_FALSE(Revoke("second"));
    EXPECT_FALSE(mConnection->AsyncRegisterDeviceToken(true, Text("cid"), Text("secret"), Text("scope"),
                                                       Text("device-token"), Completion(mDone, "third")));
    EXPECT_EQ(mFake.Calls(kRevoke) + mFake.Calls(kRegister), 0);

    mFake.HoldCallbacks(false);
    ASSERT_TRUE(mDone.WaitFor(1));
    ASSERT_TRUE(mFake.WaitUntilIdle());
    EXPECT_EQ(mDone.All(), std::vector<std::string>{std::string("first 0 ") + kFetched});
    EXPECT_EQ(mFake.Arguments(kFetch).at(2), "ann");

    // The slot is free again once the completion has run; a refusal at once
    // frees it too, and drops its completion.
    mFake.SetStatus(kRevoke, 4);
    EXPECT_FALSE(Revoke("refused"));
    mFake.SetStatus(kRevoke, 0);
    mFake.SetCallbackStatus(kRevoke, 12);
    EXPECT_TRUE(Revoke("after"));
    ASSERT_TRUE(mDone.WaitFor(2));
    ASSERT_TRUE(mFake.WaitUntilIdle());
    // The library's status passes on as it is.
    EXPECT_EQ(mDone.All(), (Strings{std::string("first 0 ") + kFetched, "after 12 revoked"}));
    EXPECT_EQ(mFake.Arguments(kRevoke), (Strings{"a", "b", "c"}));
}

TEST_F(NativeOperations, ACompletionMayStartTheNextOperation)
{
    OvraConnection* connection = mConnection.get();
    Completions done = mDone;
    auto started = std::make_shared<bool>(false);
    ASSERT_TRUE(mConnection->AsyncFetchAccessToken(true, Text("ann"), Text("cid"), Text("secret"), Text("scope"),
                                                   [done, connection, started](OVRA_STATUS status, const char* text) {
                                                       *started = connection->AsyncRevokeDeviceToken(
                                                           true, Text("x"), Text("y"), Text("z"),
                                                           Completion(done, "chained"));
                                                       Completion(done, "fetched")(status, text);
                                                   }));
    ASSERT_TRUE(mDone.WaitFor(2));
    ASSERT_TRUE(mFake.WaitUntilIdle());
    EXPECT_TRUE(*started);
    EXPECT_EQ(mDone.Last(), "chained 0 revoked");
    EXPECT_EQ(mFake.Arguments(kRevoke).at(0), "x");
}

TEST_F(NativeOperations, RegisteringHandsOverEveryValueUnescaped)
{
    mFake.SetText("OVRA_getDeviceID", "dev-9");
    mFake.SetText(kRegister, "registered");
    ASSERT_TRUE(mConnection->AsyncRegisterDeviceToken(false, Text("cid"), Text("s<e>c&\""), Text("openid"),
                                                      Text("<tok>"), Completion(mDone, "register")));
    ASSERT_TRUE(mDone.WaitFor(1));
    EXPECT_EQ(mFake.Arguments(kRegister).at(0),
              "<pwaArgs><clientId>cid</clientId><clientSecret>s<e>c&\"</clientSecret><deviceToken><tok></deviceToken>"
              "<scope>openid</scope><deviceId>dev-9</deviceId><fennickId></fennickId><callerId></callerId>"
              "</pwaArgs>");
    EXPECT_EQ(mDone.Last(), "register 0 registered");
}

// The library's own callback form, as a host passes it to RevokeDeviceToken.
Completions sRevoked;

void RecordRevoke(OVRA_STATUS status, const char* text, void* context)
{
    Completion(sRevoked, context != nullptr ? "with context" : "without context")(status, text);
}

TEST_F(NativeOperations, RevokeDeviceTokenPassesStraightThrough)
{
    EXPECT_EQ(mConnection->RevokeDeviceToken(true, "one", "two", "three", &RecordRevoke), 0);
    ASSERT_TRUE(sRevoked.WaitFor(1));
    EXPECT_EQ(sRevoked.All(), std::vector<std::string>{"with context 0 revoked"});
    EXPECT_EQ(mFake.Arguments(kRevoke), (Strings{"one", "two", "three"}));
    mFake.SetStatus(kRevoke, 6);
    EXPECT_EQ(mConnection->RevokeDeviceToken(true, "one", "two", "three", &RecordRevoke), 6);
}

TEST_F(NativeOperations, JumpOpensTheJumpURLOfTheAnswer)
{
    testsupport::OpenerRecorder opener;
    const ImmutableString page = ImmutableString::CreateStatic("https://app.example.test/page");
    EXPECT_FALSE(mConnection->JumpToURL(page, Text("extra")));  // no token fetched, no handle
    EXPECT_EQ(mFake.Calls(kContinue), 0);

    ASSERT_TRUE(mConnection->GetUserInfoAndFetchToken(true, Text("ann"), UTF8String(), UTF8String(), UTF8String()));
    ASSERT_TRUE(mFake.WaitUntilIdle());
    mFake.SetText(kContinue, "{\"jump\": \"https://jump.example.test/go?t=1\"}");
    ASSERT_TRUE(mConnection->JumpToURL(page, Text("extra")));
    ASSERT_TRUE(mFake.WaitUntilIdle());
    EXPECT_EQ(opener.Opened(), std::vector<std::string>{"https://jump.example.test/go?t=1"});
    EXPECT_EQ(mFake.Arguments(kContinue),
              (Strings{"tok-7", "PellucidJump", "https://app.example.test/page", "openid,pellucid", "token", "extra"}));

    // A failure, an answer without a jump and one that is not JSON open nothing.
    mFake.SetCallbackStatus(kContinue, 1);
    EXPECT_TRUE(mConnection->JumpToURL(page, Text("extra")));
    mFake.SetCallbackStatus(kContinue, 0);
    for (const char* answer : {"{\"jump\": \"\"}", "<html>", "{\"jump\": 5}"}) {
        mFake.SetText(kContinue, answer);
        EXPECT_TRUE(mConnection->JumpToURL(page, Text("extra")));
    }
    ASSERT_TRUE(mFake.WaitUntilIdle());
    EXPECT_EQ(opener.Opened().size(), 1u);
    EXPECT_EQ(mFake.Calls(kContinue), 5);

    mFake.SetStatus(kContinue, 3);
    EXPECT_FALSE(mConnection->JumpToURL(page, Text("extra")));
}

TEST_F(NativeOperations, AccountsAreTheLibrarysTextOrNothing)
{
    const char kAccounts[] = "OVRA_fetchAccounts";
    mFake.SetText(kAccounts, "[{\"id\": \"a-1\"}]");
    EXPECT_EQ(mConnection->FetchAccounts(true, Text("filter")), Text("[{\"id\": \"a-1\"}]"));
    EXPECT_EQ(mFake.Arguments(kAccounts), Strings{"filter"});
    mFake.SetText(kAccounts, nullptr);
    EXPECT_TRUE(mConnection->FetchAccounts(true, Text("filter")).empty());
    mFake.SetText(kAccounts, "[]");
    mFake.SetStatus(kAccounts, 8);
    EXPECT_TRUE(mConnection->FetchAccounts(true, Text("filter")).empty());
}

}  // namespace
