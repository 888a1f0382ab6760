// What the routes refuse; what they keep that the client never asks for in
// one go; search's stable order, scopes of direct members, and conditions;
// a fault hook's aim. The successes the client needs are in the client
// agreement; that every kind of fault fires on every request of a sync is
// in the reliability fault matrix.

#include <algorithm>

#include "ServiceFixture.h"
#include "server/Accounts.h"
#include "server/AssetStore.h"

namespace servertest {
namespace {

class EndpointTest : public ServiceTest {};

TEST_F(EndpointTest, RefusalsAnswerInOneLineAndChangeNothing)
{
    const std::string outer = CreateCollection(*mAlice, "outer");
    const std::string inner = CreateCollection(*mAlice, "inner");
    AddMember(*mAlice, outer, "/collections/" + inner);
    const std::string item = Upload(*mAlice, inner, "item", "bytes");
    const std::string root = ClientRoot(*mAlice, "app");
    const std::string everything = mAlice->Send("POST", "/search?q=" + Quote("{}") + "&metadata=true").mBody;
    const auto create = [](const std::string& header) { return "{\"header\":" + header + "}"; };
    const auto one = [](const std::string& path) { return "[\"" + path + "\"]"; };
    const std::string search = "/search?metadata=true&q=";
    const std::string scoped = search + Quote("{}") + "&scope=";
    struct Row {
        const char* mLabel;
        std::string mMethod, mPath, mBody;
        int mStatus;
    };
    const std::vector<Row> rows = {
        {"client root without a name", "GET", "/collections", "", 400},
        {"create a root", "POST", "/collections",
         create("{\"name\":\"r\",\"type\":\"" + std::string(kRootType) + "\"}"), 400},
        {"create of no kind", "POST", "/collections", create("{\"name\":\"n\",\"type\":\"\"}"), 400},
        {"create without a type", "POST", "/collections", create("{\"name\":\"n\"}"), 400},
        {"create from a cut body", "POST", "/collections", "{\"header\":", 400},
        {"create from a list", "POST", "/collections", "[]", 400},
        {"add a cycle", "PUT", "/collections/" + inner + "/members", one("/collections/" + outer), 409},
        {"add into itself", "PUT", "/collections/" + outer + "/members", one("/collections/" + outer), 409},
        {"add a missing asset", "PUT", "/collections/" + outer + "/members", one("/assets/nothing"), 404},
        {"add into a missing collection", "PUT", "/collections/nothing/members", one("/collections/" + inner), 404},
        {"add a path elsewhere", "PUT", "/collections/" + outer + "/members", one("elsewhere/x"), 400},
        {"add an object", "PUT", "/collections/" + outer + "/members", "{\"a\":1}", 400},
        {"delete with members, not recursive", "DELETE", "/collections/" + outer + "?recursive=false", "", 409},
        {"delete with a bad flag", "DELETE", "/collections/" + outer + "?recursive=maybe", "", 400},
        {"delete a root", "DELETE", "/collections/" + root + "?recursive=true", "", 403},
        {"upload without a name", "POST", "/assets?" + Into(outer).substr(1), "b", 400},
        {"upload into nothing", "POST", "/assets?name=x", "b", 400},
        {"upload elsewhere", "POST", "/assets?name=x&collections=" + Quote(one("/elsewhere/1")), "b", 400},
        {"upload into a missing collection", "POST", "/assets?name=x" + Into("none"), "b", 404},
        {"download of a collection", "GET", "/assets/" + outer, "", 404},
        {"search without a query", "POST", "/search?metadata=true", "", 400},
        {"search by broken JSON", "POST", search + Quote("{not json"), "", 400},
        {"search by a list", "POST", search + Quote("[]"), "", 400},
        {"search by an unknown modifier", "POST", search + Quote("{\"trashed\":{\"$gt\":true}}"), "", 400},
        {"search by a text flag", "POST", search + Quote("{\"trashed\":\"yes\"}"), "", 400},
        {"search by an item type", "POST", search + Quote("{\"type\":\"text/plain\"}"), "", 400},
        {"search in a scope that is no list", "POST", scoped + Quote("\"/collections/" + outer + "\""), "", 400},
        {"search in an /api scope", "POST", scoped + Quote(one("/api/collections/" + outer)), "", 400},
        {"search in a missing scope", "POST", scoped + Quote(one("/collections/nothing")), "", 404},
        {"unknown path", "GET", "/nothing/here", "", 404},
        {"search by GET", "GET", "/search", "", 405},
        {"delete of all collections", "DELETE", "/collections", "", 405},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.mLabel);
        const Reply reply = mAlice->Send(row.mMethod, row.mPath, row.mBody, kJson);
        EXPECT_EQ(row.mStatus, reply.mStatus) << reply.mBody;
        EXPECT_EQ(std::string::npos, reply.mBody.find('\n')) << reply.mBody;
    }
    const std::vector<std::string> collectionType = {std::string("Content-Type: ") + kCollectionType};
    EXPECT_EQ(400, mAlice->Send("POST", "/assets?name=x" + Into(outer), "b", collectionType).mStatus);
    const Reply unknownKey = mAlice->Send("POST", search + Quote("{\"colour\":1}"));
    EXPECT_EQ(400, unknownKey.mStatus);
    EXPECT_NE(std::string::npos, unknownKey.mBody.find("colour")) << unknownKey.mBody;

    EXPECT_EQ(everything, mAlice->Send("POST", "/search?q=" + Quote("{}") + "&metadata=true").mBody);
    EXPECT_EQ((std::vector<std::string>{inner}), Ids(mAlice->Send("GET", "/collections/" + outer + "/members")));
    EXPECT_EQ((std::vector<std::string>{item}), Ids(mAlice->Send("GET", "/collections/" + inner + "/members")));
}

TEST_F(EndpointTest, MembersKeepTheirFirstPlaceAndARecursiveDeleteSparesWhatIsHeldElsewhere)
{
    const std::string parent = CreateCollection(*mAlice, "parent");
    const std::string a = CreateCollection(*mAlice, "a");
    const std::string b = CreateCollection(*mAlice, "b");
    AddMember(*mAlice, parent, "/collections/" + b);
    AddMember(*mAlice, parent, "/collections/" + a);
    AddMember(*mAlice, parent, "/collections/" + b);  // already there: stays where it is
    EXPECT_EQ((std::vector<std::string>{b, a}), Ids(mAlice->Send("GET", "/collections/" + parent + "/members")));

    const std::string only = Upload(*mAlice, a, "only.txt", "o");
    const std::string shared = Upload(*mAlice, a, "shared.txt", "s");
    AddMember(*mAlice, b, "/assets/" + shared);
    ASSERT_EQ(200, mAlice->Send("DELETE", "/collections/" + a + "?recursive=true").mStatus);
    EXPECT_EQ(404, mAlice->Send("GET", "/assets/" + only).mStatus);
    EXPECT_EQ("s", mAlice->Send("GET", "/assets/" + shared).mBody);
    EXPECT_EQ((std::vector<std::string>{b}), Ids(mAlice->Send("GET", "/collections/" + parent + "/members")));
}

const char kNotTrashed[] = "{\"trashed\":{\"$ne\":true}}";

std::string Scope(const std::string& id)
{
    return "[\"/collections/" + id + "\"]";
}

TEST_F(EndpointTest, SearchGivesCreationOrderAndDirectMembersAndSelectsByNameTypeAndTrashedFlag)
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

    const std::string named = CreateCollection(*mAlice, "named");
    const std::string prefs = CreateCollection(*mAlice, "prefs", kPreferencesType);
    const std::string lower = Upload(*mAlice, named, "name", "1");
    const std::string hostile = Upload(*mAlice, named, "name with ?&= and é", "2");
    const std::string trashed = Upload(*mAlice, named, "trashed", "t");
    // Two versions of one name, member order against creation order, each in both collections.
    const std::string x = CreateCollection(*mAlice, "x");
    const std::string y = CreateCollection(*mAlice, "y");
    const std::string older = Upload(*mAlice, y, "same", "1");
    const std::string newer = Upload(*mAlice, x, "same", "2");
    AddMember(*mAlice, x, "/assets/" + older);
    AddMember(*mAlice, y, "/assets/" + newer);
    const std::int64_t alice = *mService->GetAccounts().UserForToken(kAliceToken);
    mService->Assets().SetTrashed(alice, trashed, true);
    mService->Assets().SetTrashed(alice, older, true);
    const std::string xy = "[\"/collections/" + x + "\",\"/collections/" + y + "\"]";
    struct Row {
        const char* mLabel;
        std::string mQuery, mScope;
        std::vector<std::string> mIds;
    };
    const std::string both = "[\"/collections/" + parent + "\",\"/collections/" + other + "\"]";
    const std::vector<Row> rows = {
        {"direct members only", kNotTrashed, Scope(parent), {b, other, a}},
        {"each asset once over several scopes", kNotTrashed, both, {b, other, a, deep}},
        {"exact name", "{\"trashed\":{\"$ne\":true},\"name\":\"name with ?&= and é\"}", Scope(named), {hostile}},
        {"name in another case", "{\"name\":\"Name\"}", Scope(named), {}},
        {"kind of collection", std::string("{\"type\":\"") + kPreferencesType + "\"}", "", {prefs}},
        {"not trashed", kNotTrashed, Scope(named), {lower, hostile}},
        {"trashed", "{\"trashed\":true}", Scope(named), {trashed}},
        {"trashed by $contains", "{\"trashed\":{\"$contains\":true}}", Scope(named), {trashed}},
        {"no condition", "{}", Scope(named), {lower, hostile, trashed}},
        {"a name in member order, each once", "{\"name\":\"same\"}", xy, {newer, older}},
        {"a name without a scope in creation order", "{\"name\":\"same\"}", "", {older, newer}},
        {"a name, not trashed", "{\"name\":\"same\",\"trashed\":{\"$ne\":true}}", xy, {newer}},
        {"a name, trashed", "{\"name\":\"same\",\"trashed\":true}", "", {older}},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.mLabel);
        EXPECT_EQ(row.mIds, Ids(Search(*mAlice, row.mQuery, row.mScope)));
    }
}

TEST_F(EndpointTest, AFaultStatusGoesToTheNthRequestOfItsMethodAndPathOnly)
{
    const std::string item = Upload(*mAlice, CreateCollection(*mAlice, "folder"), "item", "content");
    tolmonetsync::server::FaultRule rule;
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
}

}  // namespace
}  // namespace servertest
