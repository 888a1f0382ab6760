// Requests the HTTP layer does not take: a first one gives a nil identifier
// and no callback; a follow-up one ends the chain through the error callback.

#include <atomic>

#include "ClientTestSupport.h"

using namespace tvtest;

namespace {

// Takes the first `accept` requests to the real processor and refuses the rest.
class RationingProcessor : public tolmonet::http::ForwardingProcessor {
public:
    RationingProcessor(const boost::shared_ptr<RequestProcessor>& target, int accept)
        : ForwardingProcessor(target), mLeft(accept)
    {
    }
    bool GET(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override
    {
        return Take() && ForwardingProcessor::GET(id, handler, url, headers, configuration);
    }
    bool PUT(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const Body& body, const tolmonet::HeaderList& headers,
             const tolmonet::Configuration& configuration) override
    {
        return Take() && ForwardingProcessor::PUT(id, handler, url, body, headers, configuration);
    }
    bool POST(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
              const Body& body, const tolmonet::HeaderList& headers,
              const tolmonet::Configuration& configuration) override
    {
        return Take() && ForwardingProcessor::POST(id, handler, url, body, headers, configuration);
    }
    bool DEL(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override
    {
        return Take() && ForwardingProcessor::DEL(id, handler, url, headers, configuration);
    }

private:
    bool Take() { return mLeft.fetch_sub(1) > 0; }
    std::atomic<int> mLeft;
};

// Clients made while it lives send through a rationing processor.
class RefusalTest : public ::testing::Test {
protected:
    RefusalTest() : mReal(tolmonet::http::GetGlobalRequestProcessor()) {}
    ~RefusalTest() override { tolmonet::http::SetGlobalRequestProcessor(mReal); }

    boost::shared_ptr<Tarnvault> ClientAccepting(int accept)
    {
        tolmonet::http::SetGlobalRequestProcessor(
            boost::shared_ptr<tolmonet::http::RequestProcessor>(new RationingProcessor(mReal, accept)));
        boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(mService.ApiUrl(), "tok", "client-1")));
        tolmonet::http::SetGlobalRequestProcessor(mReal);
        return client;
    }

    boost::shared_ptr<tolmonet::http::RequestProcessor> mReal;
    ScriptedService mService;
};

}  // namespace

TEST_F(RefusalTest, RefusedFirstRequestsGiveANilIdentifierAndNoCallback)
{
    const auto client = ClientAccepting(0);
    Outcome outcome;
    const Guid id = Guid::CreateUnique();
    EXPECT_TRUE(client->SearchAsync(outcome.Assets(), outcome.Error(), SearchQuery(), id).IsNil());
    EXPECT_TRUE(client->HeaderAsync(outcome.Asset(), outcome.Error(), "x", true, id).IsNil());
    EXPECT_TRUE(client->GetRootAsync(outcome.CollectionDone(), outcome.Error(), id).IsNil());
    EXPECT_TRUE(client->CreateCollectionAsync(outcome.CollectionDone(), outcome.Error(), u"g",
                                              kCollectionType_Collection, id)
                    .IsNil());
    EXPECT_TRUE(client->AddAsync(outcome.Success(), outcome.Error(), MakeCollection("C"), MakeItem("i"), id).IsNil());
    EXPECT_TRUE(client->DeleteAsync(outcome.Success(), outcome.Error(), MakeItem("i"), false, id).IsNil());
    EXPECT_TRUE(client->DownloadAsync(outcome.Downloaded(), outcome.Error(), MakeItem("i"), File(u"/tmp/x"), "", id)
                    .IsNil());
    outcome.LetGo();
    EXPECT_TRUE(outcome.WaitReleased());
    EXPECT_EQ(outcome.Calls(), 0);
    EXPECT_TRUE(mService.Requests().empty());
}

TEST_F(RefusalTest, RefusedHeaderAfterACreateIsReported)
{
    const auto client = ClientAccepting(1);
    mService.Script(201, "", {{"Location", "/api/collections/n1"}});
    Outcome outcome;
    client->CreateCollectionAsync(outcome.CollectionDone(), outcome.Error(), u"g", kCollectionType_Collection,
                                  Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    EXPECT_EQ(outcome.ErrorText(), "CreateCollection Header failed");
}

TEST_F(RefusalTest, RefusedAddAfterACreateInAParentGivesANullResponse)
{
    const auto client = ClientAccepting(2);
    mService.Script(201, "", {{"Location", "/api/collections/n1"}});
    mService.Script(200, CollectionJSON("n1", "g"));
    Outcome outcome;
    client->CreateCollectionAsync(outcome.CollectionDone(), outcome.Error(), MakeCollection("P"), u"g",
                                  kCollectionType_Collection, Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    EXPECT_FALSE(outcome.Succeeded());
    EXPECT_FALSE(outcome.Response());
}

TEST_F(RefusalTest, RefusedDeleteAfterASearchByNameGivesANullResponse)
{
    const auto client = ClientAccepting(1);
    mService.Script(200, "[" + ItemJSON("i1", "a") + "]");
    Outcome outcome;
    client->DeleteAsync(outcome.Success(), outcome.Error(), MakeCollection("C"), u"a", false, Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    EXPECT_FALSE(outcome.Succeeded());
    EXPECT_FALSE(outcome.Response());
}

TEST_F(RefusalTest, RefusedStepsOfAnUpload)
{
    testsupport::TempDir dir;
    testsupport::WriteFileBytes(dir / "a.txt", "abc");
    const File file(tolmocore::utility::ToUTF16((dir / "a.txt").string()));
    const ImmutableString type = ImmutableString::CreateStatic("text/plain");

    // The post after the search.
    const auto postRefused = ClientAccepting(1);
    mService.Script(200, "[]");
    Outcome post;
    postRefused->UploadAsync(post.ItemDone(), post.Error(), MakeCollection("C"), file, type, u"", Guid::CreateUnique());
    ASSERT_TRUE(post.Wait());
    EXPECT_FALSE(post.Succeeded());
    EXPECT_FALSE(post.Response());

    // The metadata request after the post.
    const auto headerRefused = ClientAccepting(2);
    mService.Script(200, "[]");
    mService.Script(201, "", {{"Location", "/api/assets/n"}});
    Outcome header;
    headerRefused->UploadAsync(header.ItemDone(), header.Error(), MakeCollection("C"), file, type, u"",
                               Guid::CreateUnique());
    ASSERT_TRUE(header.Wait());
    EXPECT_EQ(header.ErrorText(), "Upload Header failed");
}

TEST_F(RefusalTest, RefusedSearchForThePreferencesRootIsReported)
{
    const auto client = ClientAccepting(1);
    mService.Script(200, "[" + CollectionJSON("root1", "client-1", kRootMedia) + "]");
    Outcome outcome;
    client->GetPreferencesRootAsync(outcome.CollectionDone(), outcome.Error(), Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    EXPECT_EQ(outcome.ErrorText(), "SearchAsync failed");
}
