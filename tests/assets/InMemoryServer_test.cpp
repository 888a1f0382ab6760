// The in-memory server as the sync engine meets it: each operation's
// answers, what it does to the caller's collections and to the service's
// tree, and the switches that make it fail.

#include <atomic>
#include <thread>

#include <gtest/gtest.h>
#include <boost/date_time/posix_time/posix_time.hpp>
#include <boost/make_shared.hpp>

#include "assets/ChildrenMutex.h"
#include "foundation/core/HostConfig.h"
#include "support/InMemoryServer.h"
#include "support/ServerOutcome.h"
#include "support/TempDir.h"

using namespace tolmonetsync;
using namespace testsupport;
using boost::posix_time::ptime;
using boost::posix_time::time_from_string;
using tolmocore::filesupport::File;

namespace {

std::vector<std::string> Names(const std::vector<boost::shared_ptr<AssetBase> >& assets)
{
    std::vector<std::string> names;
    for (const auto& asset : assets) names.push_back(tolmocore::utility::ToNarrow(asset->mName));
    return names;
}

std::vector<std::string> Names(const std::vector<UTF16String>& texts)
{
    std::vector<std::string> names;
    for (const auto& text : texts) names.push_back(tolmocore::utility::ToNarrow(text));
    return names;
}

std::vector<boost::shared_ptr<AssetBase> > ChildrenOf(const boost::shared_ptr<Collection>& collection)
{
    boost::unique_lock<boost::recursive_mutex> lock(ChildrenMutex());
    return collection->mChildren;
}

// Keeps the completion thread busy until released (or the wait limit has
// passed), so that no answer can arrive while a test looks.
class CompletionThreadHold {
public:
    CompletionThreadHold() : mState(boost::make_shared<State>())
    {
        boost::shared_ptr<State> state = mState;
        tolmonet::http::GetGlobalRequestProcessor()->CallAsynchronously(
            [state]() {
                std::unique_lock<std::mutex> lock(state->mMutex);
                state->mHeld = true;
                state->mChanged.notify_all();
                state->mChanged.wait_for(lock, kCallbackWaitLimit, [&] { return state->mReleased; });
            },
            0);
        std::unique_lock<std::mutex> lock(mState->mMutex);
        mState->mChanged.wait_for(lock, kCallbackWaitLimit, [&] { return mState->mHeld; });
    }
    ~CompletionThreadHold() { Release(); }
    void Release()
    {
        std::lock_guard<std::mutex> lock(mState->mMutex);
        mState->mReleased = true;
        mState->mChanged.notify_all();
    }

private:
    struct State {
        std::mutex mMutex;
        std::condition_variable mChanged;
        bool mHeld = false;
        bool mReleased = false;
    };
    boost::shared_ptr<State> mState;
};

class InMemoryServerTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        tolmocore::config::SetCompanyName(u"Acme");
        tolmocore::config::SetClientName(u"Host App");
        tolmocore::config::SetClientInternalVersion(u"9.0");
        mServer = InMemoryServer::Create();
    }

    InMemoryTree& Tree() { return mServer->Tree(); }
    UTF8String RootId() { return Tree().UserRootId(); }
    boost::shared_ptr<Collection> UserRoot() { return Tree().CollectionCopy(RootId()); }
    // A collection under the user root, as the client holds it.
    boost::shared_ptr<Collection> Group(const UTF16String& name)
    {
        return Tree().CollectionCopy(Tree().MakeCollection(RootId(), name));
    }
    File LocalFile(const std::string& name, const std::string& bytes)
    {
        WriteFileBytes(mDir / name, bytes);
        return File(tolmocore::utility::ToUTF16((mDir / name).string()));
    }
    File Missing(const std::string& name) { return File(tolmocore::utility::ToUTF16((mDir / name).string())); }

    boost::shared_ptr<InMemoryServer> mServer;
    TempDir mDir;
};

// --- Roots ---

class InMemoryRoots : public InMemoryServerTest {};

TEST_F(InMemoryRoots, WithoutClientIdTheUserRootComesFromASearchEachTime)
{
    for (int round = 1; round <= 2; ++round) {
        auto outcome = ServerOutcome::Make();
        const Guid id = Guid::CreateUnique();
        EXPECT_EQ(mServer->GetRootAsync(outcome->OnCollection(), outcome->OnError(), id), id);
        ASSERT_TRUE(outcome->Wait());
        EXPECT_EQ(outcome->Guids(), std::vector<Guid>(1, id));
        EXPECT_TRUE(outcome->AllOnCompletionThread());
        ASSERT_TRUE(outcome->Collection());
        EXPECT_EQ(outcome->Collection()->mId, RootId());
        EXPECT_TRUE(outcome->Collection()->is_root());
        EXPECT_EQ(mServer->RequestCount(InMemoryRequest_Search), static_cast<unsigned>(round));
    }
    EXPECT_FALSE(mServer->CachedRoot());
}

TEST_F(InMemoryRoots, ClientRootIsMadeOnFirstRequestThenServedFromTheCacheInsideTheCall)
{
    mServer->mClientID = "desk-1";
    auto first = ServerOutcome::Make();
    mServer->GetRootAsync(first->OnCollection(), first->OnError(), Guid::CreateUnique());
    ASSERT_TRUE(first->Wait());
    ASSERT_TRUE(first->Collection());
    EXPECT_EQ(first->Collection()->mId, Tree().ClientRootId("desk-1"));
    EXPECT_EQ(first->Collection()->mName, u"desk-1");

    auto second = ServerOutcome::Make();
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(mServer->GetRootAsync(second->OnCollection(), second->OnError(), id), id);
    EXPECT_EQ(second->Successes(), 1) << "a cached root is delivered before the call returns";
    EXPECT_FALSE(second->AllOnCompletionThread());
    EXPECT_EQ(second->Collection(), first->Collection());
    EXPECT_EQ(mServer->RequestCount(), 1u);
}

TEST_F(InMemoryRoots, SearchByRootTypeFindsTheUserRootAndNeverAClientRoot)
{
    Tree().ClientRootId("desk-1");
    Tree().ClientRootId("desk-2");
    mServer->mClientID = "desk-1";
    auto outcome = ServerOutcome::Make();
    mServer->GetUserFileRootAsync(outcome->OnCollection(), outcome->OnError(), Guid::CreateUnique());
    ASSERT_TRUE(outcome->Wait());
    ASSERT_TRUE(outcome->Collection());
    EXPECT_EQ(outcome->Collection()->mId, RootId());
}

TEST_F(InMemoryRoots, PreferencesRootIsMadeOnceUnderTheClientRootUnderAGuidOfItsOwn)
{
    EXPECT_EQ(mServer->GetPreferencesRootName(), u"Acme_Host App_9.0");
    mServer->mClientID = "desk-1";
    auto made = ServerOutcome::Make();
    const Guid asked = Guid::CreateUnique();
    const Guid given = mServer->GetPreferencesRootAsync(made->OnCollection(), made->OnError(), asked);
    ASSERT_TRUE(made->Wait());
    EXPECT_NE(given, asked);
    EXPECT_EQ(made->Guids(), std::vector<Guid>(1, given));
    ASSERT_TRUE(made->Collection());
    EXPECT_EQ(made->Collection()->mType, kCollectionType_Preferences);
    EXPECT_EQ(Tree().FindChild(Tree().ClientRootId("desk-1"), u"Acme_Host App_9.0"), made->Collection()->mId);
    EXPECT_EQ(mServer->RequestCount(), 5u);  // root, search, create, header, add

    auto found = ServerOutcome::Make();
    mServer->GetPreferencesRootAsync(found->OnCollection(), found->OnError(), Guid::CreateUnique());
    ASSERT_TRUE(found->Wait());
    ASSERT_TRUE(found->Collection());
    EXPECT_EQ(found->Collection()->mId, made->Collection()->mId);
    EXPECT_EQ(mServer->RequestCount(), 6u) << "the second time is one search on the cached root";
}

TEST_F(InMemoryRoots, AnItemWhereThePreferencesRootShouldBeIsAnError)
{
    Tree().PutItem(RootId(), u"Acme_Host App_9.0", "not a collection");
    auto outcome = ServerOutcome::Make();
    mServer->GetPreferencesRootAsync(outcome->OnCollection(), outcome->OnError(), Guid::CreateUnique());
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->Errors(), 1);
    EXPECT_EQ(outcome->ErrorBody(), "Too many PreferencesRoot, or bad type, try resetting!");
}

TEST_F(InMemoryRoots, OnACachedRootTheFirstStepRunsInsideTheCallAndSoDoesItsRefusal)
{
    mServer->mClientID = "desk-1";
    auto root = ServerOutcome::Make();
    mServer->GetRootAsync(root->OnCollection(), root->OnError(), Guid::CreateUnique());
    ASSERT_TRUE(root->Wait());
    mServer->RefuseRequest(InMemoryRequest_Search, 1);
    auto outcome = ServerOutcome::Make();
    const Guid id = mServer->GetPreferencesRootAsync(outcome->OnCollection(), outcome->OnError(), Guid());
    EXPECT_FALSE(id.IsNil());
    EXPECT_EQ(outcome->Errors(), 1) << "reported before the call returned";
    EXPECT_EQ(outcome->ErrorBody(), "SearchAsync failed");
    EXPECT_EQ(outcome->Guids(), std::vector<Guid>(1, id));
}

// --- Collections and membership ---

class InMemoryCollections : public InMemoryServerTest {};

TEST_F(InMemoryCollections, CreateWithParentReportsUnderItsOwnGuidAndAppendsToTheParent)
{
    boost::shared_ptr<Collection> root = UserRoot();
    auto outcome = ServerOutcome::Make();
    const Guid asked = Guid::CreateUnique();
    const Guid given = mServer->CreateCollectionAsync(outcome->OnCollection(), outcome->OnError(), root, u"g?%+ \"é",
                                                      kCollectionType_Collection, asked);
    ASSERT_FALSE(given.IsNil());
    EXPECT_NE(given, asked);
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->Guids(), std::vector<Guid>(1, given));
    ASSERT_TRUE(outcome->Collection());
    EXPECT_EQ(outcome->Collection()->mName, u"g?%+ \"é");
    ASSERT_EQ(ChildrenOf(root).size(), 1u);
    EXPECT_EQ(ChildrenOf(root).back(), outcome->Collection());
    EXPECT_EQ(Tree().ChildIds(RootId()), std::vector<UTF8String>(1, outcome->Collection()->mId));
}

TEST_F(InMemoryCollections, CreateWithoutParentLeavesTheCollectionInNoCollection)
{
    auto outcome = ServerOutcome::Make();
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(mServer->CreateCollectionAsync(outcome->OnCollection(), outcome->OnError(), u"loose",
                                             kCollectionType_Preferences, id),
              id);
    ASSERT_TRUE(outcome->Wait());
    ASSERT_TRUE(outcome->Collection());
    EXPECT_EQ(outcome->Collection()->mType, kCollectionType_Preferences);
    EXPECT_TRUE(Tree().Exists(outcome->Collection()->mId));
    EXPECT_TRUE(Tree().ChildIds(RootId()).empty());
}

TEST_F(InMemoryCollections, AFailedAddAfterTheCreateLeavesTheNewCollectionBehind)
{
    boost::shared_ptr<Collection> root = UserRoot();
    mServer->FailRequest(InMemoryRequest_Add, 1, 500, "members are read-only");
    auto outcome = ServerOutcome::Make();
    mServer->CreateCollectionAsync(outcome->OnCollection(), outcome->OnError(), root, u"g", kCollectionType_Collection,
                                   Guid());
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->ErrorStatus(), 500);
    EXPECT_EQ(outcome->ErrorBody(), "members are read-only");
    EXPECT_TRUE(ChildrenOf(root).empty());
    EXPECT_EQ(Tree().AssetCount(), 2u) << "the user root and the orphan";
}

TEST_F(InMemoryCollections, AddAppendsTheCallersObjectAndAnAssetMayBeInSeveralCollections)
{
    boost::shared_ptr<Collection> a = Group(u"a");
    boost::shared_ptr<Collection> b = Group(u"b");
    boost::shared_ptr<Item> item = Tree().ItemCopy(Tree().PutItem(a->mId, u"shared.xmp", "x"));
    auto outcome = ServerOutcome::Make();
    mServer->AddAsync(outcome->OnSuccess(), outcome->OnError(), b, item, Guid::CreateUnique());
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->Successes(), 1);
    ASSERT_EQ(ChildrenOf(b).size(), 1u);
    EXPECT_EQ(ChildrenOf(b).front(), item);
    EXPECT_EQ(Tree().ChildIds(a->mId), std::vector<UTF8String>(1, item->mId));
    EXPECT_EQ(Tree().ChildIds(b->mId), std::vector<UTF8String>(1, item->mId));
}

TEST_F(InMemoryCollections, AddingIntoItselfOrAnAssetTheServerNoLongerHasFailsAndAppendsNothing)
{
    boost::shared_ptr<Collection> outer = Group(u"outer");
    boost::shared_ptr<Collection> inner = Tree().CollectionCopy(Tree().MakeCollection(outer->mId, u"inner"));
    auto cycle = ServerOutcome::Make();
    mServer->AddAsync(cycle->OnSuccess(), cycle->OnError(), inner, outer, Guid::CreateUnique());
    ASSERT_TRUE(cycle->Wait());
    EXPECT_EQ(cycle->ErrorStatus(), 409);

    boost::shared_ptr<Item> gone = Tree().ItemCopy(Tree().PutItem(UTF8String(), u"gone", ""));
    Tree().Remove(gone->mId);
    auto missing = ServerOutcome::Make();
    mServer->AddAsync(missing->OnSuccess(), missing->OnError(), outer, gone, Guid::CreateUnique());
    ASSERT_TRUE(missing->Wait());
    EXPECT_EQ(missing->ErrorStatus(), 404);
    EXPECT_TRUE(ChildrenOf(inner).empty());
    EXPECT_TRUE(ChildrenOf(outer).empty());
}

TEST_F(InMemoryCollections, FetchChildrenEmptiesAtTheCallThenFillsWithFreshCopiesInMemberOrder)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    const UTF8String later = Tree().PutItem(UTF8String(), u"made first", "1");
    Tree().PutItem(group->mId, u"made second", "2");
    Tree().AddMember(group->mId, later);
    Tree().SetTrashed(Tree().PutItem(group->mId, u"trashed", "3"), true);
    boost::shared_ptr<Item> stale(new Item);
    {
        boost::unique_lock<boost::recursive_mutex> lock(ChildrenMutex());
        group->mChildren.push_back(stale);
    }
    auto outcome = ServerOutcome::Make();
    {
        CompletionThreadHold hold;
        mServer->FetchChildrenAsync(outcome->OnSuccess(), outcome->OnError(), group, Guid::CreateUnique());
        EXPECT_TRUE(ChildrenOf(group).empty()) << "emptied before any answer";
    }
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(Names(ChildrenOf(group)), (std::vector<std::string>{"made second", "made first"}));
    EXPECT_TRUE(ChildrenOf(group).front()->mEtag.empty()) << "only an upload's item carries an entity tag";
}

TEST_F(InMemoryCollections, AFailedFetchLeavesTheCollectionEmpty)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    Tree().PutItem(group->mId, u"a", "1");
    mServer->FailRequest(InMemoryRequest_Search, 1, 502, "");
    auto outcome = ServerOutcome::Make();
    mServer->FetchChildrenAsync(outcome->OnSuccess(), outcome->OnError(), group, Guid::CreateUnique());
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->ErrorStatus(), 502);
    EXPECT_TRUE(ChildrenOf(group).empty());
}

// --- Delete ---

class InMemoryDelete : public InMemoryServerTest {};

TEST_F(InMemoryDelete, DeleteTakesTheAssetOutOfTheServerButNotOutOfTheCallersCollection)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    Tree().PutItem(group->mId, u"a", "1");
    auto fetched = ServerOutcome::Make();
    mServer->FetchChildrenAsync(fetched->OnSuccess(), fetched->OnError(), group, Guid::CreateUnique());
    ASSERT_TRUE(fetched->Wait());
    auto outcome = ServerOutcome::Make();
    mServer->DeleteAsync(outcome->OnSuccess(), outcome->OnError(), ChildrenOf(group).front(), false,
                         Guid::CreateUnique());
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->Successes(), 1);
    EXPECT_TRUE(Tree().ChildIds(group->mId).empty());
    EXPECT_EQ(ChildrenOf(group).size(), 1u);
}

TEST_F(InMemoryDelete, ByNameOfAMissingNameReleasesBothCallbacksWithoutCallingEither)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    boost::shared_ptr<int> token = boost::make_shared<int>(0);
    std::atomic<int> calls(0);
    const Guid id =
        mServer->DeleteAsync([token, &calls](const Guid&) { ++calls; },
                             [token, &calls](const Guid&, const boost::shared_ptr<tolmonet::Response>&) { ++calls; },
                             group, u"nobody", true, Guid::CreateUnique());
    ASSERT_FALSE(id.IsNil());
    const auto limit = std::chrono::steady_clock::now() + kCallbackWaitLimit;
    while (token.use_count() > 1 && std::chrono::steady_clock::now() < limit) std::this_thread::yield();
    EXPECT_EQ(token.use_count(), 1) << "both callbacks released";
    ASSERT_TRUE(DrainCompletionThread());
    EXPECT_EQ(calls.load(), 0);
    EXPECT_EQ(mServer->RequestCount(InMemoryRequest_Search), 1u);
    EXPECT_EQ(mServer->RequestCount(InMemoryRequest_Delete), 0u);
}

TEST_F(InMemoryDelete, ByNameWithTwoOfTheNameDeletesNothing)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    Tree().PutItem(group->mId, u"twin", "1");
    Tree().PutItem(group->mId, u"twin", "2");
    auto outcome = ServerOutcome::Make();
    mServer->DeleteAsync(outcome->OnSuccess(), outcome->OnError(), group, u"twin", true, Guid::CreateUnique());
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->ErrorBody(), "SearchOne: too many results");
    EXPECT_EQ(Tree().ChildIds(group->mId).size(), 2u);
}

TEST_F(InMemoryDelete, ACollectionWithMembersGoesOnlyRecursivelyAndKeepsMembersHeldElsewhere)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    boost::shared_ptr<Collection> other = Group(u"other");
    const UTF8String own = Tree().PutItem(group->mId, u"own", "1");
    const UTF8String shared = Tree().PutItem(group->mId, u"shared", "2");
    Tree().AddMember(other->mId, shared);

    auto refused = ServerOutcome::Make();
    mServer->DeleteAsync(refused->OnSuccess(), refused->OnError(), group, false, Guid::CreateUnique());
    ASSERT_TRUE(refused->Wait());
    EXPECT_EQ(refused->ErrorStatus(), 409);

    auto done = ServerOutcome::Make();
    mServer->DeleteAsync(done->OnSuccess(), done->OnError(), group, true, Guid::CreateUnique());
    ASSERT_TRUE(done->Wait());
    EXPECT_EQ(done->Successes(), 1);
    EXPECT_FALSE(Tree().Exists(group->mId));
    EXPECT_FALSE(Tree().Exists(own));
    EXPECT_TRUE(Tree().Exists(shared));
}

TEST_F(InMemoryDelete, RootsCannotBeDeleted)
{
    auto outcome = ServerOutcome::Make();
    mServer->DeleteAsync(outcome->OnSuccess(), outcome->OnError(), UserRoot(), true, Guid::CreateUnique());
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->ErrorStatus(), 403);
    EXPECT_TRUE(Tree().Exists(RootId()));
}

// --- Upload and download ---

class InMemoryTransfers : public InMemoryServerTest {};

TEST_F(InMemoryTransfers, UploadReplacesEverySameNameAssetAndAppendsTheNewItemToTheCaller)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    const UTF8String old1 = Tree().PutItem(group->mId, u"prefs.xmp", "old 1");
    const UTF8String old2 = Tree().PutItem(group->mId, u"prefs.xmp", "old 2");
    Tree().PutItem(group->mId, u"other.xmp", "other");
    Tree().SetClock(time_from_string("2099-11-24 08:49:37.123456"));
    auto outcome = ServerOutcome::Make();
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(mServer->UploadAsync(outcome->OnItem(), outcome->OnError(), group, LocalFile("local.xmp", "new bytes"),
                                   ImmutableString::CreateStatic("application/rdf+xml"), u"prefs.xmp", id),
              id);
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->Guids(), std::vector<Guid>(1, id));
    const boost::shared_ptr<Item> item = outcome->Item();
    ASSERT_TRUE(item);
    EXPECT_EQ(item->mName, u"prefs.xmp");
    EXPECT_EQ(item->mContentType, "application/rdf+xml");
    EXPECT_EQ(item->mSize, 9);
    EXPECT_EQ(item->mEtag, Tree().Etag(item->mId));
    EXPECT_EQ(item->mModified, time_from_string("2099-11-24 08:49:37.123456"));
    ASSERT_FALSE(ChildrenOf(group).empty());
    EXPECT_EQ(ChildrenOf(group).back(), item);
    EXPECT_FALSE(Tree().Exists(old1));
    EXPECT_FALSE(Tree().Exists(old2));
    EXPECT_EQ(Names(Tree().ChildNames(group->mId)), (std::vector<std::string>{"other.xmp", "prefs.xmp"}));
    EXPECT_EQ(Tree().Content(item->mId), "new bytes");
    EXPECT_EQ(mServer->RequestCount(InMemoryRequest_Delete), 2u);
}

TEST_F(InMemoryTransfers, UploadWithoutANameUsesTheFilesOwnAndEveryUploadGetsANewTagAndDate)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    Tree().SetClock(time_from_string("2099-01-01 00:00:00"));
    auto first = ServerOutcome::Make();
    mServer->UploadAsync(first->OnItem(), first->OnError(), group, LocalFile("a b.txt", "1"),
                         ImmutableString::CreateStatic("text/plain"), UTF16String(), Guid::CreateUnique());
    ASSERT_TRUE(first->Wait());
    auto second = ServerOutcome::Make();
    mServer->UploadAsync(second->OnItem(), second->OnError(), group, LocalFile("a b.txt", "1"),
                         ImmutableString::CreateStatic("text/plain"), UTF16String(), Guid::CreateUnique());
    ASSERT_TRUE(second->Wait());
    ASSERT_TRUE(first->Item() && second->Item());
    EXPECT_EQ(second->Item()->mName, u"a b.txt");
    EXPECT_NE(second->Item()->mEtag, first->Item()->mEtag);
    EXPECT_GT(second->Item()->mModified, first->Item()->mModified);
}

TEST_F(InMemoryTransfers, AnUnreadableFileFailsAfterTheDeletesWithAMadeUpResponse)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    const UTF8String old = Tree().PutItem(group->mId, u"gone.xmp", "old");
    auto outcome = ServerOutcome::Make();
    mServer->UploadAsync(outcome->OnItem(), outcome->OnError(), group, Missing("gone.xmp"),
                         ImmutableString::CreateStatic("text/plain"), UTF16String(), Guid::CreateUnique());
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->ErrorStatus(), tolmonet::kStatusNoResponse);
    EXPECT_NE(outcome->ErrorBody().find("gone.xmp"), std::string::npos) << outcome->ErrorBody();
    EXPECT_FALSE(Tree().Exists(old)) << "the old asset was deleted before the file was read";
    EXPECT_EQ(mServer->RequestCount(InMemoryRequest_Upload), 0u);
}

TEST_F(InMemoryTransfers, AnUploadAsACollectionMediaTypeIsRefusedByTheService)
{
    auto outcome = ServerOutcome::Make();
    mServer->UploadAsync(outcome->OnItem(), outcome->OnError(), Group(u"g"), LocalFile("x", "1"),
                         ImmutableString::CreateStatic("application/vnd.halvane.tarnvault.collection"), UTF16String(),
                         Guid::CreateUnique());
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->ErrorStatus(), 400);
}

TEST_F(InMemoryTransfers, DownloadWritesTheContentAndAnswersUnchangedForTheCurrentTag)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    Tree().SetClock(time_from_string("2099-11-24 08:49:37.5"));
    boost::shared_ptr<Item> item = Tree().ItemCopy(Tree().PutItem(group->mId, u"p", "server bytes", "text/plain"));
    const File target = Missing("p.temp");

    auto fresh = ServerOutcome::Make();
    mServer->DownloadAsync(fresh->OnDownload(), fresh->OnError(), item, target, UTF8String(), Guid::CreateUnique());
    ASSERT_TRUE(fresh->Wait());
    const DownloadResult result = fresh->Download();
    EXPECT_TRUE(result.mDownloaded);
    EXPECT_EQ(result.mEtag, Tree().Etag(item->mId));
    EXPECT_EQ(result.mContentType, "text/plain");
    EXPECT_EQ(result.mContentSize, 12u);
    EXPECT_EQ(result.mLastModified, u"Tue, 24 Nov 2099 08:49:37 GMT");
    EXPECT_EQ(ReadFileBytes(mDir / "p.temp"), "server bytes");

    const File elsewhere = Missing("q.temp");
    auto unchanged = ServerOutcome::Make();
    mServer->DownloadAsync(unchanged->OnDownload(), unchanged->OnError(), item, elsewhere, result.mEtag,
                           Guid::CreateUnique());
    ASSERT_TRUE(unchanged->Wait());
    EXPECT_EQ(unchanged->Successes(), 1);
    EXPECT_FALSE(unchanged->Download().mDownloaded);
    EXPECT_TRUE(unchanged->Download().mEtag.empty());
    EXPECT_FALSE(elsewhere.Exists());

    Tree().SetContent(item->mId, "changed");
    auto changed = ServerOutcome::Make();
    mServer->DownloadAsync(changed->OnDownload(), changed->OnError(), item, elsewhere, result.mEtag,
                           Guid::CreateUnique());
    ASSERT_TRUE(changed->Wait());
    EXPECT_TRUE(changed->Download().mDownloaded);
    EXPECT_NE(changed->Download().mEtag, result.mEtag);
    EXPECT_EQ(ReadFileBytes(mDir / "q.temp"), "changed");
}

TEST_F(InMemoryTransfers, DownloadOfADeletedItemOrIntoAMissingDirectoryFails)
{
    boost::shared_ptr<Item> item = Tree().ItemCopy(Tree().PutItem(RootId(), u"p", "bytes"));
    auto nowhere = ServerOutcome::Make();
    mServer->DownloadAsync(nowhere->OnDownload(), nowhere->OnError(), item,
                           File(tolmocore::utility::ToUTF16((mDir / "no-dir" / "p").string())), UTF8String(),
                           Guid::CreateUnique());
    ASSERT_TRUE(nowhere->Wait());
    EXPECT_EQ(nowhere->ErrorStatus(), tolmonet::kStatusNoResponse);

    Tree().Remove(item->mId);
    auto gone = ServerOutcome::Make();
    mServer->DownloadAsync(gone->OnDownload(), gone->OnError(), item, Missing("p"), UTF8String(), Guid::CreateUnique());
    ASSERT_TRUE(gone->Wait());
    EXPECT_EQ(gone->ErrorStatus(), 404);
    EXPECT_FALSE(Missing("p").Exists());
}

// --- Search and header ---

class InMemorySearch : public InMemoryServerTest {
protected:
    std::vector<std::string> Search(const SearchQuery& query)
    {
        auto outcome = ServerOutcome::Make();
        mServer->SearchAsync(outcome->OnAssets(), outcome->OnError(), query, Guid::CreateUnique());
        EXPECT_TRUE(outcome->Wait());
        EXPECT_EQ(outcome->Errors(), 0) << outcome->ErrorBody();
        return Names(outcome->Assets());
    }
};

TEST_F(InMemorySearch, CreationOrderWithoutScopeAndMemberOrderWithOne)
{
    Tree().ClientRootId("desk-1");
    boost::shared_ptr<Collection> group = Group(u"g");
    const UTF8String x = Tree().PutItem(UTF8String(), u"x", "");
    const UTF8String y = Tree().PutItem(UTF8String(), u"y", "");
    Tree().AddMember(group->mId, y);
    Tree().AddMember(group->mId, x);
    EXPECT_EQ(Search(SearchQuery()), (std::vector<std::string>{"root", "g", "x", "y"}));
    EXPECT_EQ(Search(SearchQuery(group, UTF16String())), (std::vector<std::string>{"y", "x"}));
    EXPECT_EQ(Search(SearchQuery(kCollectionType_Root, UTF16String())), (std::vector<std::string>{"root"}));
    EXPECT_EQ(Search(SearchQuery(group, u"x")), (std::vector<std::string>{"x"}));
}

TEST_F(InMemorySearch, TrashedAssetsFollowTheCriterion)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    Tree().PutItem(group->mId, u"kept", "");
    Tree().SetTrashed(Tree().PutItem(group->mId, u"binned", ""), true);
    SearchQuery query(group, UTF16String());
    EXPECT_EQ(Search(query), (std::vector<std::string>{"kept"}));
    query.mTrashed.mModifier = kSearchModifier_None;
    EXPECT_EQ(Search(query), (std::vector<std::string>{"kept", "binned"}));
    query.mTrashed.mModifier = kSearchModifier_Equal;
    query.mTrashed.mValue = true;
    EXPECT_EQ(Search(query), (std::vector<std::string>{"binned"}));
}

TEST_F(InMemorySearch, ABadModifierThrowsOnTheCallersThreadAndSendsNothing)
{
    SearchQuery query;
    query.mTrashed.mModifier = static_cast<SearchModifier>(7);
    auto outcome = ServerOutcome::Make();
    try {
        mServer->SearchAsync(outcome->OnAssets(), outcome->OnError(), query, Guid::CreateUnique());
        ADD_FAILURE() << "no exception";
    } catch (const std::runtime_error& e) {
        EXPECT_STREQ(e.what(), "SearchCriteria Modifier error");
    }
    EXPECT_THROW(mServer->SearchOneAsync(outcome->OnAsset(), outcome->OnError(), query, Guid::CreateUnique()),
                 std::runtime_error);
    EXPECT_EQ(mServer->RequestCount(), 0u);
}

TEST_F(InMemorySearch, AScopeNamingNoCollectionIsNotFound)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    Tree().Remove(group->mId);
    auto outcome = ServerOutcome::Make();
    mServer->SearchAsync(outcome->OnAssets(), outcome->OnError(), SearchQuery(group, UTF16String()),
                         Guid::CreateUnique());
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->ErrorStatus(), 404);
}

TEST_F(InMemorySearch, SearchOneGivesNullTheAssetOrTooManyResults)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    Tree().PutItem(group->mId, u"one", "");
    Tree().PutItem(group->mId, u"two", "");
    Tree().PutItem(group->mId, u"two", "");
    auto none = ServerOutcome::Make();
    auto one = ServerOutcome::Make();
    auto many = ServerOutcome::Make();
    mServer->SearchOneAsync(none->OnAsset(), none->OnError(), SearchQuery(group, u"zero"), Guid::CreateUnique());
    mServer->SearchOneAsync(one->OnAsset(), one->OnError(), SearchQuery(group, u"one"), Guid::CreateUnique());
    mServer->SearchOneAsync(many->OnAsset(), many->OnError(), SearchQuery(group, u"two"), Guid::CreateUnique());
    ASSERT_TRUE(none->Wait() && one->Wait() && many->Wait());
    EXPECT_EQ(none->Successes(), 1);
    EXPECT_FALSE(none->Asset());
    ASSERT_TRUE(one->Asset());
    EXPECT_EQ(one->Asset()->mName, u"one");
    EXPECT_EQ(many->Errors(), 1);
    EXPECT_EQ(many->ErrorBody(), "SearchOne: too many results");
}

TEST_F(InMemorySearch, HeaderHandsOutAFreshCopyEachTime)
{
    const UTF8String id = Tree().PutItem(RootId(), u"p", "abc", "text/plain");
    auto first = ServerOutcome::Make();
    auto second = ServerOutcome::Make();
    mServer->HeaderAsync(first->OnAsset(), first->OnError(), id, false, Guid::CreateUnique());
    mServer->HeaderAsync(second->OnAsset(), second->OnError(), id, false, Guid::CreateUnique());
    ASSERT_TRUE(first->Wait() && second->Wait());
    ASSERT_TRUE(first->Asset() && second->Asset());
    EXPECT_NE(first->Asset(), second->Asset());
    const boost::shared_ptr<Item> item = boost::dynamic_pointer_cast<Item>(first->Asset());
    ASSERT_TRUE(item);
    EXPECT_EQ(item->mSize, 3);
    EXPECT_EQ(item->mCreated, Tree().Created(id));

    auto missing = ServerOutcome::Make();
    mServer->HeaderAsync(missing->OnAsset(), missing->OnError(), "nope", true, Guid::CreateUnique());
    ASSERT_TRUE(missing->Wait());
    EXPECT_EQ(missing->ErrorStatus(), 404);
}

// --- Faults ---

class InMemoryFaultSwitches : public InMemoryServerTest {};

TEST_F(InMemoryFaultSwitches, ARefusedRequestGivesANilGuidAndNoCallback)
{
    const auto fault = mServer->RefuseRequest(InMemoryRequest_Header, 1);
    auto outcome = ServerOutcome::Make();
    EXPECT_TRUE(
        mServer->HeaderAsync(outcome->OnAsset(), outcome->OnError(), RootId(), true, Guid::CreateUnique()).IsNil());
    ASSERT_TRUE(DrainCompletionThread());
    EXPECT_EQ(outcome->Successes() + outcome->Errors(), 0);
    EXPECT_EQ(mServer->Faults().Hits(fault), 1u);

    auto next = ServerOutcome::Make();
    EXPECT_FALSE(mServer->HeaderAsync(next->OnAsset(), next->OnError(), RootId(), true, Guid::CreateUnique()).IsNil());
    ASSERT_TRUE(next->Wait());
    EXPECT_EQ(next->Successes(), 1) << "the fault was for the first request only";
}

TEST_F(InMemoryFaultSwitches, AFailedRequestDeliversTheChosenStatusAndChangesNothing)
{
    const auto fault = mServer->FailRequest(InMemoryRequest_CreateCollection, 0, 507, "quota");
    for (int i = 0; i < 2; ++i) {
        auto outcome = ServerOutcome::Make();
        mServer->CreateCollectionAsync(outcome->OnCollection(), outcome->OnError(), u"g", kCollectionType_Collection,
                                       Guid::CreateUnique());
        ASSERT_TRUE(outcome->Wait());
        EXPECT_EQ(outcome->ErrorStatus(), 507);
        EXPECT_EQ(outcome->ErrorBody(), "quota");
    }
    EXPECT_EQ(mServer->Faults().Hits(fault), 2u);
    EXPECT_EQ(Tree().AssetCount(), 1u);
}

TEST_F(InMemoryFaultSwitches, TheNthRequestOverallCanFailInTheMiddleOfAnUpload)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    const UTF8String old = Tree().PutItem(group->mId, u"p", "old");
    mServer->FailRequest(InMemoryRequest_Any, 3, 503, "busy");  // search, delete, then the post
    auto outcome = ServerOutcome::Make();
    mServer->UploadAsync(outcome->OnItem(), outcome->OnError(), group, LocalFile("p", "new"),
                         ImmutableString::CreateStatic("text/plain"), UTF16String(), Guid::CreateUnique());
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->ErrorStatus(), 503);
    EXPECT_FALSE(Tree().Exists(old)) << "deletes done before the failure stay done";
    EXPECT_TRUE(Tree().ChildIds(group->mId).empty());
    EXPECT_EQ(mServer->Faults().RequestLog(),
              (std::vector<InMemoryRequest>{InMemoryRequest_Search, InMemoryRequest_Delete, InMemoryRequest_Upload}));
}

TEST_F(InMemoryFaultSwitches, ARefusedFollowUpRequestEndsTheOperationWithANullResponse)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    Tree().PutItem(group->mId, u"p", "old");
    mServer->RefuseRequest(InMemoryRequest_Delete, 1);
    auto outcome = ServerOutcome::Make();
    EXPECT_FALSE(mServer
                     ->UploadAsync(outcome->OnItem(), outcome->OnError(), group, LocalFile("p", "new"),
                                   ImmutableString::CreateStatic("text/plain"), UTF16String(), Guid::CreateUnique())
                     .IsNil());
    ASSERT_TRUE(outcome->Wait());
    EXPECT_EQ(outcome->ErrorStatus(), 1) << "1 stands for a null response";
}

TEST_F(InMemoryFaultSwitches, AFaultMayAimAtTheRequestsOfOneOperationAndTellsWhenItFires)
{
    boost::shared_ptr<Collection> group = Group(u"g");
    std::atomic<int> fired(0);
    InMemoryFault fault;
    fault.mOperation = InMemoryOperation_FetchChildren;
    fault.mStatus = 401;
    fault.mOnFire = [&fired](InMemoryOperation, InMemoryRequest request, const Guid&) {
        if (request == InMemoryRequest_Search) ++fired;
    };
    mServer->Faults().Add(fault);

    auto search = ServerOutcome::Make();
    mServer->SearchAsync(search->OnAssets(), search->OnError(), SearchQuery(group, UTF16String()),
                         Guid::CreateUnique());
    ASSERT_TRUE(search->Wait());
    EXPECT_EQ(search->Successes(), 1);
    EXPECT_EQ(fired.load(), 0);

    auto fetch = ServerOutcome::Make();
    mServer->FetchChildrenAsync(fetch->OnSuccess(), fetch->OnError(), group, Guid::CreateUnique());
    ASSERT_TRUE(fetch->Wait());
    EXPECT_EQ(fetch->ErrorStatus(), 401);
    EXPECT_EQ(fired.load(), 1);
    EXPECT_EQ(mServer->Faults().OperationCount(InMemoryOperation_FetchChildren), 1u);
}

}  // namespace
