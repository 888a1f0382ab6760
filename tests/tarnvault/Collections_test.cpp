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

TEST_F(ClientTest, CreateWithoutParentPostsTheHeaderThenReadsIt)
{
    mService.Script(201, "", Location("/api/collections/new1"));
    mService.Script(200, CollectionJSON("ignored", "Gr\u00fcppe"));
    Outcome outcome;
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(
        mClient->CreateCollectionAsync(outcome.Success(), outcome.Error(), u"Grüppe", kCollectionType_Collection, id),
        id);
    ASSERT_TRUE(outcome.Wait());
    ASSERT_EQ(mService.Requests().size(), 2u);
    const HttpRequest create = mService.Find("POST", "/api/collections");
    EXPECT_EQ(create.mTarget, "/api/collections");
    EXPECT_EQ(create.Header("Content-Type"), "application/json");
    EXPECT_EQ(create.mBody,
              "{\"header\":{\"name\":\"Gr\xc3\xbcppe\",\"type\":\"application/vnd.halvane.tarnvault.collection\"}}");
    ExpectAuthorised(create, id);
    ExpectAuthorised(mService.Find("GET", "/api/collections/new1/header"), id);
    ASSERT_TRUE(outcome.Succeeded());
    EXPECT_EQ(outcome.Id(), id);
    EXPECT_EQ(outcome.AssetSeen()->mId, "new1");
}

TEST_F(ClientTest, CreateFailures)
{
    // 200 is not the creation status; nothing follows it. No type is an empty one.
    mService.Script(200, "", Location("/api/collections/new1"));
    Outcome ok200;
    mClient->CreateCollectionAsync(ok200.Success(), ok200.Error(), u"g", kCollectionType_None, Guid::CreateUnique());
    ASSERT_TRUE(ok200.Wait());
    EXPECT_FALSE(ok200.Succeeded());
    EXPECT_EQ(ok200.Status(), 200);
    EXPECT_EQ(mService.Find("POST", "/api/collections").mBody, R"({"header":{"name":"g","type":""}})");
    EXPECT_EQ(mService.Requests().size(), 1u);

    // No identifier in the Location: the header request goes out without one
    // and the service's refusal comes back.
    mService.Script(201, "", Location("/"));
    mService.Script(404, "no such collection");
    Outcome noId;
    mClient->CreateCollectionAsync(noId.Success(), noId.Error(), u"g", kCollectionType_Collection,
                                   Guid::CreateUnique());
    ASSERT_TRUE(noId.Wait());
    EXPECT_EQ(mService.Find("GET", "/api/collections//header").mMethod, "GET");
    EXPECT_EQ(noId.Status(), 404);
    EXPECT_EQ(noId.ErrorText(), "no such collection");

    // The header describes an item: a plain error, not a null collection.
    mService.Script(201, "", Location("/api/collections/new2"));
    mService.Script(200, ItemJSON("new2", "g"));
    Outcome item;
    mClient->CreateCollectionAsync(item.Success(), item.Error(), u"g", kCollectionType_Collection,
                                   Guid::CreateUnique());
    ASSERT_TRUE(item.Wait());
    EXPECT_FALSE(item.Succeeded());
    EXPECT_EQ(item.Status(), -100);
    EXPECT_EQ(item.ErrorText(), "CreateCollection: the new asset's header is not a collection");
}

TEST_F(ClientTest, CreateInAParentIsCreateHeaderAndAddUnderANewIdentifier)
{
    const auto parent = MakeCollection("P");
    mService.Script(201, "", Location("http://elsewhere/api/collections/new1"));
    mService.Script(200, CollectionJSON("new1", "g"));
    mService.Script(200, "");
    Outcome outcome;
    const Guid given = Guid::CreateUnique();
    const Guid chain = mClient->CreateCollectionAsync(outcome.Success(), outcome.Error(), parent, u"g",
                                                      kCollectionType_Collection, given);
    ASSERT_FALSE(chain.IsNil());
    EXPECT_NE(chain, given);
    ASSERT_TRUE(outcome.Wait());
    ASSERT_EQ(mService.Requests().size(), 3u);
    const HttpRequest add = mService.Find("PUT", "/api/collections/P/members");
    EXPECT_EQ(add.mTarget, "/api/collections/P/members");
    EXPECT_EQ(add.Header("Content-Type"), "application/json");
    EXPECT_EQ(add.mBody, R"(["/collections/new1"])");
    for (const HttpRequest& request : mService.Requests()) ExpectAuthorised(request, chain);
    ASSERT_TRUE(outcome.Succeeded());
    EXPECT_EQ(outcome.Id(), chain);
    EXPECT_EQ(outcome.AssetSeen()->mId, "new1");
    ASSERT_EQ(parent->mChildren.size(), 1u);
    EXPECT_EQ(parent->mChildren[0], outcome.AssetSeen());

    // The chain stops where the add fails, and the parent gains nothing.
    mService.Script(201, "", Location("/api/collections/new2"));
    mService.Script(200, CollectionJSON("new2", "g"));
    mService.Script(403, "not yours");
    Outcome refused;
    const Guid second = mClient->CreateCollectionAsync(refused.Success(), refused.Error(), parent, u"g",
                                                       kCollectionType_Collection, Guid::CreateUnique());
    ASSERT_TRUE(refused.Wait());
    EXPECT_FALSE(refused.Succeeded());
    EXPECT_EQ(refused.Id(), second);
    EXPECT_EQ(refused.Status(), 403);
    EXPECT_EQ(parent->mChildren.size(), 1u);
}

TEST_F(ClientTest, AddSendsThePathOfItsKindAndAppendsTheSameObject)
{
    const auto collection = MakeCollection("C");
    const auto item = MakeItem("i1");
    const auto child = MakeCollection("c2");
    mService.Script(200, "");
    mService.Script(200, "");
    mService.Script(409, "conflict");
    Outcome first, second, refused;
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(mClient->AddAsync(first.Success(), first.Error(), collection, item, id), id);
    ASSERT_TRUE(first.Wait());
    mClient->AddAsync(second.Success(), second.Error(), collection, child, Guid::CreateUnique());
    ASSERT_TRUE(second.Wait());
    mClient->AddAsync(refused.Success(), refused.Error(), collection, MakeItem("i3"), Guid::CreateUnique());
    ASSERT_TRUE(refused.Wait());

    std::vector<std::string> bodies;
    for (const HttpRequest& request : mService.Requests()) {
        EXPECT_EQ(request.mMethod + " " + request.mTarget, "PUT /api/collections/C/members");
        bodies.push_back(request.mBody);
    }
    EXPECT_EQ(bodies, (std::vector<std::string>{R"(["/assets/i1"])", R"(["/collections/c2"])", R"(["/assets/i3"])"}));
    ExpectAuthorised(mService.Find("PUT", "/api/collections/C/members"), id);
    EXPECT_TRUE(first.Succeeded());
    EXPECT_EQ(first.Id(), id);
    EXPECT_FALSE(refused.Succeeded());
    EXPECT_EQ(refused.Status(), 409);
    ASSERT_EQ(collection->mChildren.size(), 2u);
    EXPECT_EQ(collection->mChildren[0], item);
    EXPECT_EQ(collection->mChildren[1], child);
}

TEST_F(ClientTest, DeleteSendsRecursiveAndLeavesMembersAlone)
{
    const auto collection = MakeCollection("C");
    const auto item = MakeItem("i1");
    collection->mChildren.push_back(item);
    mService.Script(200, "");
    mService.Script(200, "");
    mService.Script(404, "gone");
    Outcome plain, recursive, missing;
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(mClient->DeleteAsync(plain.Success(), plain.Error(), item, false, id), id);
    ASSERT_TRUE(plain.Wait());
    mClient->DeleteAsync(recursive.Success(), recursive.Error(), collection, true, Guid::CreateUnique());
    ASSERT_TRUE(recursive.Wait());
    mClient->DeleteAsync(missing.Success(), missing.Error(), item, false, Guid::CreateUnique());
    ASSERT_TRUE(missing.Wait());

    ExpectAuthorised(mService.Find("DELETE", "/api/assets/i1?recursive=false"), id);
    EXPECT_EQ(mService.Find("DELETE", "/api/collections/C?recursive=true").mMethod, "DELETE");
    EXPECT_TRUE(plain.Succeeded());
    EXPECT_TRUE(recursive.Succeeded());
    EXPECT_FALSE(missing.Succeeded());
    EXPECT_EQ(missing.Status(), 404);
    EXPECT_EQ(collection->mChildren.size(), 1u);
}

// By name: one found is deleted; none calls neither callback; two delete nothing.
TEST_F(ClientTest, DeleteByNameSearchesThenDeletesOnlyASingleFind)
{
    mService.Script(200, "[" + ItemJSON("i7", "a.txt") + "]");
    mService.Script(200, "");
    mService.Script(200, "[]");
    mService.Script(200, "[" + ItemJSON("i1", "a") + "," + ItemJSON("i2", "a") + "]");
    Outcome one, none, two;
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(mClient->DeleteAsync(one.Success(), one.Error(), MakeCollection("C"), u"a.txt", true, id), id);
    ASSERT_TRUE(one.Wait());
    EXPECT_EQ(mService.Find("POST", "/api/search?", R"("name":"a.txt")").mMethod, "POST");
    ExpectAuthorised(mService.Find("DELETE", "/api/assets/i7?recursive=true"), id);
    EXPECT_TRUE(one.Succeeded());
    EXPECT_EQ(one.Id(), id);

    mClient->DeleteAsync(none.Success(), none.Error(), MakeCollection("C"), u"absent", false, Guid::CreateUnique());
    none.LetGo();
    ASSERT_TRUE(none.WaitReleased());
    EXPECT_EQ(none.Calls(), 0);

    mClient->DeleteAsync(two.Success(), two.Error(), MakeCollection("C"), u"a", false, Guid::CreateUnique());
    ASSERT_TRUE(two.Wait());
    EXPECT_EQ(two.ErrorText(), "SearchOne: too many results");
    EXPECT_EQ(mService.Requests().size(), 4u);  // three searches, one delete
}

TEST_F(ClientTest, FetchChildrenReplacesTheMembersOrLeavesThemEmpty)
{
    const auto collection = MakeCollection("C");
    collection->mChildren.push_back(MakeItem("old"));
    mService.Script(200, "[" + ItemJSON("i1", "a") + "," + CollectionJSON("c1", "g") + "]");
    Outcome fetched;
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(mClient->FetchChildrenAsync(fetched.Success(), fetched.Error(), collection, id), id);
    ASSERT_TRUE(fetched.Wait());
    EXPECT_TRUE(fetched.Succeeded());
    ASSERT_EQ(collection->mChildren.size(), 2u);
    EXPECT_EQ(collection->mChildren[0]->mId, "i1");
    EXPECT_NE(mService.Find("POST", "/api/search?").mTarget.find("&scope=%5b%22%2fcollections%2fC%22%5d"),
              std::string::npos);

    mService.Script(500, "down");
    Outcome failed;
    mClient->FetchChildrenAsync(failed.Success(), failed.Error(), collection, Guid::CreateUnique());
    ASSERT_TRUE(failed.Wait());
    EXPECT_EQ(failed.Status(), 500);
    EXPECT_TRUE(collection->mChildren.empty());
}
