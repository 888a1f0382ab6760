// Tokens open the service, and each user's tree is theirs alone.

#include "ServiceFixture.h"
#include "server/Accounts.h"

namespace servertest {
namespace {

class AuthorisationTest : public ServiceTest {
protected:
    void SetUp() override
    {
        ServiceTest::SetUp();
        mFolder = CreateCollection(*mAlice, "alice's");
        mItem = Upload(*mAlice, mFolder, "secret.txt", "alice only");
    }

    std::string mFolder;
    std::string mItem;
};

TEST_F(AuthorisationTest, MissingOrUnknownTokensGet401WithOneLine)
{
    ServiceClient anonymous(mService->AssetServiceUrl(), "");
    const Reply missing = anonymous.Send("GET", "/assets/" + mItem);
    EXPECT_EQ(401, missing.mStatus);
    EXPECT_FALSE(missing.mBody.empty());
    EXPECT_EQ(std::string::npos, missing.mBody.find('\n'));
    ServiceClient stranger(mService->AssetServiceUrl(), "not-a-token");
    EXPECT_EQ(401, stranger.Send("POST", "/search?q=" + Quote("{}") + "&metadata=true").mStatus);
    const Reply basic = anonymous.Send("GET", "/assets/" + mItem, "", {"Authorization: Basic YWxpY2U6cHc="});
    EXPECT_EQ(401, basic.mStatus);
}

TEST_F(AuthorisationTest, AnotherUserCannotReadByIdOrFindBySearch)
{
    EXPECT_EQ(404, mBob->Send("GET", "/assets/" + mItem).mStatus);
    EXPECT_EQ(404, mBob->Send("GET", "/assets/" + mItem + "/metadata").mStatus);
    EXPECT_EQ(404, mBob->Send("GET", "/collections/" + mFolder + "/header").mStatus);
    EXPECT_EQ(404, mBob->Send("GET", "/collections/" + mFolder + "/members").mStatus);
    EXPECT_EQ(404, Search(*mBob, "{}", "[\"/collections/" + mFolder + "\"]").mStatus);
    for (const std::string& id : Ids(Search(*mBob, "{}"))) {
        EXPECT_NE(mItem, id);
        EXPECT_NE(mFolder, id);
    }
}

TEST_F(AuthorisationTest, AnotherUserCannotChangeOrDelete)
{
    const std::string bobs = CreateCollection(*mBob, "bob's");
    const std::vector<std::string> json = {"Content-Type: application/json"};
    EXPECT_EQ(404, mBob->Send("PUT", "/collections/" + bobs + "/members", "[\"/assets/" + mItem + "\"]", json).mStatus);
    EXPECT_EQ(
        404,
        mBob->Send("PUT", "/collections/" + mFolder + "/members", "[\"/collections/" + bobs + "\"]", json).mStatus);
    EXPECT_EQ(404, mBob->Send("POST", "/assets?name=x&collections=" + Quote("[\"/api/collections/" + mFolder + "\"]"),
                              "intruder")
                       .mStatus);
    EXPECT_EQ(404, mBob->Send("DELETE", "/assets/" + mItem + "?recursive=true").mStatus);
    EXPECT_EQ(404, mBob->Send("DELETE", "/collections/" + mFolder + "?recursive=true").mStatus);
    const Reply still = mAlice->Send("GET", "/assets/" + mItem);
    EXPECT_EQ(200, still.mStatus);
    EXPECT_EQ("alice only", still.mBody);
    EXPECT_EQ((std::vector<std::string>{mItem}), Ids(mAlice->Send("GET", "/collections/" + mFolder + "/members")));
}

TEST_F(AuthorisationTest, ExpiredTokensGet401AndLiveOnesStillWork)
{
    mService->GetAccounts().GrantToken("alice", "alice-expired", -1);
    mService->GetAccounts().GrantToken("alice", "alice-for-an-hour", 3600);
    ServiceClient expired(mService->AssetServiceUrl(), "alice-expired");
    EXPECT_EQ(401, expired.Send("GET", "/assets/" + mItem).mStatus);
    ServiceClient live(mService->AssetServiceUrl(), "alice-for-an-hour");
    EXPECT_EQ(200, live.Send("GET", "/assets/" + mItem).mStatus);
}

TEST_F(AuthorisationTest, SameClientIdGivesEachUserTheirOwnRoot)
{
    EXPECT_NE(ClientRoot(*mAlice, "app"), ClientRoot(*mBob, "app"));
}

TEST_F(AuthorisationTest, PasswordsAreCheckedAndTokensCanBeGrantedLater)
{
    tolmonetsync::server::Accounts& accounts = mService->GetAccounts();
    accounts.SetUser("carol", "correct horse", "");
    EXPECT_TRUE(accounts.CheckPassword("carol", "correct horse"));
    EXPECT_FALSE(accounts.CheckPassword("carol", "wrong"));
    EXPECT_FALSE(accounts.CheckPassword("nobody", "correct horse"));
    accounts.GrantToken("carol", "carol-token");
    ServiceClient carol(mService->AssetServiceUrl(), "carol-token");
    EXPECT_EQ(200, carol.Send("GET", "/collections?name=app").mStatus);
    EXPECT_EQ(404, carol.Send("GET", "/assets/" + mItem).mStatus);
}

}  // namespace
}  // namespace servertest
