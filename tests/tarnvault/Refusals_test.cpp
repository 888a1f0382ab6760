// Requests the HTTP layer does not take: a first one gives a nil identifier
// and no callback; a follow-up one ends the chain through the error callback.

#include <atomic>
#include <functional>

#include "ClientTestSupport.h"
#include "support/RefusingProcessor.h"

using namespace tvtest;

namespace {

// Clients made while it lives send through a rationing processor.
class RefusalTest : public ::testing::Test {
protected:
    RefusalTest() : mReal(tolmonet::http::GetGlobalRequestProcessor()) {}
    ~RefusalTest() override { tolmonet::http::SetGlobalRequestProcessor(mReal); }

    boost::shared_ptr<Tarnvault> ClientAccepting(int accept)
    {
        // Takes the first `accept` requests and refuses the rest.
        const auto left = std::make_shared<std::atomic<int> >(accept);
        tolmonet::http::SetGlobalRequestProcessor(boost::make_shared<RefusingProcessor>(
            mReal, [left](const std::string&, const std::string&) { return left->fetch_sub(1) <= 0; }));
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
    EXPECT_TRUE(client->SearchAsync(outcome.Success(), outcome.Error(), SearchQuery(), id).IsNil());
    EXPECT_TRUE(client->HeaderAsync(outcome.Success(), outcome.Error(), "x", true, id).IsNil());
    EXPECT_TRUE(client->GetRootAsync(outcome.Success(), outcome.Error(), id).IsNil());
    EXPECT_TRUE(client->CreateCollectionAsync(outcome.Success(), outcome.Error(), u"g", kCollectionType_Collection, id)
                    .IsNil());
    EXPECT_TRUE(client->AddAsync(outcome.Success(), outcome.Error(), Make("C"), Make<Item>("i"), id).IsNil());
    EXPECT_TRUE(client->DeleteAsync(outcome.Success(), outcome.Error(), Make<Item>("i"), false, id).IsNil());
    EXPECT_TRUE(
        client->DownloadAsync(outcome.Success(), outcome.Error(), Make<Item>("i"), File(u"/tmp/x"), "", id).IsNil());
    outcome.LetGo();
    EXPECT_TRUE(outcome.WaitReleased());
    EXPECT_EQ(outcome.Calls(), 0u);
    EXPECT_TRUE(mService.Requests().empty());
}

// A refused follow-up ends the chain once, through the error callback: with
// the step's own text, or with no response at all.
TEST_F(RefusalTest, RefusedFollowUpRequestsEndTheChainThroughTheErrorCallback)
{
    testsupport::TempDir dir;
    testsupport::WriteFileBytes(dir / "a.txt", "abc");
    const File file(tolmocore::utility::ToUTF16((dir / "a.txt").string()));
    const ImmutableString type = ImmutableString::CreateStatic("text/plain");
    using Start = std::function<void(Tarnvault&, Outcome&)>;
    const HttpHeaders created{{"Location", "/api/collections/n1"}};
    const struct {
        const char* mStep;
        int mAccept;
        std::vector<HttpAnswer> mReplies;
        Start mStart;
        const char* mError;  // null: no response reaches the callback
    } cases[] = {
        {"header after a create",
         1,
         {Answer(201, "", created)},
         [](Tarnvault& c, Outcome& o) {
             c.CreateCollectionAsync(o.Success(), o.Error(), u"g", kCollectionType_Collection, Guid::CreateUnique());
         },
         "CreateCollection Header failed"},
        {"add after a create in a parent",
         2,
         {Answer(201, "", created), Answer(200, CollectionJSON("n1", "g"))},
         [](Tarnvault& c, Outcome& o) {
             c.CreateCollectionAsync(o.Success(), o.Error(), Make("P"), u"g", kCollectionType_Collection,
                                     Guid::CreateUnique());
         },
         nullptr},
        {"delete after a search by name",
         1,
         {Answer(200, "[" + ItemJSON("i1", "a") + "]")},
         [](Tarnvault& c, Outcome& o) {
             c.DeleteAsync(o.Success(), o.Error(), Make("C"), u"a", false, Guid::CreateUnique());
         },
         nullptr},
        {"upload's post after its search",
         1,
         {Answer(200, "[]")},
         [&](Tarnvault& c, Outcome& o) {
             c.UploadAsync(o.Success(), o.Error(), Make("C"), file, type, u"", Guid::CreateUnique());
         },
         nullptr},
        {"upload's metadata after its post",
         2,
         {Answer(200, "[]"), Answer(201, "", {{"Location", "/api/assets/n"}})},
         [&](Tarnvault& c, Outcome& o) {
             c.UploadAsync(o.Success(), o.Error(), Make("C"), file, type, u"", Guid::CreateUnique());
         },
         "Upload Header failed"},
        {"preferences root's search",
         1,
         {Answer(200, "[" + CollectionJSON("root1", "client-1", kRootMedia) + "]")},
         [](Tarnvault& c, Outcome& o) { c.GetPreferencesRootAsync(o.Success(), o.Error(), Guid::CreateUnique()); },
         "SearchAsync failed"},
    };
    for (const auto& refused : cases) {
        SCOPED_TRACE(refused.mStep);
        const auto client = ClientAccepting(refused.mAccept);
        for (const HttpAnswer& reply : refused.mReplies) mService.Push(reply);
        Outcome outcome;
        refused.mStart(*client, outcome);
        ASSERT_TRUE(outcome.Wait());
        outcome.LetGo();
        ASSERT_TRUE(outcome.WaitReleased());
        EXPECT_EQ(outcome.Calls(), 1u);
        EXPECT_FALSE(outcome.Succeeded());
        if (refused.mError)
            EXPECT_EQ(outcome.ErrorText(), refused.mError);
        else
            EXPECT_FALSE(outcome.Last().mResponse);
    }
}
