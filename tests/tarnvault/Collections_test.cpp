// Creating collections, adding to them, deleting and fetching members: the
// requests on the wire, the chains they form, and where each chain stops.

#include "ClientTestSupport.h"

using namespace tvtest;

namespace {

HttpHeaders Location(const std::string& value)
{
    return HttpHeaders{{"Location", value}};
}

}  // namespace

// Each failure reaches the error callback, and nothing follows it.
TEST_F(ClientTest, CreateFailures)
{
    const struct {
        const char* mWhat;
        std::vector<HttpAnswer> mReplies;
        CollectionType mType;
        int mStatus;
        const char* mText;
    } cases[] = {
        {"200 is not the creation status",
         {Answer(200, "", Location("/api/collections/new1"))},
         kCollectionType_None,
         200,
         ""},
        // The header request goes out without an identifier, and its refusal comes back.
        {"no identifier in the Location",
         {Answer(201, "", Location("/")), Answer(404, "no such collection")},
         kCollectionType_Collection,
         404,
         "no such collection"},
        {"a header that describes an item",
         {Answer(201, "", Location("/api/collections/new2")), Answer(200, ItemJSON("new2", "g"))},
         kCollectionType_Collection,
         -100,
         "CreateCollection: the new asset's header is not a collection"},
    };
    for (const auto& failure : cases) {
        SCOPED_TRACE(failure.mWhat);
        const size_t before = mService.Requests().size();
        for (const HttpAnswer& reply : failure.mReplies) mService.Push(reply);
        // Without a parent the chain keeps the caller's identifier.
        const Guid id = Guid::CreateUnique();
        const Outcome outcome = Await([&](Outcome& o) {
            EXPECT_EQ(mClient->CreateCollectionAsync(o.Success(), o.Error(), u"g", failure.mType, id), id);
        });
        EXPECT_EQ(outcome.Id(), id);
        EXPECT_FALSE(outcome.Succeeded());
        EXPECT_EQ(outcome.Status(), failure.mStatus);
        EXPECT_EQ(outcome.ErrorText(), failure.mText);
        EXPECT_EQ(mService.Requests().size() - before, failure.mReplies.size());
    }
    EXPECT_EQ(mService.Find("POST", "/api/collections").mBody, R"({"header":{"name":"g","type":""}})");
    EXPECT_EQ(mService.Find("GET", "/api/collections//header").mMethod, "GET");
}

// In a parent: create, read the header, add, all under a new identifier.
TEST_F(ClientTest, CreateInAParentIsCreateHeaderAndAddUnderANewIdentifier)
{
    const auto parent = Make("P");
    mService.Push(Answer(201, "", Location("http://elsewhere/api/collections/new1")));
    mService.Push(Answer(200, CollectionJSON("ignored", "Gr\u00fcppe")));
    mService.Push(Answer(200, ""));
    const Guid given = Guid::CreateUnique();
    Guid chain;
    const Outcome outcome = Await([&](Outcome& o) {
        chain = mClient->CreateCollectionAsync(o.Success(), o.Error(), parent, u"Grüppe", kCollectionType_Collection,
                                               given);
    });
    ASSERT_FALSE(chain.IsNil());
    EXPECT_NE(chain, given);
    std::vector<std::string> sent;
    for (const HttpRequest& request : mService.Requests()) {
        sent.push_back(request.mMethod + " " + request.mTarget);
        ExpectAuthorised(request, chain);
    }
    EXPECT_EQ(sent, (std::vector<std::string>{"POST /api/collections", "GET /api/collections/new1/header",
                                              "PUT /api/collections/P/members"}));
    const HttpRequest create = mService.Find("POST", "/api/collections");
    EXPECT_EQ(create.Header("Content-Type"), "application/json");
    EXPECT_EQ(create.mBody,
              "{\"header\":{\"name\":\"Gr\xc3\xbcppe\",\"type\":\"application/vnd.halvane.tarnvault.collection\"}}");
    const HttpRequest add = mService.Find("PUT", "/api/collections/P/members");
    EXPECT_EQ(add.Header("Content-Type"), "application/json");
    EXPECT_EQ(add.mBody, R"(["/collections/new1"])");
    ASSERT_TRUE(outcome.Succeeded());
    EXPECT_EQ(outcome.Id(), chain);
    EXPECT_EQ(outcome.AssetSeen()->mId, "new1");
    ASSERT_EQ(parent->mChildren.size(), 1u);
    EXPECT_EQ(parent->mChildren[0], outcome.AssetSeen());

    // The chain stops where the add fails, and the parent gains nothing.
    mService.Push(Answer(201, "", Location("/api/collections/new2")));
    mService.Push(Answer(200, CollectionJSON("new2", "g")));
    mService.Push(Answer(403, "not yours"));
    const Outcome refused = Await([&](Outcome& o) {
        chain = mClient->CreateCollectionAsync(o.Success(), o.Error(), parent, u"g", kCollectionType_Collection,
                                               Guid::CreateUnique());
    });
    EXPECT_FALSE(refused.Succeeded());
    EXPECT_EQ(refused.Id(), chain);
    EXPECT_EQ(refused.Status(), 403);
    EXPECT_EQ(parent->mChildren.size(), 1u);
}

// Add sends the path of its kind and appends the same object; delete sends
// "recursive" and leaves the members alone.
TEST_F(ClientTest, AddAndDelete)
{
    const auto collection = Make("C");
    const auto item = Make<Item>("i1");
    const auto child = Make("c2");
    for (int status : {200, 200, 409, 200, 200, 404}) mService.Push(Answer(status, status == 200 ? "" : "refused"));
    const Guid id = Guid::CreateUnique();
    const Outcome first = Await([&](Outcome& o) { mClient->AddAsync(o.Success(), o.Error(), collection, item, id); });
    Await([&](Outcome& o) { mClient->AddAsync(o.Success(), o.Error(), collection, child, Guid::CreateUnique()); });
    const Outcome refused = Await([&](Outcome& o) {
        mClient->AddAsync(o.Success(), o.Error(), collection, Make<Item>("i3"), Guid::CreateUnique());
    });
    const Outcome plain = Await([&](Outcome& o) { mClient->DeleteAsync(o.Success(), o.Error(), item, false, id); });
    const Outcome recursive = Await(
        [&](Outcome& o) { mClient->DeleteAsync(o.Success(), o.Error(), collection, true, Guid::CreateUnique()); });
    const Outcome missing =
        Await([&](Outcome& o) { mClient->DeleteAsync(o.Success(), o.Error(), item, false, Guid::CreateUnique()); });

    std::vector<std::string> sent;
    for (const HttpRequest& request : mService.Requests()) sent.push_back(request.mMethod + " " + request.mTarget);
    EXPECT_EQ(sent, (std::vector<std::string>{"PUT /api/collections/C/members", "PUT /api/collections/C/members",
                                              "PUT /api/collections/C/members", "DELETE /api/assets/i1?recursive=false",
                                              "DELETE /api/collections/C?recursive=true",
                                              "DELETE /api/assets/i1?recursive=false"}));
    std::vector<std::string> bodies;
    for (const HttpRequest& request : mService.Requests())
        if (request.mMethod == "PUT") bodies.push_back(request.mBody);
    EXPECT_EQ(bodies, (std::vector<std::string>{R"(["/assets/i1"])", R"(["/collections/c2"])", R"(["/assets/i3"])"}));
    ExpectAuthorised(mService.Find("PUT", "/api/collections/C/members"), id);
    ExpectAuthorised(mService.Find("DELETE", "/api/assets/i1"), id);
    EXPECT_TRUE(first.Succeeded() && plain.Succeeded() && recursive.Succeeded());
    EXPECT_EQ(first.Id(), id);
    EXPECT_EQ(refused.Status(), 409);
    EXPECT_EQ(missing.Status(), 404);
    ASSERT_EQ(collection->mChildren.size(), 2u);
    EXPECT_EQ(collection->mChildren[0], item);
    EXPECT_EQ(collection->mChildren[1], child);
}

// By name: one found is deleted; none calls neither callback; two delete nothing.
TEST_F(ClientTest, DeleteByNameSearchesThenDeletesOnlyASingleFind)
{
    mService.Push(Answer(200, "[" + ItemJSON("i7", "a.txt") + "]"));
    mService.Push(Answer(200, ""));
    mService.Push(Answer(200, "[]"));
    mService.Push(Answer(200, "[" + ItemJSON("i1", "a") + "," + ItemJSON("i2", "a") + "]"));
    const Guid id = Guid::CreateUnique();
    const Outcome one = Await([&](Outcome& o) {
        EXPECT_EQ(mClient->DeleteAsync(o.Success(), o.Error(), Make("C"), u"a.txt", true, id), id);
    });
    EXPECT_EQ(mService.Find("POST", "/api/search?", R"("name":"a.txt")").mMethod, "POST");
    ExpectAuthorised(mService.Find("DELETE", "/api/assets/i7?recursive=true"), id);
    EXPECT_TRUE(one.Succeeded());
    EXPECT_EQ(one.Id(), id);

    Outcome none;
    mClient->DeleteAsync(none.Success(), none.Error(), Make("C"), u"absent", false, Guid::CreateUnique());
    none.LetGo();
    ASSERT_TRUE(none.WaitReleased());
    EXPECT_EQ(none.Calls(), 0u);

    const Outcome two = Await([&](Outcome& o) {
        mClient->DeleteAsync(o.Success(), o.Error(), Make("C"), u"a", false, Guid::CreateUnique());
    });
    EXPECT_EQ(two.ErrorText(), "SearchOne: too many results");
    EXPECT_EQ(mService.Requests().size(), 4u);  // three searches, one delete
}

TEST_F(ClientTest, FetchChildrenReplacesTheMembersOrLeavesThemEmpty)
{
    const auto collection = Make("C");
    collection->mChildren.push_back(Make<Item>("old"));
    mService.Push(Answer(200, "[" + ItemJSON("i1", "a") + "," + CollectionJSON("c1", "g") + "]"));
    mService.Push(Answer(500, "down"));
    const Guid id = Guid::CreateUnique();
    const Outcome fetched =
        Await([&](Outcome& o) { EXPECT_EQ(mClient->FetchChildrenAsync(o.Success(), o.Error(), collection, id), id); });
    EXPECT_TRUE(fetched.Succeeded());
    ASSERT_EQ(collection->mChildren.size(), 2u);
    EXPECT_EQ(collection->mChildren[0]->mId, "i1");
    EXPECT_NE(mService.Find("POST", "/api/search?").mTarget.find("&scope=%5b%22%2fcollections%2fC%22%5d"),
              std::string::npos);

    const Outcome failed = Await(
        [&](Outcome& o) { mClient->FetchChildrenAsync(o.Success(), o.Error(), collection, Guid::CreateUnique()); });
    EXPECT_EQ(failed.Status(), 500);
    EXPECT_TRUE(collection->mChildren.empty());
}
