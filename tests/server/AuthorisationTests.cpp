// A live token opens the service, and each user's tree is theirs alone.

#include "ServiceFixture.h"
#include "server/Accounts.h"

namespace servertest {
namespace {

class AuthorisationTest : public ServiceTest {
protected:
    std::string mFolder = CreateCollection(*mAlice, "alice's");
    std::string mItem = Upload(*mAlice, mFolder, "secret.txt", "alice only");
};

TEST_F(AuthorisationTest, MissingUnknownOrExpiredTokensGet401InOneLine)
{
    mService->GetAccounts().GrantToken("alice", "alice-expired", -1);
    mService->GetAccounts().GrantToken("alice", "alice-for-an-hour", 3600);
    ServiceClient anonymous(mService->AssetServiceUrl(), "");
    const Reply missing = anonymous.Send("GET", "/assets/" + mItem);
    EXPECT_EQ(401, missing.mStatus);
    EXPECT_EQ("missing or unknown access token", missing.mBody);
    EXPECT_EQ(401, anonymous.Send("GET", "/assets/" + mItem, "", {"Authorization: Basic YWxpY2U6cHc="}).mStatus);
    for (const char* refused : {"not-a-token", "alice-expired"}) {
        EXPECT_EQ(401, Client(refused)->Send("POST", "/search?q=" + Quote("{}") + "&metadata=true").mStatus) << refused;
    }
    EXPECT_EQ("alice only", Client("alice-for-an-hour")->Send("GET", "/assets/" + mItem).mBody);
}

TEST_F(AuthorisationTest, AnotherUserCanNeitherFindNorChangeTheTree)
{
    const std::string bobs = CreateCollection(*mBob, "bob's");
    const std::vector<std::pair<std::string, std::string> > requests = {
        {"GET", "/assets/" + mItem},
        {"GET", "/assets/" + mItem + "/metadata"},
        {"GET", "/collections/" + mFolder + "/header"},
        {"GET", "/collections/" + mFolder + "/members"},
        {"POST", "/search?metadata=true&q=" + Quote("{}") + "&scope=" + Quote("[\"/collections/" + mFolder + "\"]")},
        {"PUT", "/collections/" + bobs + "/members"},  // alice's item into bob's folder
        {"PUT", "/collections/" + mFolder + "/members"},
        {"POST", "/assets?name=x" + Into(mFolder)},
        {"DELETE", "/assets/" + mItem + "?recursive=true"},
        {"DELETE", "/collections/" + mFolder + "?recursive=true"},
    };
    for (const auto& request : requests) {
        const std::string body = request.first == "PUT" ? "[\"/assets/" + mItem + "\"]" : "";
        EXPECT_EQ(404, mBob->Send(request.first, request.second, body, kJson).mStatus)
            << request.first << " " << request.second;
    }
    for (const std::string& id : Ids(Search(*mBob, "{}"))) {
        EXPECT_NE(mItem, id);
        EXPECT_NE(mFolder, id);
    }
    EXPECT_TRUE(Ids(mBob->Send("GET", "/collections/" + bobs + "/members")).empty());
    EXPECT_EQ("alice only", mAlice->Send("GET", "/assets/" + mItem).mBody);
    EXPECT_EQ((std::vector<std::string>{mItem}), Ids(mAlice->Send("GET", "/collections/" + mFolder + "/members")));
    // One client root per client identifier and user.
    EXPECT_EQ(ClientRoot(*mAlice, "app"), ClientRoot(*mAlice, "app"));
    EXPECT_NE(ClientRoot(*mAlice, "app"), ClientRoot(*mAlice, "other app"));
    EXPECT_NE(ClientRoot(*mAlice, "app"), ClientRoot(*mBob, "app"));
}

}  // namespace
}  // namespace servertest
