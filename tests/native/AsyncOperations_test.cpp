// The operations with a completion, the jump to a URL and the accounts: one
// pending completion per connection, what the library is handed, and what a
// host sees of its answers.

#include <gtest/gtest.h>

#include <condition_variable>
#include <mutex>
#include <vector>

#include "FakeOvraLibrary.h"
#include "foundation/core/Opener.h"

namespace {

using namespace nativetest;
using tolmonetsync::OvraConnection;

const char kFetch[] = "OVRA_fetchAccessToken";
const char kRevoke[] = "OVRA_revokeDeviceToken";
const char kRegister[] = "OVRA_fetchIDPResponseForKey";
const char kContinue[] = "OVRA_fetchContinueToken";

class NativeOperations : public ::testing::Test {
protected:
    NativeOperations() : mFake(FAKE_OVRA_LIB), mConnection(Connect(FAKE_OVRA_LIB))
    {
        mFake.SetText(kFetch, "{\"access_token\": \"tok-7\", \"email\": \"ann@example.test\"}");
        mFake.SetText(kRevoke, "revoked");
    }
    ~NativeOperations() override { EXPECT_TRUE(mFake.WaitUntilIdle()); }

    bool Revoke(CompletionRecorder& recorder, const std::string& name)
    {
        return mConnection->AsyncRevokeDeviceToken(true, Text("a"), Text("b"), Text("c"), recorder.Function(name));
    }

    FakeOvraLibrary mFake;
    boost::shared_ptr<OvraConnection> mConnection;
};

TEST_F(NativeOperations, ASecondOperationWhileOneIsPendingIsRefusedAndLeavesTheFirstAlone)
{
    CompletionRecorder recorder;
    mFake.HoldCallbacks(true);
    ASSERT_TRUE(mConnection->AsyncFetchAccessToken(true, Text("ann"), Text("cid"), Text("secret"), Text("scope"),
                                                   recorder.Function("first")));
    EXPECT_FALSE(Revoke(recorder, "second"));
    EXPECT_FALSE(mConnection->AsyncRegisterDeviceToken(true, Text("cid"), Text("secret"), Text("scope"),
                                                       Text("device-token"), recorder.Function("third")));
    EXPECT_EQ(mFake.Calls(kRevoke), 0);
    EXPECT_EQ(mFake.Calls(kRegister), 0);

    mFake.HoldCallbacks(false);
    ASSERT_TRUE(recorder.WaitForCalls(1));
    ASSERT_TRUE(mFake.WaitUntilIdle());
    EXPECT_EQ(recorder.Log(), "first 0 {\"access_token\": \"tok-7\", \"email\": \"ann@example.test\"}\n");

    // The slot is free again once the completion has run.
    EXPECT_TRUE(Revoke(recorder, "after"));
    ASSERT_TRUE(recorder.WaitForCalls(2));
    EXPECT_EQ(mFake.Argument(kFetch, 2), "ann");
}

TEST_F(NativeOperations, ACompletionMayStartTheNextOperation)
{
    CompletionRecorder recorder;
    OvraConnection* connection = mConnection.get();
    auto started = std::make_shared<bool>(false);
    ASSERT_TRUE(mConnection->AsyncFetchAccessToken(
        true, Text("ann"), Text("cid"), Text("secret"), Text("scope"),
        [&recorder, connection, started](OVRA_STATUS status, const char* text) {
            *started =
                connection->AsyncRevokeDeviceToken(true, Text("x"), Text("y"), Text("z"), recorder.Function("chained"));
            recorder.Function("fetched")(status, text);
        }));
    ASSERT_TRUE(recorder.WaitForCalls(2));
    ASSERT_TRUE(mFake.WaitUntilIdle());
    EXPECT_TRUE(*started);
    EXPECT_NE(recorder.Log().find("chained 0 revoked\n"), std::string::npos) << recorder.Log();
    EXPECT_EQ(mFake.Argument(kRevoke, 0), "x");
}

TEST_F(NativeOperations, ARefusalAtOnceDropsTheCompletion)
{
    CompletionRecorder recorder;
    mFake.SetStatus(kRevoke, 4);
    EXPECT_FALSE(Revoke(recorder, "refused"));
    mFake.SetStatus(kRevoke, 0);
    mFake.SetCallbackStatus(kRevoke, 12);
    ASSERT_TRUE(Revoke(recorder, "accepted"));
    ASSERT_TRUE(recorder.WaitForCalls(1));
    ASSERT_TRUE(mFake.WaitUntilIdle());
    EXPECT_EQ(recorder.Log(), "accepted 12 revoked\n");  // the library's status passes on as it is
    EXPECT_EQ(mFake.Argument(kRevoke, 0) + mFake.Argument(kRevoke, 1) + mFake.Argument(kRevoke, 2), "abc");
}

TEST_F(NativeOperations, RegisteringHandsOverEveryValueUnescaped)
{
    mFake.SetText("OVRA_getDeviceID", "dev-9");
    mFake.SetText(kRegister, "registered");
    CompletionRecorder recorder;
    ASSERT_TRUE(mConnection->AsyncRegisterDeviceToken(false, Text("cid"), Text("s<e>c&\""), Text("openid"),
                                                      Text("<tok>"), recorder.Function("register")));
    ASSERT_TRUE(recorder.WaitForCalls(1));
    EXPECT_EQ(mFake.Argument(kRegister, 0),
              "<pwaArgs><clientId>cid</clientId><clientSecret>s<e>c&\"</clientSecret><deviceToken><tok></deviceToken>"
              "<scope>openid</scope><deviceId>dev-9</deviceId><fennickId></fennickId><callerId></callerId>"
              "</pwaArgs>");
    EXPECT_EQ(recorder.Log(), "register 0 registered\n");
}

// The library's own callback form, as a host passes it to RevokeDeviceToken.
struct CallbackRecord {
    std::mutex mMutex;
    std::condition_variable mCame;
    std::vector<std::string> mCalls;
} sRevoked;

void RecordRevoke(OVRA_STATUS status, const char* text, void* context)
{
    std::lock_guard<std::mutex> lock(sRevoked.mMutex);
    sRevoked.mCalls.push_back(std::to_string(status) + " " + (text ? text : "(null)") +
                              (context != nullptr ? " with context" : " without context"));
    sRevoked.mCame.notify_all();
}

TEST_F(NativeOperations, RevokeDeviceTokenPassesStraightThrough)
{
    EXPECT_EQ(mConnection->RevokeDeviceToken(true, "one", "two", "three", &RecordRevoke), 0);
    {
        std::unique_lock<std::mutex> lock(sRevoked.mMutex);
        ASSERT_TRUE(sRevoked.mCame.wait_for(lock, std::chrono::seconds(30), [] { return !sRevoked.mCalls.empty(); }));
        EXPECT_EQ(sRevoked.mCalls, std::vector<std::string>{"0 revoked with context"});
    }
    EXPECT_EQ(mFake.Argument(kRevoke, 1), "two");
    mFake.SetStatus(kRevoke, 6);
    EXPECT_EQ(mConnection->RevokeDeviceToken(true, "one", "two", "three", &RecordRevoke), 6);
}

// Records what would have been opened, on whichever thread.
class OpenerRecorder {
public:
    OpenerRecorder()
        : mPrevious(tolmocore::utility::SetOpener([this](const UTF16String& url) {
              std::lock_guard<std::mutex> lock(mMutex);
              mOpened.push_back(tolmocore::utility::ToNarrow(url));
              return true;
          }))
    {
    }
    ~OpenerRecorder() { tolmocore::utility::SetOpener(mPrevious); }
    std::vector<std::string> Opened()
    {
        std::lock_guard<std::mutex> lock(mMutex);
        return mOpened;
    }

private:
    std::mutex mMutex;
    std::vector<std::string> mOpened;
    tolmocore::utility::Opener mPrevious;
};

TEST_F(NativeOperations, JumpOpensTheJumpURLOfTheAnswer)
{
    OpenerRecorder opener;
    const ImmutableString page = ImmutableString::CreateStatic("https://app.example.test/page");
    EXPECT_FALSE(mConnection->JumpToURL(page, Text("extra")));  // no token fetched, no handle
    EXPECT_EQ(mFake.Calls(kContinue), 0);

    ASSERT_TRUE(mConnection->GetUserInfoAndFetchToken(true, Text("ann"), UTF8String(), UTF8String(), UTF8String()));
    ASSERT_TRUE(mFake.WaitUntilIdle());
    mFake.SetText(kContinue, "{\"jump\": \"https://jump.example.test/go?t=1\"}");
    ASSERT_TRUE(mConnection->JumpToURL(page, Text("extra")));
    ASSERT_TRUE(mFake.WaitUntilIdle());
    EXPECT_EQ(opener.Opened(), std::vector<std::string>{"https://jump.example.test/go?t=1"});
    const std::vector<std::string> expected = {"tok-7",           "PellucidJump", "https://app.example.test/page",
                                               "openid,pellucid", "token",        "extra"};
    for (int i = 0; i < 6; ++i) EXPECT_EQ(mFake.Argument(kContinue, i), expected[i]) << i;

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
    EXPECT_EQ(mFake.Argument(kAccounts, 0), "filter");
    mFake.SetText(kAccounts, nullptr);
    EXPECT_TRUE(mConnection->FetchAccounts(true, Text("filter")).empty());
    mFake.SetText(kAccounts, "[]");
    mFake.SetStatus(kAccounts, 8);
    EXPECT_TRUE(mConnection->FetchAccounts(true, Text("filter")).empty());
}

}  // namespace
