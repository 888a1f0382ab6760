// Search, search for one, and one asset's description: the requests on the
// wire and what each kind of answer gives the caller.

#include <functional>

#include "ClientTestSupport.h"

using namespace tvtest;

namespace {

std::string Query(const HttpRequest& request)
{
    const size_t mark = request.mTarget.find('?');
    return mark == std::string::npos ? std::string() : request.mTarget.substr(mark + 1);
}

}  // namespace

// An empty POST with q and metadata, and a collection's scope last.
TEST_F(ClientTest, SearchSendsItsQueryInTheTargetAndGivesEveryAsset)
{
    mService.Push(Answer(200, "[" + ItemJSON("i1", "a.txt") + "," + CollectionJSON("c1", "g") + "]"));
    mService.Push(Answer(200, "[]"));
    Outcome all, scoped;
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(mClient->SearchAsync(all.Success(), all.Error(), SearchQuery(kCollectionType_Root, u""), id), id);
    ASSERT_TRUE(all.Wait());
    const HttpRequest request = mService.Find("POST", "/api/search?");
    const std::string query = Query(request);
    EXPECT_EQ(query.substr(0, 2), "q=");
    EXPECT_NE(query.find("&metadata=true"), std::string::npos);
    EXPECT_EQ(query.find("scope="), std::string::npos);
    EXPECT_EQ(Decode(query.substr(2, query.find('&') - 2)),
              R"({"trashed":{"$ne":true},"type":"application/vnd.halvane.tarnvault.collection.root"})");
    EXPECT_TRUE(request.mBody.empty());
    ExpectAuthorised(request, id);
    EXPECT_TRUE(all.Succeeded());
    EXPECT_EQ(all.Id(), id);
    const auto assets = all.Last().mAssets;
    ASSERT_EQ(assets.size(), 2u);
    EXPECT_EQ(assets[0]->mId, "i1");
    EXPECT_TRUE(assets[1]->is_collection());

    mClient->SearchAsync(scoped.Success(), scoped.Error(), SearchQuery(Make("abc"), u"n 1"), Guid::CreateUnique());
    ASSERT_TRUE(scoped.Wait());
    const std::string scopedQuery = Query(mService.Find("POST", "/api/search?", "abc"));
    const size_t scope = scopedQuery.find("&scope=");
    ASSERT_NE(scope, std::string::npos);
    EXPECT_LT(scopedQuery.find("&metadata=true"), scope);
    EXPECT_EQ(scopedQuery.substr(scope), "&scope=%5b%22%2fcollections%2fabc%22%5d");
    EXPECT_NE(Decode(scopedQuery).find(R"("name":"n 1")"), std::string::npos);
    EXPECT_TRUE(scoped.Succeeded());
    EXPECT_TRUE(scoped.Last().mAssets.empty());
}

// Answers the client cannot use reach the error callback, under the request's
// identifier, with the service's status and text or with -100 and the step's
// own text; a failure is traced as a warning with its body, a success is not.
TEST_F(ClientTest, UnusableAnswersReachTheErrorCallback)
{
    using Call = std::function<Guid(Tarnvault&, Outcome&, const Guid&)>;
    const Call search = [](Tarnvault& c, Outcome& o, const Guid& id) {
        return c.SearchAsync(o.Success(), o.Error(), SearchQuery(), id);
    };
    const Call searchOne = [](Tarnvault& c, Outcome& o, const Guid& id) {
        return c.SearchOneAsync(o.Success(), o.Error(), SearchQuery(), id);
    };
    const Call root = [](Tarnvault& c, Outcome& o, const Guid& id) {
        return c.GetRootAsync(o.Success(), o.Error(), id);
    };
    const Call header = [](Tarnvault& c, Outcome& o, const Guid& id) {
        return c.HeaderAsync(o.Success(), o.Error(), "c1", true, id);
    };
    // A client without an identifier looks for the user's root by type.
    const boost::shared_ptr<Tarnvault> anyClient(new Tarnvault(Parameters(mService.ApiUrl(), "tok", "")));
    const Call userRoot = [&](Tarnvault&, Outcome& o, const Guid& id) {
        return anyClient->GetRootAsync(o.Success(), o.Error(), id);
    };
    const std::string twoItems = "[" + ItemJSON("i1", "a") + "," + ItemJSON("i2", "a") + "]";
    const std::string searchText = "_HandleSearch: JSON parsing problem";
    const std::string notFound = "Could not find root collection!";
    const std::string noUserRoot = "GetRoot missing or too many root";
    // Twice the bound: what a hostile server could send without end. It is
    // stopped while it arrives.
    const size_t huge = size_t(128) << 20;
    const struct {
        const char* mWhat;
        Call mCall;
        HttpAnswer mReply;
        int mExpectedStatus;
        std::string mExpectedText;
    } cases[] = {
        {"search: 201", search, Answer(201, "[]"), 201, "[]"},
        {"search: refused", search, Answer(404, "gone"), 404, "gone"},
        {"search: an object", search, Answer(200, R"({"id":"x"})"), -100, searchText},
        {"search: not JSON", search, Answer(200, "not json"), -100, searchText},
        {"search: more after the list", search, Answer(200, twoItems + "]"), -100, searchText},
        {"search: an identifier not a string", search, Answer(200, R"([{"id":5}])"), -100, searchText},
        {"search: past the bound", search, Large("[", huge), -100, "_HandleSearch: JSON answer is larger than 64 MiB"},
        {"search one: two", searchOne, Answer(200, twoItems), -100, "SearchOne: too many results"},
        {"root: none", root, Answer(200, "[]"), -100, notFound},
        {"root: not of the root type", root, Answer(200, "[" + CollectionJSON("plain", "client-1") + "]"), -100,
         notFound},
        {"root: 204", root, Answer(204), 204, ""},
        {"root: refused", root, Answer(401, "token expired"), 401, "token expired"},
        {"root: an object", root, Answer(200, "{}"), -100, "_HandleGetRoot: JSON parsing problem"},
        {"user root: an item", userRoot, Answer(200, "[" + ItemJSON("i", "x") + "]"), -100, noUserRoot},
        {"user root: none", userRoot, Answer(200, "[]"), -100, noUserRoot},
        {"header: refused", header, Answer(500), 500, ""},
        {"header: an array", header, Answer(200, "[1]"), -100, "_HandleHeader: JSON parsing problem"},
        {"header: past the bound", header, Large("{", huge), -100, "_HandleHeader: JSON answer is larger than 64 MiB"},
    };
    TraceCapture trace("Tarnvault:1");
    mService.Push(Answer(200, "[]"));
    EXPECT_TRUE(Await([&](Outcome& o) { search(*mClient, o, Guid::CreateUnique()); }).Succeeded());
    for (const auto& c : cases) {
        SCOPED_TRACE(c.mWhat);
        mService.Push(c.mReply);
        const size_t sentBefore = mService.BodyBytesSent();
        const Guid id = Guid::CreateUnique();
        const Outcome outcome = Await([&](Outcome& o) { EXPECT_EQ(c.mCall(*mClient, o, id), id); });
        EXPECT_FALSE(outcome.Succeeded());
        EXPECT_EQ(outcome.Id(), id);
        EXPECT_EQ(outcome.Status(), c.mExpectedStatus);
        EXPECT_EQ(outcome.ErrorText(), c.mExpectedText);
        EXPECT_FALSE(mClient->CachedRoot());
        EXPECT_LT(mService.BodyBytesSent() - sentBefore, huge);
    }
    EXPECT_FALSE(trace.Contains("Search, status_code: 200"));
    EXPECT_TRUE(trace.Contains("Search, status_code: 404, body: gone"));

    // No service at all: the error callback, with status -100.
    const std::string url = "http://127.0.0.1:" + std::to_string(testsupport::ClosedLoopbackPort()) + "/api";
    boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(url, "tok", "c")));
    const Outcome unreachable = Await([&](Outcome& o) { search(*client, o, Guid::CreateUnique()); });
    EXPECT_FALSE(unreachable.Succeeded());
    EXPECT_EQ(unreachable.Status(), -100);
}

TEST_F(ClientTest, BadSearchModifierThrowsOnTheCallersThreadAndSendsNothing)
{
    SearchQuery query;
    query.mTrashed.mModifier = static_cast<SearchModifier>(9);
    Outcome outcome;
    EXPECT_THROW(mClient->SearchAsync(outcome.Success(), outcome.Error(), query, Guid::CreateUnique()),
                 std::runtime_error);
    EXPECT_TRUE(mService.Requests().empty());
    EXPECT_EQ(outcome.Calls(), 0u);
}
