// A fault goes to the one request it names, and its hook tells whether it
// fired. That each kind of fault fires on every request of a sync is shown
// by the reliability fault matrix.

#include "ServiceFixture.h"

namespace servertest {
namespace {

using tolmonetsync::server::FaultRule;

class FaultHookTest : public ServiceTest {};

TEST_F(FaultHookTest, AStatusGoesToTheNthRequestOfItsMethodAndPathOnly)
{
    const std::string item = Upload(*mAlice, CreateCollection(*mAlice, "folder"), "item", "content");
    FaultRule rule;
    rule.mMethod = "GET";
    rule.mPathPattern = "/api/assets/[^/]+";
    rule.mNth = 2;
    rule.mStatus = 503;
    rule.mBody = "service unavailable\nfor a while";
    const auto hook = mService->Faults().Install(rule);
    rule.mMethod = "POST";
    const auto otherMethod = mService->Faults().Install(rule);

    EXPECT_EQ(200, mAlice->Send("GET", "/assets/" + item + "/metadata").mStatus);  // not the whole path
    EXPECT_EQ(200, mAlice->Send("GET", "/assets/" + item).mStatus);
    EXPECT_FALSE(hook->Fired());
    const Reply failed = mAlice->Send("GET", "/assets/" + item);
    EXPECT_EQ(503, failed.mStatus);
    EXPECT_EQ("service unavailable for a while", failed.mBody);  // a status body is one line
    EXPECT_TRUE(hook->Fired());
    EXPECT_EQ(200, mAlice->Send("GET", "/assets/" + item).mStatus);
    EXPECT_EQ(3, hook->Seen());
    EXPECT_EQ(0, otherMethod->Seen());

    rule.mMethod = "";
    rule.mNth = 1;
    const auto cleared = mService->Faults().Install(rule);
    mService->Faults().Clear();
    EXPECT_EQ(200, mAlice->Send("GET", "/assets/" + item).mStatus);
    EXPECT_FALSE(cleared->Fired());
}

}  // namespace
}  // namespace servertest
