// Search: order, scopes, the trashed condition and malformed queries.

#include <algorithm>

#include "ServiceFixture.h"
#include "server/Accounts.h"
#include "server/AssetStore.h"

namespace servertest {
namespace {

const char kNotTrashed[] = "{\"trashed\":{\"$ne\":true}}";

class SearchTest : public ServiceTest {
protected:
    std::string Scope(const std::string& id) { return "[\"/collections/" + id + "\"]"; }
};

TEST_F(SearchTest, WithoutScopeGivesCreationOrderAndNoClientRoots)
{
    const std::string client = ClientRoot(*mAlice, "app");
    const std::string second = CreateCollection(*mAlice, "b");
    const std::string first = CreateCollection(*mAlice, "a");
    const std::vector<std::string> ids = Ids(Search(*mAlice, kNotTrashed));
    ASSERT_EQ(3u, ids.size());  // the user root, then the two in the order they were made
    EXPECT_EQ(second, ids[1]);
    EXPECT_EQ(first, ids[2]);
    EXPECT_EQ(std::find(ids.begin(), ids.end(), client), ids.end());
}

TEST_F(SearchTest, WithScopeGivesDirectMembersInMemberOrder)
{
    const std::string parent = CreateCollection(*mAlice, "parent");
    const std::string inner = CreateCollection(*mAlice, "inner");
    const std::string b = Upload(*mAlice, parent, "b.txt", "b");
    AddMember(*mAlice, parent, "/collections/" + inner);
    Upload(*mAlice, inner, "deep.txt", "d");
    const std::string a = Upload(*mAlice, parent, "a.txt", "a");
    EXPECT_EQ((std::vector<std::string>{b, inner, a}), Ids(Search(*mAlice, kNotTrashed, Scope(parent))));
}

TEST_F(SearchTest, ByNameWithinAScopeFindsExactlyThatName)
{
    const std::string parent = CreateCollection(*mAlice, "parent");
    Upload(*mAlice, parent, "Name", "1");
    const std::string wanted = Upload(*mAlice, parent, "name with ?&= and é", "2");
    const std::string query = "{\"trashed\":{\"$ne\":true},\"name\":\"name with ?&= and é\"}";
    EXPECT_EQ((std::vector<std::string>{wanted}), Ids(Search(*mAlice, query, Scope(parent))));
    EXPECT_TRUE(Ids(Search(*mAlice, "{\"name\":\"name\"}", Scope(parent))).empty());
}

TEST_F(SearchTest, SeveralScopesGiveEachAssetOnce)
{
    const std::string one = CreateCollection(*mAlice, "one");
    const std::string two = CreateCollection(*mAlice, "two");
    const std::string shared = Upload(*mAlice, one, "shared", "s");
    AddMember(*mAlice, two, "/assets/" + shared);
    const std::string own = Upload(*mAlice, two, "own", "o");
    const std::string scopes = "[\"/collections/" + one + "\",\"/collections/" + two + "\"]";
    EXPECT_EQ((std::vector<std::string>{shared, own}), Ids(Search(*mAlice, kNotTrashed, scopes)));
}

TEST_F(SearchTest, TrashedConditionSelectsByFlag)
{
    const std::string parent = CreateCollection(*mAlice, "parent");
    const std::string kept = Upload(*mAlice, parent, "kept", "k");
    const std::string trashed = Upload(*mAlice, parent, "trashed", "t");
    mService->Assets().SetTrashed(*mService->GetAccounts().UserForToken(kAliceToken), trashed, true);
    EXPECT_EQ((std::vector<std::string>{kept}), Ids(Search(*mAlice, kNotTrashed, Scope(parent))));
    EXPECT_EQ((std::vector<std::string>{trashed}), Ids(Search(*mAlice, "{\"trashed\":true}", Scope(parent))));
    EXPECT_EQ((std::vector<std::string>{trashed}),
              Ids(Search(*mAlice, "{\"trashed\":{\"$contains\":true}}", Scope(parent))));
    EXPECT_EQ((std::vector<std::string>{kept, trashed}), Ids(Search(*mAlice, "{}", Scope(parent))));
}

TEST_F(SearchTest, TypeFindsOnlyCollectionsOfThatKind)
{
    const std::string prefs = CreateCollection(*mAlice, "prefs", kPreferencesType);
    CreateCollection(*mAlice, "plain");
    const std::string query = std::string("{\"type\":\"") + kPreferencesType + "\",\"trashed\":{\"$ne\":true}}";
    EXPECT_EQ((std::vector<std::string>{prefs}), Ids(Search(*mAlice, query)));
}

TEST_F(SearchTest, MalformedQueriesAndScopesAreRefused)
{
    const std::string parent = CreateCollection(*mAlice, "parent");
    EXPECT_EQ(400, mAlice->Send("POST", "/search?metadata=true").mStatus);
    EXPECT_EQ(400, Search(*mAlice, "{not json").mStatus);
    EXPECT_EQ(400, Search(*mAlice, "[]").mStatus);
    EXPECT_EQ(400, Search(*mAlice, "{\"trashed\":{\"$gt\":true}}").mStatus);
    EXPECT_EQ(400, Search(*mAlice, "{\"trashed\":\"yes\"}").mStatus);
    EXPECT_EQ(400, Search(*mAlice, "{\"type\":\"text/plain\"}").mStatus);
    EXPECT_EQ(400, Search(*mAlice, kNotTrashed, "\"/collections/" + parent + "\"").mStatus);
    EXPECT_EQ(400, Search(*mAlice, kNotTrashed, "[\"/api/collections/" + parent + "\"]").mStatus);
    EXPECT_EQ(404, Search(*mAlice, kNotTrashed, "[\"/collections/nothing\"]").mStatus);
    const Reply refused = Search(*mAlice, "{\"colour\":1}");
    EXPECT_EQ(400, refused.mStatus);
    EXPECT_NE(std::string::npos, refused.mBody.find("colour"));
}

}  // namespace
}  // namespace servertest
