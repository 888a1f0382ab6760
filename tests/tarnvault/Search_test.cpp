// Search, search for one, and one asset's description: the requests on the
// wire and what each kind of answer gives the caller.

#include "ClientTestSupport.h"

using namespace tvtest;

namespace {

std::string Query(const HttpRequest& request)
{
    const size_t mark = request.mTarget.find('?');
    return mark == std::string::npos ? std::string() : request.mTarget.substr(mark + 1);
}

}  // namespace

TEST_F(ClientTest, SearchWithoutScopeIsAnEmptyPostWithQAndMetadata)
{
    mService.Script(200, "[" + ItemJSON("i1", "a.txt") + "," + CollectionJSON("c1", "g") + "]");
    Outcome outcome;
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(mClient->SearchAsync(outcome.Assets(), outcome.Error(), SearchQuery(kCollectionType_Root, u""), id), id);
    ASSERT_TRUE(outcome.Wait());
    const HttpRequest request = mService.Find("POST", "/api/search?");
    EXPECT_EQ(request.mMethod, "POST");
    const std::string query = Query(request);
    EXPECT_EQ(query.substr(0, 2), "q=");
    EXPECT_NE(query.find("&metadata=true"), std::string::npos);
    EXPECT_EQ(query.find("scope="), std::string::npos);
    EXPECT_EQ(Decode(query.substr(2, query.find('&') - 2)),
              R"({"trashed":{"$ne":true},"type":"application/vnd.halvane.tarnvault.collection.root"})");
    EXPECT_TRUE(request.mBody.empty());
    ExpectAuthorised(request, id);

    EXPECT_TRUE(outcome.Succeeded());
    EXPECT_EQ(outcome.Id(), id);
    const auto assets = outcome.AssetsSeen();
    ASSERT_EQ(assets.size(), 2u);
    EXPECT_EQ(assets[0]->mId, "i1");
    EXPECT_TRUE(assets[1]->is_collection());
}

TEST_F(ClientTest, SearchInACollectionSendsItsScopeLast)
{
    mService.Script(200, "[]");
    Outcome outcome;
    mClient->SearchAsync(outcome.Assets(), outcome.Error(), SearchQuery(MakeCollection("abc"), u"n 1"),
                         Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    const std::string query = Query(mService.Find("POST", "/api/search?"));
    const size_t scope = query.find("&scope=");
    ASSERT_NE(scope, std::string::npos);
    EXPECT_LT(query.find("&metadata=true"), scope);
    EXPECT_EQ(query.substr(scope), "&scope=%5b%22%2fcollections%2fabc%22%5d");
    EXPECT_NE(Decode(query).find(R"("name":"n 1")"), std::string::npos);
    EXPECT_TRUE(outcome.Succeeded());
    EXPECT_TRUE(outcome.AssetsSeen().empty());
}

TEST_F(ClientTest, SearchFailures)
{
    struct Case {
        int mStatus;
        std::string mBody;
        int mExpectedStatus;
        std::string mExpectedText;
    };
    const std::vector<Case> cases = {
        {201, "[]", 201, "[]"},
        {404, "gone", 404, "gone"},
        {200, R"({"id":"x"})", -100, "_HandleSearch: JSON parsing problem"},
        {200, "not json", -100, "_HandleSearch: JSON parsing problem"},
        {200, R"([{"id":5}])", -100, "_HandleSearch: JSON parsing problem"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.mBody);
        mService.Script(c.mStatus, c.mBody);
        Outcome outcome;
        const Guid id = Guid::CreateUnique();
        mClient->SearchAsync(outcome.Assets(), outcome.Error(), SearchQuery(), id);
        ASSERT_TRUE(outcome.Wait());
        EXPECT_FALSE(outcome.Succeeded());
        EXPECT_EQ(outcome.Id(), id);
        EXPECT_EQ(outcome.Status(), c.mExpectedStatus);
        EXPECT_EQ(outcome.ErrorText(), c.mExpectedText);
    }
}

TEST_F(ClientTest, JSONAnswerPastItsBoundIsStoppedWhileItArrives)
{
    // Twice the bound: what a hostile server could send without end.
    const size_t fill = size_t(128) << 20;
    Outcome search, header;
    mService.ScriptLarge("[", fill);
    mClient->SearchAsync(search.Assets(), search.Error(), SearchQuery(), Guid::CreateUnique());
    ASSERT_TRUE(search.Wait());
    EXPECT_LT(mService.BodyBytesSent(), fill);
    mService.ScriptLarge("{", fill);
    mClient->HeaderAsync(header.Asset(), header.Error(), "i1", false, Guid::CreateUnique());
    ASSERT_TRUE(header.Wait());
    EXPECT_LT(mService.BodyBytesSent(), 2 * fill);

    EXPECT_FALSE(search.Succeeded());
    EXPECT_EQ(search.Status(), -100);
    EXPECT_EQ(search.ErrorText(), "_HandleSearch: JSON answer is larger than 64 MiB");
    EXPECT_FALSE(header.Succeeded());
    EXPECT_EQ(header.ErrorText(), "_HandleHeader: JSON answer is larger than 64 MiB");
}

TEST_F(ClientTest, SearchOneGivesTheAssetNullOrTooMany)
{
    mService.Script(200, "[" + ItemJSON("i1", "a") + "]");
    mService.Script(200, "[]");
    mService.Script(200, "[" + ItemJSON("i1", "a") + "," + ItemJSON("i2", "a") + "]");
    Outcome one, none, many;
    mClient->SearchOneAsync(one.Asset(), one.Error(), SearchQuery(), Guid::CreateUnique());
    ASSERT_TRUE(one.Wait());
    mClient->SearchOneAsync(none.Asset(), none.Error(), SearchQuery(), Guid::CreateUnique());
    ASSERT_TRUE(none.Wait());
    mClient->SearchOneAsync(many.Asset(), many.Error(), SearchQuery(), Guid::CreateUnique());
    ASSERT_TRUE(many.Wait());
    ASSERT_TRUE(one.Succeeded());
    EXPECT_EQ(one.AssetSeen()->mId, "i1");
    EXPECT_TRUE(none.Succeeded());
    EXPECT_FALSE(none.AssetSeen());
    EXPECT_FALSE(many.Succeeded());
    EXPECT_EQ(many.Status(), -100);
    EXPECT_EQ(many.ErrorText(), "SearchOne: too many results");
}

TEST(ClientTransport, NoServerGivesTheErrorCallbackStatusMinus100)
{
    const std::string url = "http://127.0.0.1:" + std::to_string(testsupport::ClosedLoopbackPort()) + "/api";
    boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(url, "tok", "c")));
    Outcome outcome;
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(client->SearchAsync(outcome.Assets(), outcome.Error(), SearchQuery(), id), id);
    ASSERT_TRUE(outcome.Wait());
    EXPECT_FALSE(outcome.Succeeded());
    EXPECT_EQ(outcome.Status(), -100);
    EXPECT_FALSE(outcome.ErrorText().empty());
}

TEST_F(ClientTest, HeaderOfACollectionAndOfAnItem)
{
    mService.Script(200, CollectionJSON("other", "g"));
    mService.Script(200, ItemJSON("other", "f.txt"));
    Outcome collection, item;
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(mClient->HeaderAsync(collection.Asset(), collection.Error(), "c9", true, id), id);
    ASSERT_TRUE(collection.Wait());
    mClient->HeaderAsync(item.Asset(), item.Error(), "i9", false, Guid::CreateUnique());
    ASSERT_TRUE(item.Wait());

    ExpectAuthorised(mService.Find("GET", "/api/collections/c9/header"), id);
    EXPECT_EQ(mService.Find("GET", "/api/assets/i9/metadata").mMethod, "GET");
    ASSERT_TRUE(collection.Succeeded());
    EXPECT_TRUE(collection.AssetSeen()->is_collection());
    EXPECT_EQ(collection.AssetSeen()->mId, "c9");
    ASSERT_TRUE(item.Succeeded());
    EXPECT_FALSE(item.AssetSeen()->is_collection());
    EXPECT_EQ(item.AssetSeen()->mId, "i9");
}

TEST_F(ClientTest, HeaderFailures)
{
    mService.Script(500, "");
    mService.Script(200, "[1]");
    Outcome failed, unreadable;
    mClient->HeaderAsync(failed.Asset(), failed.Error(), "c1", true, Guid::CreateUnique());
    ASSERT_TRUE(failed.Wait());
    mClient->HeaderAsync(unreadable.Asset(), unreadable.Error(), "c1", true, Guid::CreateUnique());
    ASSERT_TRUE(unreadable.Wait());
    EXPECT_EQ(failed.Status(), 500);
    EXPECT_EQ(unreadable.ErrorText(), "_HandleHeader: JSON parsing problem");
}

TEST_F(ClientTest, BadSearchModifierThrowsOnTheCallersThreadAndSendsNothing)
{
    SearchQuery query;
    query.mTrashed.mModifier = static_cast<SearchModifier>(9);
    Outcome outcome;
    EXPECT_THROW(mClient->SearchAsync(outcome.Assets(), outcome.Error(), query, Guid::CreateUnique()),
                 std::runtime_error);
    EXPECT_TRUE(mService.Requests().empty());
    EXPECT_EQ(outcome.Calls(), 0);
}

TEST_F(ClientTest, FailedAnswersTraceAsWarningsAndGoodOnesOnlyAsProgress)
{
    TraceLines trace("Tarnvault:1");
    mService.Script(200, "[]");
    mService.Script(404, "not here");
    Outcome good, bad;
    mClient->SearchAsync(good.Assets(), good.Error(), SearchQuery(), Guid::CreateUnique());
    ASSERT_TRUE(good.Wait());
    mClient->SearchAsync(bad.Assets(), bad.Error(), SearchQuery(), Guid::CreateUnique());
    ASSERT_TRUE(bad.Wait());
    EXPECT_FALSE(trace.Contains("Search, status_code: 200"));
    EXPECT_TRUE(trace.Contains("Search, status_code: 404, body: not here"));
}
