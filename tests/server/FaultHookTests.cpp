// Faults happen on the service's side, and each hook tells whether it fired.

#include "ServiceFixture.h"

namespace servertest {
namespace {

using tolmonetsync::server::FaultAction;
using tolmonetsync::server::FaultRule;

class FaultHookTest : public ServiceTest {
protected:
    void SetUp() override
    {
        ServiceTest::SetUp();
        mFolder = CreateCollection(*mAlice, "folder");
        mItem = Upload(*mAlice, mFolder, "item", "content");
    }

    FaultRule Rule(const char* method, const char* pattern, FaultAction action, int nth = 1)
    {
        FaultRule rule;
        rule.mMethod = method;
        rule.mPathPattern = pattern;
        rule.mAction = action;
        rule.mNth = nth;
        return rule;
    }

    Reply Download() { return mAlice->Send("GET", "/assets/" + mItem); }

    std::string mFolder;
    std::string mItem;
};

TEST_F(FaultHookTest, StatusGoesToTheNthMatchingRequestOnly)
{
    FaultRule rule = Rule("GET", "/api/assets/[^/]+", tolmonetsync::server::FaultAction_Status, 2);
    rule.mStatus = 503;
    rule.mBody = "service unavailable\nfor a while";
    const auto hook = mService->Faults().Install(rule);
    EXPECT_EQ(200, mAlice->Send("GET", "/assets/" + mItem + "/metadata").mStatus);  // does not match
    EXPECT_EQ(200, Download().mStatus);
    EXPECT_FALSE(hook->Fired());
    const Reply failed = Download();
    EXPECT_EQ(503, failed.mStatus);
    EXPECT_EQ("service unavailable for a while", failed.mBody);
    EXPECT_TRUE(hook->Fired());
    EXPECT_EQ(200, Download().mStatus);
    EXPECT_EQ(3, hook->Seen());
}

TEST_F(FaultHookTest, MethodMustMatchToo)
{
    const auto hook =
        mService->Faults().Install(Rule("POST", "/api/assets/.*", tolmonetsync::server::FaultAction_Status));
    EXPECT_EQ(200, Download().mStatus);
    EXPECT_FALSE(hook->Fired());
    EXPECT_EQ(0, hook->Seen());
}

TEST_F(FaultHookTest, DelayStillAnswers)
{
    FaultRule rule = Rule("GET", "/api/assets/.*", tolmonetsync::server::FaultAction_Delay);
    rule.mDelay = std::chrono::milliseconds(20);
    const auto hook = mService->Faults().Install(rule);
    const Reply reply = Download();
    EXPECT_TRUE(hook->Fired());
    EXPECT_EQ(200, reply.mStatus);
    EXPECT_EQ("content", reply.mBody);
}

TEST_F(FaultHookTest, CloseBeforeAnswerGivesNoReplyAndTheNextRequestWorks)
{
    const auto hook =
        mService->Faults().Install(Rule("GET", "/api/assets/.*", tolmonetsync::server::FaultAction_CloseBeforeAnswer));
    std::unique_ptr<ServiceClient> fresh = Client(kAliceToken);  // a new connection: nothing to fall back on
    const Reply dropped = fresh->Send("GET", "/assets/" + mItem);
    EXPECT_TRUE(hook->Fired());
    EXPECT_EQ(CURLE_GOT_NOTHING, dropped.mCode) << curl_easy_strerror(dropped.mCode);
    EXPECT_EQ(200, fresh->Send("GET", "/assets/" + mItem).mStatus);
}

TEST_F(FaultHookTest, CloseBeforeAnswerOnAReusedConnectionIsRetriedByLibcurl)
{
    // libcurl sends again, on a new connection, a request whose reused
    // connection closed without a byte: the service sees it twice.
    const auto hook =
        mService->Faults().Install(Rule("GET", "/api/assets/.*", tolmonetsync::server::FaultAction_CloseBeforeAnswer));
    const Reply reply = Download();  // mAlice's connection is kept alive from SetUp
    EXPECT_TRUE(hook->Fired());
    EXPECT_EQ(CURLE_OK, reply.mCode);
    EXPECT_EQ(200, reply.mStatus);
    EXPECT_EQ(2, hook->Seen());
}

TEST_F(FaultHookTest, CloseMidBodyCutsTheTransfer)
{
    const auto hook =
        mService->Faults().Install(Rule("POST", "/api/search", tolmonetsync::server::FaultAction_CloseMidBody));
    const Reply cut = Search(*mAlice, "{}");
    EXPECT_TRUE(hook->Fired());
    EXPECT_EQ(CURLE_PARTIAL_FILE, cut.mCode) << curl_easy_strerror(cut.mCode);
    EXPECT_EQ(200, Search(*mAlice, "{}").mStatus);
}

TEST_F(FaultHookTest, BrokenBodiesAreNotReadableAssets)
{
    const auto notJson =
        mService->Faults().Install(Rule("POST", "/api/search", tolmonetsync::server::FaultAction_NotJson));
    const Reply first = Search(*mAlice, "{}");
    EXPECT_TRUE(notJson->Fired());
    EXPECT_EQ(200, first.mStatus);
    EXPECT_ANY_THROW(Assets(first));

    const auto wrongShape = mService->Faults().Install(
        Rule("GET", "/api/assets/[^/]+/metadata", tolmonetsync::server::FaultAction_WrongShapeJson));
    const Reply header = mAlice->Send("GET", "/assets/" + mItem + "/metadata");
    EXPECT_TRUE(wrongShape->Fired());
    EXPECT_EQ(200, header.mStatus);
    EXPECT_ANY_THROW(Assets(header));  // one object holding a numeric type: no list, no asset
}

TEST_F(FaultHookTest, ClearRemovesEveryRule)
{
    const auto hook = mService->Faults().Install(Rule("", ".*", tolmonetsync::server::FaultAction_Status));
    mService->Faults().Clear();
    EXPECT_EQ(200, Download().mStatus);
    EXPECT_FALSE(hook->Fired());
}

}  // namespace
}  // namespace servertest
