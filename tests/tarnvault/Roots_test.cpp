// The client root (cached), the user root, and the preferences root of this
// host version.

#include <future>

#include "ClientTestSupport.h"
#include "server/TreeSeeder.h"
#include "support/TestService.h"

using namespace tvtest;

namespace {

const std::string kRoot = CollectionJSON("root1", "client-1", kRootMedia);

}  // namespace

TEST_F(ClientTest, RootIsAskedForByNameOnceAndThenCached)
{
    mService.Push(Answer(200, "[" + CollectionJSON("plain", "client-1") + "," + kRoot + "]"));
    Outcome first;
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(mClient->GetRootAsync(first.Success(), first.Error(), id), id);
    ASSERT_TRUE(first.Wait());
    const HttpRequest request = mService.Find("GET", "/api/collections?name=client-1");
    EXPECT_EQ(request.mTarget, "/api/collections?name=client-1");
    ExpectAuthorised(request, id);
    ASSERT_TRUE(first.Succeeded());
    EXPECT_EQ(first.AssetSeen()->mId, "root1");
    EXPECT_EQ(mClient->CachedRoot(), first.AssetSeen());

    Outcome second;
    const Guid again = Guid::CreateUnique();
    EXPECT_EQ(mClient->GetRootAsync(second.Success(), second.Error(), again), again);
    EXPECT_EQ(second.Calls(), 1u);  // before the call returned
    EXPECT_EQ(second.Id(), again);
    EXPECT_EQ(second.AssetSeen(), first.AssetSeen());
    EXPECT_EQ(mService.Requests().size(), 1u);

    // Signing out keeps the cached root.
    mClient->Logout([](SyncServer_ConnectionState) {});
    Outcome third;
    mClient->GetRootAsync(third.Success(), third.Error(), Guid::CreateUnique());
    EXPECT_EQ(third.Calls(), 1u);
    EXPECT_EQ(mService.Requests().size(), 1u);
}

// (What an unusable answer gives: with the other reads' failures.)
TEST(UserRoot, WithoutClientIdentifierEveryCallSearchesByTypeAndCachesNothing)
{
    ScriptedService service;
    boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(service.ApiUrl(), "tok", "")));
    for (int call = 0; call < 2; ++call) {
        service.Push(Answer(200, "[" + kRoot + "]"));
        EXPECT_TRUE(
            Await([&](Outcome& o) { client->GetRootAsync(o.Success(), o.Error(), Guid::CreateUnique()); }).Succeeded());
    }
    const auto requests = service.Requests();
    ASSERT_EQ(requests.size(), 2u);
    for (const HttpRequest& request : requests)
        EXPECT_NE(Decode(request.mTarget).find(std::string(R"("type":")") + kRootMedia), std::string::npos);
    EXPECT_FALSE(client->CachedRoot());
}

TEST(PreferencesRoot, IsMadeOnFirstUseUnderTheClientRootAndFoundAfterwards)
{
    HostIdentity host(u"A", u"B C", u"9.0");
    testsupport::TestService service;
    server::TreeSeeder seed(*service, "alice");
    boost::shared_ptr<Tarnvault> client(
        new Tarnvault(Parameters(service->AssetServiceUrl(), testsupport::kAliceToken, "client-1")));
    const Guid given = Guid::CreateUnique();
    Guid chain;
    const Outcome made =
        Await([&](Outcome& o) { chain = client->GetPreferencesRootAsync(o.Success(), o.Error(), given); });
    EXPECT_NE(chain, given);
    ASSERT_TRUE(made.Succeeded()) << made.ErrorText();
    EXPECT_EQ(made.Id(), chain);
    const std::string clientRoot = seed.ClientRoot("client-1");
    EXPECT_EQ(seed.Describe(clientRoot), "A_B C_9.0/\n");
    const auto root = boost::dynamic_pointer_cast<Collection>(made.AssetSeen());
    ASSERT_TRUE(root);
    EXPECT_EQ(root->mId.ToStdString(), seed.Find(clientRoot, "A_B C_9.0"));
    EXPECT_EQ(root->mType, kCollectionType_Preferences);

    const Outcome found =
        Await([&](Outcome& o) { client->GetPreferencesRootAsync(o.Success(), o.Error(), Guid::CreateUnique()); });
    ASSERT_TRUE(found.Succeeded());
    EXPECT_EQ(found.AssetSeen()->mId, root->mId);
    EXPECT_EQ(seed.Describe(clientRoot), "A_B C_9.0/\n");
}

TEST_F(ClientTest, PreferencesRootOfTheWrongKindOrTwiceIsRefused)
{
    mService.Push(Answer(200, "[" + kRoot + "]"));
    mService.Push(Answer(200, "[" + ItemJSON("i", "A_B C_9.0") + "]"));
    mService.Push(Answer(200, "[" + CollectionJSON("p1", "n") + "," + CollectionJSON("p2", "n") + "]"));
    Outcome item, two;
    mClient->GetPreferencesRootAsync(item.Success(), item.Error(), Guid::CreateUnique());
    ASSERT_TRUE(item.Wait());
    mClient->GetPreferencesRootAsync(two.Success(), two.Error(), Guid::CreateUnique());
    ASSERT_TRUE(two.Wait());
    EXPECT_EQ(item.ErrorText(), "Too many PreferencesRoot, or bad type, try resetting!");
    EXPECT_EQ(two.ErrorText(), "Too many PreferencesRoot, or bad type, try resetting!");
    EXPECT_EQ(mService.Requests().size(), 3u);
}

TEST(Ownership, AClientWithARequestInFlightLivesUntilItsCallback)
{
    std::promise<void> release;
    std::shared_future<void> released(release.get_future());
    testsupport::LoopbackHttpServer server([released](const HttpRequest&) {
        released.wait();
        HttpAnswer answer;
        answer.mBody = "[" + kRoot + "]";
        return answer;
    });
    boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(server.Url("/api"), "tok", "client-1")));
    const boost::weak_ptr<Tarnvault> watch(client);
    Outcome outcome;
    ASSERT_FALSE(client->GetRootAsync(outcome.Success(), outcome.Error(), Guid::CreateUnique()).IsNil());
    ASSERT_TRUE(server.WaitForRequests(1, std::chrono::seconds(30)));
    client.reset();
    EXPECT_FALSE(watch.expired());
    release.set_value();
    ASSERT_TRUE(outcome.Wait());
    EXPECT_TRUE(outcome.Succeeded());
    outcome.LetGo();
    EXPECT_TRUE(outcome.WaitReleased());
    EXPECT_TRUE(WaitExpired(watch));
}
