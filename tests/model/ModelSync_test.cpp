// Random changes on both sides of a registered folder, a sync in a random
// mode after each round, and after each sync the folder, the server's group
// and the run's backups compared with DecisionModel.
//
//   TOLMONETSYNC_MODEL_SEED=N|random   another seed than the fixed one
//   TOLMONETSYNC_MODEL_STEPS=N         rounds for each way of seeing a change

#include <gtest/gtest.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <random>
#include <sstream>

#include "DecisionModel.h"
#include "SyncHarness.h"
#include "foundation/net/HeaderConstants.h"
#include "server/Accounts.h"
#include "server/AssetStore.h"
#include "server/Database.h"
#include "server/TreeSeeder.h"
#include "support/TestScopes.h"
#include "support/TestService.h"
#include "tarnvault/Tarnvault.h"

namespace modeltest {
namespace {

namespace fs = std::filesystem;
using namespace tolmonetsync;
using server::AssetRecord;
using Contents = std::map<std::string, std::string>;

const char kClientId[] = "model desk";
const char kGroup[] = "Presets";
const char kMediaType[] = "text/plain";
const char* const kNames[] = {"a.txt", "b.txt", "c.txt", "d.txt", "e.txt"};
// 2020-01-01: dates of the other computer's versions count up from here.
const std::int64_t kRemoteBaseDate = 1577836800;
const SyncMode kModes[] = {SyncMode_TwoWay, SyncMode_ServerWins, SyncMode_LocalWins};

std::uint32_t Seed()
{
    const char* text = std::getenv("TOLMONETSYNC_MODEL_SEED");
    if (text == nullptr) return 20261125;
    if (std::string(text) == "random") return std::random_device()();
    return static_cast<std::uint32_t>(std::stoul(text));
}

int StepsFor(int fallback)
{
    const char* text = std::getenv("TOLMONETSYNC_MODEL_STEPS");
    return text == nullptr ? fallback : std::stoi(text);
}

// The host's folder and preference directory, the service, and the second
// computer, which changes the group straight in the service's store.
class Rig {
public:
    Rig() : mOwner(mService->GetAccounts().EnsureUser("alice")), mSeeder(*mService, "alice")
    {
        fs::create_directories(Folder());
    }

    fs::path Folder() const { return mDesk.Path() / kGroup; }

    synctest::RunResult Sync(SyncMode mode, SyncMetadata_Options options)
    {
        ParameterList parameters;
        parameters.emplace_back(tolmonet::kHEADER_LOCATION, UTF8String(mService->AssetServiceUrl()));
        parameters.emplace_back(tolmonet::kHEADER_USER_AGENT, UTF8String(kClientId));
        parameters.emplace_back(tolmonet::kHEADER_COOKIE, UTF8String(testsupport::kAliceToken));
        synctest::SyncHarness host(boost::shared_ptr<SyncServer>(new tarnvault::Tarnvault(parameters)));
        host.Service().RegisterSyncDirectory(SyncDir(Dir(tolmocore::utility::ToUTF16(Folder().string())), u".txt",
                                                     u"Presets", ImmutableString::CreateStatic(kMediaType), options,
                                                     1 << 20));
        return host.Sync(mode);
    }

    void WriteLocal(const std::string& name, const std::string& bytes, FileTime modified)
    {
        testsupport::WriteFileBytes(Folder() / name, bytes);
        fs::last_write_time(Folder() / name, modified);
    }

    // Every file of the folder, leftovers included.
    Contents LocalContents() const
    {
        Contents files;
        for (const auto& entry : fs::directory_iterator(Folder()))
            files[entry.path().filename().string()] = testsupport::ReadFileBytes(entry.path());
        return files;
    }

    // The group's items by name; a second item of one name is a fault.
    std::map<std::string, RemoteItem> Items()
    {
        std::map<std::string, RemoteItem> items;
        const std::string group = Group(false);
        if (group.empty()) return items;
        for (const AssetRecord& member : mService->Assets().Members(mOwner, group)) {
            AssetRecord record;
            EXPECT_EQ(items.count(member.mName), 0u) << "two items named " << member.mName;
            items[member.mName] = {mService->Assets().Content(mOwner, member.mId, record), member.mEtag};
        }
        return items;
    }

    // A new version from another computer, with a new tag and the date given.
    // The client reads dates in whole seconds, so the service's own stamp
    // would tell two versions of one second apart only by chance.
    std::string PutRemote(const std::string& name, const std::string& bytes, std::int64_t secondsSince1970)
    {
        DeleteRemote(name);
        const AssetRecord item = mService->Assets().Upload(mOwner, {Group(true)}, name, kMediaType, bytes);
        server::Connection store((mService.DataDirectory() / "service.sqlite3").string());
        server::Statement(store, "UPDATE assets SET modified = ?1 WHERE id = ?2")
            .Bind(1, secondsSince1970 * 1000000)
            .Bind(2, item.mId)
            .Run();
        return item.mEtag;
    }

    void DeleteRemote(const std::string& name)
    {
        const std::string group = Group(false);
        const std::string id = group.empty() ? std::string() : mSeeder.Find(group, name);
        if (!id.empty()) mService->Assets().Delete(mOwner, id, false);
    }

    std::set<fs::path> BackupRuns() const
    {
        std::set<fs::path> runs;
        const fs::path root = mPrefs.Path() / "SyncBackup";
        if (fs::exists(root))
            for (const auto& entry : fs::directory_iterator(root))
                if (entry.is_directory()) runs.insert(entry.path());
        return runs;
    }

    // The copies in runs that were not there before, by name.
    Contents NewBackups(const std::set<fs::path>& before) const
    {
        Contents copies;
        for (const fs::path& run : BackupRuns())
            if (before.count(run) == 0)
                for (const auto& file : fs::directory_iterator(run))
                    copies[file.path().filename().string()] = testsupport::ReadFileBytes(file.path());
        return copies;
    }

private:
    std::string Group(bool create)
    {
        const std::string rootName = tolmocore::utility::ToNarrow(
            boost::shared_ptr<tarnvault::Tarnvault>(new tarnvault::Tarnvault(ParameterList()))
                ->GetPreferencesRootName());
        const std::string clientRoot = mSeeder.ClientRoot(kClientId);
        std::string root = mSeeder.Find(clientRoot, rootName);
        if (root.empty() && create) root = mSeeder.Collection(clientRoot, rootName, server::kMediaPreferences);
        std::string group = root.empty() ? std::string() : mSeeder.Find(root, kGroup);
        if (group.empty() && create) group = mSeeder.Collection(root, kGroup);
        return group;
    }

    testsupport::PrefDirScope mPrefs;
    testsupport::TempDir mDesk;
    testsupport::TestService mService;
    std::int64_t mOwner;
    server::TreeSeeder mSeeder;
};

class ModelRun {
public:
    ModelRun(std::uint32_t seed, SyncMetadata_Options options) : mRandom(seed), mOptions(options) {}

    // Applies one round of changes; says what they were.
    std::string Change()
    {
        std::ostringstream said;
        for (int count = 1 + Pick(3); count > 0; --count) {
            const std::string name = kNames[Pick(5)];
            const std::string bytes = name + " v" + std::to_string(++mVersion);
            const auto local = mWorld.mLocal.find(name);
            if (Pick(2) == 0) {
                // Dates of local changes are set, far from the download times.
                const FileTime date = mBaseDate + std::chrono::seconds(mVersion);
                const int kind = local == mWorld.mLocal.end() ? 0 : Pick(4);
                if (kind == 0) {
                    said << "local write " << name << "; ";
                    mWorld.mLocal[name] = {bytes, date};
                } else if (kind == 1) {
                    said << "local write " << name << " keeping its date; ";
                    local->second.mBytes = bytes;
                } else if (kind == 2) {
                    said << "local touch " << name << "; ";
                    local->second.mModified = date;
                } else {
                    said << "local delete " << name << "; ";
                    fs::remove(mRig.Folder() / name);
                    mWorld.mLocal.erase(local);
                    continue;
                }
                mRig.WriteLocal(name, mWorld.mLocal[name].mBytes, mWorld.mLocal[name].mModified);
            } else if (mWorld.mRemote.count(name) != 0 && Pick(2) == 0) {
                said << "remote delete " << name << "; ";
                mRig.DeleteRemote(name);
                mWorld.mRemote.erase(name);
            } else {
                said << "remote write " << name << "; ";
                mWorld.mRemote[name] = {bytes, mRig.PutRemote(name, bytes, kRemoteBaseDate + mVersion)};
            }
        }
        return said.str();
    }

    // One sync in a random mode, checked against the model; false on a
    // difference.
    bool SyncAndCompare()
    {
        const SyncMode mode = kModes[Pick(3)];
        SCOPED_TRACE("mode " + std::to_string(mode));
        const Outcome expected = Predict(mWorld, mode, mOptions == SyncMetadata_Checksum);
        const std::set<fs::path> runsBefore = mRig.BackupRuns();
        const synctest::RunResult result = mRig.Sync(mode, mOptions);
        EXPECT_TRUE(result.Ok()) << result.mError;
        EXPECT_EQ(result.mMoved, static_cast<int>(expected.mUploaded.size() + expected.mDownloaded.size()));
        EXPECT_EQ(mRig.LocalContents(), expected.mLocal);
        const std::map<std::string, RemoteItem> items = mRig.Items();
        Contents remote;
        for (const auto& [name, item] : items) {
            remote[name] = item.mBytes;
            const auto before = mWorld.mRemote.find(name);
            if (before != mWorld.mRemote.end()) {
                EXPECT_EQ(item.mEtag != before->second.mEtag, expected.mUploaded.count(name) != 0)
                    << name << ": a new version on the server is an upload, and only that";
            }
        }
        EXPECT_EQ(remote, expected.mRemote);
        EXPECT_EQ(mRig.NewBackups(runsBefore), expected.mBackups);
        if (::testing::Test::HasFailure()) return false;

        // The world now is what the model said, with what only the sync
        // could tell: new tags and the dates of downloaded files.
        std::map<std::string, LocalFile> local;
        for (const auto& [name, bytes] : expected.mLocal)
            local[name] = {bytes, expected.mDownloaded.count(name) != 0 ? fs::last_write_time(mRig.Folder() / name)
                                                                        : mWorld.mLocal.at(name).mModified};
        mWorld.mLocal = local;
        mWorld.mRemote = items;
        mWorld.mCache = expected.mCache;
        for (const std::string& name : expected.mUploaded)
            mWorld.mCache[name].mServerDate = mWorld.mCache[name].mEtag = items.at(name).mEtag;
        for (const std::string& name : expected.mFreshDates) mWorld.mCache[name].mLocalModified = local[name].mModified;
        return true;
    }

private:
    int Pick(int count) { return static_cast<int>(mRandom() % static_cast<std::uint32_t>(count)); }

    std::mt19937 mRandom;
    SyncMetadata_Options mOptions;
    Rig mRig;
    World mWorld;
    int mVersion = 0;
    const FileTime mBaseDate =
        std::chrono::time_point_cast<std::chrono::seconds>(FileTime::clock::now() - std::chrono::hours(24 * 400));
};

TEST(ModelSync, RandomChangesOnBothSidesEndAsTheDecisionTablesSay)
{
    const std::uint32_t seed = Seed();
    const int steps = StepsFor(150);
    // Printed before anything runs: a sanitizer's abort prints no trace.
    std::printf("model seed %u, %d steps\n", seed, steps);
    for (SyncMetadata_Options options : {SyncMetadata_ModDate, SyncMetadata_Checksum}) {
        ModelRun run(seed, options);
        for (int step = 0; step < steps; ++step) {
            const std::string changes = run.Change();
            SCOPED_TRACE("TOLMONETSYNC_MODEL_SEED=" + std::to_string(seed) + ", options " + std::to_string(options) +
                         ", step " + std::to_string(step) + ": " + changes);
            if (!run.SyncAndCompare()) return;
        }
    }
}

}  // namespace
}  // namespace modeltest
