// Random changes on both sides of a registered folder, each round followed
// by a sync in a random mode whose effect on the folder, the server's group
// and the run's backups is compared with DecisionModel.
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
#include "server/Accounts.h"
#include "server/AssetStore.h"
#include "server/TreeSeeder.h"
#include "support/HostClient.h"
#include "support/SyncHarness.h"
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

// A number from the environment, or the fallback; "random" draws one.
std::uint32_t Setting(const char* name, std::uint32_t fallback)
{
    const char* text = std::getenv(name);
    if (text == nullptr) return fallback;
    return std::string(text) == "random" ? std::random_device()() : static_cast<std::uint32_t>(std::stoul(text));
}

// The host's folder and preference directory, the service, the second
// computer, which changes the group straight in the service's store, and
// the model of them all.
class ModelRun {
public:
    ModelRun(std::uint32_t seed, SyncMetadata_Options options)
        : mOwner(mService->GetAccounts().EnsureUser("alice")),
          mSeeder(*mService, "alice"),
          mRandom(seed),
          mOptions(options)
    {
        fs::create_directories(Folder());
    }

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
                    // Earlier dates too: a change is seen by a different date, not a later one.
                    said << "local touch " << name << "; ";
                    local->second.mModified = Pick(2) == 0 ? date : mBaseDate - std::chrono::seconds(mVersion);
                } else {
                    said << "local delete " << name << "; ";
                    fs::remove(Folder() / name);
                    mWorld.mLocal.erase(local);
                    continue;
                }
                testsupport::WriteFileBytes(Folder() / name, mWorld.mLocal[name].mBytes);
                fs::last_write_time(Folder() / name, mWorld.mLocal[name].mModified);
            } else if (mWorld.mRemote.count(name) != 0 && Pick(2) == 0) {
                said << "remote delete " << name << "; ";
                DeleteRemote(name);
                mWorld.mRemote.erase(name);
            } else {
                said << "remote write " << name << "; ";
                mWorld.mRemote[name] = {bytes, PutRemote(name, bytes, kRemoteBaseDate + mVersion)};
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
        const synctest::RunResult result = Sync(mode);
        EXPECT_TRUE(result.Ok()) << result.mError;
        EXPECT_EQ(result.mMoved, static_cast<int>(expected.mUploaded.size() + expected.mDownloaded.size()));
        EXPECT_EQ(testsupport::Snapshot(Folder()), expected.mLocal);
        const std::map<std::string, RemoteItem> items = Items();
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
        EXPECT_EQ(NewBackups(), expected.mBackups);
        if (::testing::Test::HasFailure()) return false;

        // The world now is what the model said, with what only the sync
        // could tell: new tags and the dates of downloaded files.
        std::map<std::string, LocalFile> local;
        for (const auto& [name, bytes] : expected.mLocal)
            local[name] = {bytes, expected.mDownloaded.count(name) != 0 ? fs::last_write_time(Folder() / name)
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
    fs::path Folder() const { return mDesk.Path() / kGroup; }

    synctest::RunResult Sync(SyncMode mode)
    {
        synctest::SyncHarness host(boost::shared_ptr<SyncServer>(new tarnvault::Tarnvault(
            testsupport::Parameters(mService->AssetServiceUrl(), testsupport::kAliceToken, kClientId))));
        host.Service().RegisterSyncDirectory(SyncDir(Dir(tolmocore::utility::ToUTF16(Folder().string())), u".txt",
                                                     u"Presets", ImmutableString::CreateStatic(kMediaType), mOptions,
                                                     1 << 20));
        return host.Sync(mode);
    }

    // The group's items by name; a second item of one name is a fault.
    std::map<std::string, RemoteItem> Items()
    {
        std::map<std::string, RemoteItem> items;
        for (const AssetRecord& member : mService->Assets().Members(mOwner, Group(false))) {
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
        mService->Assets().SetModified(mOwner, item.mId, secondsSince1970 * 1000000);
        return item.mEtag;
    }

    void DeleteRemote(const std::string& name)
    {
        const std::string group = Group(false);
        const std::string id = group.empty() ? std::string() : mSeeder.Find(group, name);
        if (!id.empty()) mService->Assets().Delete(mOwner, id, false);
    }

    // The copies in backup runs not seen before, by name.
    Contents NewBackups()
    {
        Contents copies;
        for (const auto& run : fs::directory_iterator(mPrefs.Path() / "SyncBackup"))
            if (run.is_directory() && mSeenRuns.insert(run.path()).second)
                copies.merge(testsupport::Snapshot(run.path()));
        return copies;
    }

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

    int Pick(int count) { return static_cast<int>(mRandom() % static_cast<std::uint32_t>(count)); }

    testsupport::PrefDirScope mPrefs;
    testsupport::TempDir mDesk;
    testsupport::TestService mService;
    std::int64_t mOwner;
    server::TreeSeeder mSeeder;
    std::set<fs::path> mSeenRuns;
    std::mt19937 mRandom;
    SyncMetadata_Options mOptions;
    World mWorld;
    int mVersion = 0;
    const FileTime mBaseDate =
        std::chrono::time_point_cast<std::chrono::seconds>(FileTime::clock::now() - std::chrono::hours(24 * 400));
};

TEST(ModelSync, RandomChangesOnBothSidesEndAsTheDecisionTablesSay)
{
    const std::uint32_t seed = Setting("TOLMONETSYNC_MODEL_SEED", 20261125);
    const std::uint32_t steps = Setting("TOLMONETSYNC_MODEL_STEPS", 150);
    // Printed before anything runs: a sanitizer's abort prints no trace.
    std::printf("model seed %u, %u steps\n", seed, steps);
    for (SyncMetadata_Options options : {SyncMetadata_ModDate, SyncMetadata_Checksum}) {
        ModelRun run(seed, options);
        for (std::uint32_t step = 0; step < steps; ++step) {
            const std::string changes = run.Change();
            SCOPED_TRACE("TOLMONETSYNC_MODEL_SEED=" + std::to_string(seed) + ", options " + std::to_string(options) +
                         ", step " + std::to_string(step) + ": " + changes);
            if (!run.SyncAndCompare()) return;
        }
    }
}

}  // namespace
}  // namespace modeltest
