// Migration of an earlier host version's preferences into a new version's
// root, and the recursive copy under it, against the local service with
// seeded trees.

#include <gtest/gtest.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <thread>

#include <boost/make_shared.hpp>

#include "server/FaultHooks.h"
#include "server/TreeSeeder.h"
#include "support/HostClient.h"
#include "support/TempDir.h"
#include "support/TestService.h"
#include "tarnvault/Tarnvault.h"

namespace {

using namespace tolmonetsync;
using server::TreeSeeder;
using testsupport::Await;
using testsupport::HostIdentity;
using testsupport::Outcome;
using tolmocore::utility::ToNarrow;
using tolmocore::utility::ToUTF16;

const char kClient[] = "desk";
const char kCinderalOldClient[] = "5d26c4f8-0ae1-47b3-9c15-c3e7b0926d41";

class Migration : public ::testing::Test {
protected:
    Migration() { setenv("TMPDIR", mTemp.Path().c_str(), 1); }
    ~Migration() override { unsetenv("TMPDIR"); }

    static void Host(const char16_t* app, const char16_t* version) { HostIdentity::Set(u"Co", app, version); }
    boost::shared_ptr<tarnvault::Tarnvault> Client(bool major, bool previousMajor)
    {
        ParameterList parameters =
            testsupport::Parameters(mService->AssetServiceUrl(), testsupport::kAliceToken, kClient);
        if (major) parameters.emplace_back(tolmonet::kHEADER_CACHECONTROL, UTF8String("migrate-major"));
        if (previousMajor)
            parameters.emplace_back(tolmonet::kHEADER_CACHECONTROL, UTF8String("migrate-previous-major"));
        return boost::shared_ptr<tarnvault::Tarnvault>(new tarnvault::Tarnvault(parameters));
    }
    static Outcome PreferencesRoot(const boost::shared_ptr<tarnvault::Tarnvault>& client)
    {
        return Await(
            [&](Outcome& o) { client->GetPreferencesRootAsync(o.Success(), o.Error(), Guid::CreateUnique()); });
    }
    // A version's preferences root: an item named for it at the top and a
    // nested group whose names carry the version too. The contents name
    // `contentsOf`: a migrated tree is the earlier one with only names changed.
    std::string SeedVersion(const std::string& clientRoot, const std::string& app, const std::string& version,
                            const std::string& contentsOf = std::string())
    {
        const std::string of = contentsOf.empty() ? version : contentsOf;
        const std::string root = mSeed->Collection(clientRoot, "Co_" + app + "_" + version, server::kMediaPreferences);
        mSeed->Item(root, "from-" + version + ".txt", "settings of " + of, "text/plain");
        const std::string group = mSeed->Collection(root, "Group " + version);
        mSeed->Item(group, "a.json", "{\"v\":\"" + of + "\"}", "application/json");
        const std::string deeper = mSeed->Collection(group, "Deeper");
        mSeed->Item(deeper, "b-" + version + ".bin", "b", "application/octet-stream");
        return root;
    }
    std::string NewRootTree(const std::string& app, const std::string& version)
    {
        const std::string root = mSeed->Find(mSeed->ClientRoot(kClient), "Co_" + app + "_" + version);
        return root.empty() ? "<no root>" : mSeed->Describe(root);
    }
    // Copies `source` into `target` with no name map; waits for its end.
    Outcome Copy(const std::string& source, const std::string& target)
    {
        const auto client = Client(false, false);
        return Await([&](Outcome& o) {
            client->CopyAsync(o.Success(), o.Error(), CollectionWithId(source), CollectionWithId(target),
                              Guid::CreateUnique(), tarnvault::Tarnvault::NameMap());
        });
    }
    static boost::shared_ptr<Collection> CollectionWithId(const std::string& id)
    {
        const auto collection = boost::make_shared<Collection>();
        collection->mId = UTF8String(id.begin(), id.end());
        return collection;
    }
    static std::size_t ItemsIn(const std::string& described)
    {
        std::size_t items = 0;
        for (std::size_t at = 0; (at = described.find("): ", at)) != std::string::npos; ++at) ++items;
        return items;
    }
    bool WaitForNoTempFiles() const
    {
        for (int i = 0; i < 3000 && TempFiles() != 0; ++i) std::this_thread::sleep_for(std::chrono::milliseconds(10));
        return TempFiles() == 0;
    }
    std::size_t TempFiles() const
    {
        std::size_t count = 0;
        for (const auto& entry : std::filesystem::directory_iterator(mTemp.Path())) count += entry.is_regular_file();
        return count;
    }
    testsupport::TempDir mTemp;
    testsupport::TestService mService;
    std::unique_ptr<TreeSeeder> mSeed = std::make_unique<TreeSeeder>(*mService, "alice");
};

TEST_F(Migration, EachFormAndVersionCopiesTheRightEarlierTree)
{
    const std::string clientRoot = mSeed->ClientRoot(kClient);
    std::map<std::string, std::string> oldTrees;
    for (const char* version : {"9.1", "8.5", "8.0"})
        oldTrees[version] = mSeed->Describe(SeedVersion(clientRoot, "App", version));
    const std::string expectedTrees = mSeed->Collection(clientRoot, "Expected");

    const struct {
        const char16_t* mVersion;
        bool mMajor, mPrevious;
        const char* mFrom;  // empty: no migration; "error": the version cannot be migrated from
    } cases[] = {
        {u"9.2", true, false, "9.1"},     {u"9.2", true, true, "9.1"},     {u"9.2", false, true, "8.0"},
        {u"9.0", true, false, "error"},   {u"9.0", true, true, "8.5"},     {u"9.0", false, true, "8.0"},
        {u"0.0", true, false, "error"},   {u"0.0", true, true, "error"},   {u"0.0", false, true, "error"},
        {u"9.0.1", true, false, "error"}, {u"9.0.1", true, true, "error"}, {u"9.0.1", false, true, "error"},
        {u"9.2", false, false, ""},
    };
    int appNumber = 0;
    for (const auto& entry : cases) {
        // Each case a host of its own name, so that every case starts without a new root.
        const std::string app = "App" + std::to_string(++appNumber);
        const std::string version = ToNarrow(entry.mVersion);
        for (const char* old : {"9.1", "8.5", "8.0"}) SeedVersion(clientRoot, app, old);
        Host(ToUTF16(app).c_str(), entry.mVersion);
        const std::string label = version + (entry.mMajor ? " major" : "") + (entry.mPrevious ? " previous-major" : "");
        const auto client = Client(entry.mMajor, entry.mPrevious);
        std::vector<std::string> started;  // only the completion thread writes, before the root comes
        client->SetMigrationStartedCallback([&](const UTF16String& fromVersion, const UTF16String& rootName) {
            started.push_back(ToNarrow(fromVersion) + " " + ToNarrow(rootName));
        });
        const Outcome ended = PreferencesRoot(client);
        const std::string from = entry.mFrom;
        const bool migrated = !from.empty() && from != "error";
        EXPECT_EQ(started,
                  migrated ? std::vector<std::string>{from + " Co_" + app + "_" + from} : std::vector<std::string>())
            << label;
        if (from == "error") {
            EXPECT_EQ(ended.ErrorText(), "Could not migrate preferences, problem with client version") << label;
            EXPECT_EQ(NewRootTree(app, version), "<no root>") << label;
            continue;
        }
        ASSERT_TRUE(ended.Succeeded()) << label << ": " << ended.ErrorText();
        const std::string expected =
            from.empty() ? std::string() : mSeed->Describe(SeedVersion(expectedTrees, app, version, from));
        EXPECT_EQ(NewRootTree(app, version), expected) << label;
    }
    // The earlier trees were only read.
    for (const auto& old : oldTrees)
        EXPECT_EQ(mSeed->Describe(mSeed->Find(clientRoot, "Co_App_" + old.first)), old.second);
    EXPECT_EQ(TempFiles(), 0u);
}

TEST_F(Migration, CinderalUpToEightTakesTheOldClientIdentifiersTree)
{
    const std::string oldClientRoot = mSeed->ClientRoot(kCinderalOldClient);
    SeedVersion(oldClientRoot, "Cinderal", "8.0");
    SeedVersion(mSeed->ClientRoot(kClient), "Cinderal", "9.1");
    Host(u"Cinderal", u"9.0");
    const auto client = Client(false, true);
    ASSERT_TRUE(PreferencesRoot(client).Succeeded());
    EXPECT_NE(NewRootTree("Cinderal", "9.0").find("from-9.0.txt"), std::string::npos) << NewRootTree("Cinderal", "9.0");
    // The older root is not cached in place of ours.
    EXPECT_EQ(client->CachedRoot()->mId.ToStdString(), mSeed->ClientRoot(kClient));

    // Above 8.0 the current identifier's tree is the source.
    Host(u"Cinderal", u"9.2");
    ASSERT_TRUE(PreferencesRoot(Client(true, false)).Succeeded());
    EXPECT_NE(NewRootTree("Cinderal", "9.2").find("from-9.2.txt"), std::string::npos);
    EXPECT_EQ(mSeed->Describe(mSeed->Find(oldClientRoot, "Co_Cinderal_8.0")).find("9.0"), std::string::npos);
}

TEST_F(Migration, AnEmptyOrUnreadableEarlierRootGivesAnEmptyNewOne)
{
    mSeed->Collection(mSeed->ClientRoot(kClient), "Co_App_9.1", server::kMediaPreferences);
    Host(u"App", u"9.2");
    const Outcome ended = PreferencesRoot(Client(true, false));
    ASSERT_TRUE(ended.Succeeded()) << ended.ErrorText();
    EXPECT_EQ(NewRootTree("App", "9.2"), "");

    // The search for the earlier root fails: the new root still comes.
    SeedVersion(mSeed->ClientRoot(kClient), "App", "9.2");
    server::FaultRule broken;
    broken.mMethod = "POST";
    broken.mPathPattern = "/api/search";
    broken.mQueryPattern = "9\\.2";
    const auto fault = mService->Faults().Install(broken);
    Host(u"App", u"9.3");
    const Outcome failed = PreferencesRoot(Client(true, false));
    EXPECT_TRUE(fault->Fired());
    ASSERT_TRUE(failed.Succeeded()) << failed.ErrorText();
    EXPECT_EQ(NewRootTree("App", "9.3"), "");
}

// A failed upload: the other items still arrive and none is sent twice. A
// copy reports it at its end; a migration still gives the new root.
TEST_F(Migration, AFailedUploadLetsTheRestArrive)
{
    const std::string clientRoot = mSeed->ClientRoot(kClient);
    const std::string old = SeedVersion(clientRoot, "App", "9.1");
    const std::string before = mSeed->Describe(old);
    server::FaultRule refuse;
    refuse.mMethod = "POST";
    refuse.mPathPattern = "/api/assets";
    refuse.mNth = 2;
    refuse.mBody = "disk full";
    auto fault = mService->Faults().Install(refuse);
    const std::string target = mSeed->Collection(clientRoot, "Target");
    const Outcome copied = Copy(old, target);
    EXPECT_FALSE(copied.Succeeded());
    EXPECT_EQ(copied.ErrorText(), "disk full");
    EXPECT_EQ(fault->Seen(), 3);  // three items, each sent once
    EXPECT_EQ(ItemsIn(mSeed->Describe(target)), 2u);

    fault = mService->Faults().Install(refuse);
    Host(u"App", u"9.2");
    const Outcome migrated = PreferencesRoot(Client(true, false));
    ASSERT_TRUE(migrated.Succeeded()) << "a failed copy still gives the new root: " << migrated.ErrorText();
    EXPECT_EQ(fault->Seen(), 3);
    EXPECT_EQ(ItemsIn(NewRootTree("App", "9.2")), 2u);
    EXPECT_EQ(mSeed->Describe(old), before);
    EXPECT_TRUE(WaitForNoTempFiles());
}

TEST_F(Migration, ACopyWhoseClientGoesMidwayEndsOnceAndLeavesNoTemporaryFile)
{
    const std::string clientRoot = mSeed->ClientRoot(kClient);
    const std::string source = SeedVersion(clientRoot, "App", "9.1");
    const std::string target = mSeed->Collection(clientRoot, "Target");
    server::FaultRule slow;
    slow.mMethod = "GET";
    slow.mPathPattern = "/api/assets/[^/]+";
    slow.mAction = server::FaultAction_Delay;
    slow.mDelay = std::chrono::milliseconds(300);
    const auto fault = mService->Faults().Install(slow);
    Host(u"App", u"9.1");

    Outcome ended;
    {
        auto client = Client(false, false);
        client->CopyAsync(ended.Success(), ended.Error(), CollectionWithId(source), CollectionWithId(target),
                          Guid::CreateUnique(), tarnvault::Tarnvault::NameMap());
        while (!fault->Fired()) std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }  // the client goes while the first download is held
    ASSERT_TRUE(ended.Wait());
    EXPECT_EQ(ended.ErrorText(), "Tarnvault closed prematurely");
    ended.LetGo();
    ASSERT_TRUE(ended.WaitReleased());
    EXPECT_EQ(ended.Calls(), 1u);
    EXPECT_TRUE(WaitForNoTempFiles());
}

}  // namespace
