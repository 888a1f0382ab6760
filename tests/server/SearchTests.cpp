// Search: a stable order, scopes of direct members, and its conditions.
// Malformed searches are among the refusals of the routes.

#include <algorithm>

#include "ServiceFixture.h"
#include "server/Accounts.h"
#include "server/AssetStore.h"

namespace servertest {
namespace {

const char kNotTrashed[] = "{\"trashed\":{\"$ne\":true}}";

std::string Scope(const std::string& id)
{
    return "[\"/collections/" + id + "\"]";
}

class SearchTest : public ServiceTest {};

TEST_F(SearchTest, CreationOrderWithoutScopeAndMemberOrderWithOne)
{
    const std::string client = ClientRoot(*mAlice, "app");
    const std::string parent = CreateCollection(*mAlice, "parent");
    const std::string other = CreateCollection(*mAlice, "other");
    const std::string b = Upload(*mAlice, parent, "b.txt", "b");
    AddMember(*mAlice, parent, "/collections/" + other);
    const std::string deep = Upload(*mAlice, other, "deep.txt", "d");
    const std::string a = Upload(*mAlice, parent, "a.txt", "a");
    AddMember(*mAlice, other, "/assets/" + b);

    // The user root first, never a client root.
    const std::vector<std::string> all = Ids(Search(*mAlice, kNotTrashed));
    EXPECT_EQ((std::vector<std::string>{parent, other, b, deep, a}),
              std::vector<std::string>(all.begin() + 1, all.end()));
    EXPECT_EQ(std::find(all.begin(), all.end(), client), all.end());
    // Direct members only, and each asset once over several scopes.
    EXPECT_EQ((std::vector<std::string>{b, other, a}), Ids(Search(*mAlice, kNotTrashed, Scope(parent))));
    EXPECT_EQ((std::vector<std::string>{b, other, a, deep}),
              Ids(Search(*mAlice, kNotTrashed, "[\"/collections/" + parent + "\",\"/collections/" + other + "\"]")));
}

TEST_F(SearchTest, ConditionsSelectByNameTypeAndTrashedFlag)
{
    const std::string parent = CreateCollection(*mAlice, "parent");
    const std::string prefs = CreateCollection(*mAlice, "prefs", kPreferencesType);
    const std::string lower = Upload(*mAlice, parent, "name", "1");
    const std::string hostile = Upload(*mAlice, parent, "name with ?&= and é", "2");
    const std::string trashed = Upload(*mAlice, parent, "trashed", "t");
    mService->Assets().SetTrashed(*mService->GetAccounts().UserForToken(kAliceToken), trashed, true);
    struct Row {
        const char* mLabel;
        std::string mQuery, mScope;
        std::vector<std::string> mIds;
    };
    const std::vector<Row> rows = {
        {"exact name", "{\"trashed\":{\"$ne\":true},\"name\":\"name with ?&= and é\"}", Scope(parent), {hostile}},
        {"name in another case", "{\"name\":\"Name\"}", Scope(parent), {}},
        {"kind of collection", std::string("{\"type\":\"") + kPreferencesType + "\"}", "", {prefs}},
        {"not trashed", kNotTrashed, Scope(parent), {lower, hostile}},
        {"trashed", "{\"trashed\":true}", Scope(parent), {trashed}},
        {"trashed by $contains", "{\"trashed\":{\"$contains\":true}}", Scope(parent), {trashed}},
        {"no condition", "{}", Scope(parent), {lower, hostile, trashed}},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.mLabel);
        EXPECT_EQ(row.mIds, Ids(Search(*mAlice, row.mQuery, row.mScope)));
    }
}

}  // namespace
}  // namespace servertest
