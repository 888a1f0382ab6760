// The command's sync killed with SIGKILL at fifty moments of a sync over a
// thousand files with changes on both sides. After each kill, before
// anything else runs: every file holds its old bytes or its new ones, a
// replaced file's old bytes are in the run's backup directory, the cache
// file is absent or whole; and the next sync converges.

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <climits>
#include <csignal>
#include <cstdio>
#include <map>
#include <random>
#include <thread>

#include <boost/json/parse.hpp>

#include "CliProcess.h"
#include "server/Accounts.h"
#include "server/AssetStore.h"
#include "server/LocalService.h"
#include "server/TreeSeeder.h"
#include "support/TempDir.h"

namespace {

namespace fs = std::filesystem;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
using namespace tolmonetsync::server;

const int kFiles = 1000;
const int kKills = 50;
const int kChangesPerSide = 8;
const char kToken[] = "crash-token";
const char kGroup[] = "Notes";

std::string FileName(int index)
{
    return "f" + std::to_string(1000 + index) + ".txt";
}

// The command's group on the service, read and written behind its back.
class ServiceSide {
public:
    explicit ServiceSide(const fs::path& data)
    {
        LocalServiceOptions options;
        options.mDataDirectory = data.string();
        options.mTokens.push_back({"crash", kToken});
        mService.reset(new LocalService(options));
        mService->Start();
        mOwner = mService->GetAccounts().EnsureUser("crash");
        mSeed.reset(new TreeSeeder(*mService, "crash"));
        // Counts every request; never fires.
        FaultRule counter;
        counter.mPathPattern = ".*";
        counter.mNth = INT_MAX;
        mCounter = mService->Faults().Install(counter);
    }
    ~ServiceSide() { mService->Stop(); }

    std::string Url() const { return mService->AssetServiceUrl(); }
    int Requests() const { return mCounter->Seen(); }

    // Each name's first item, as the client reads them.
    std::map<std::string, std::string> Items()
    {
        const std::string group = GroupId();
        return group.empty() ? std::map<std::string, std::string>() : mSeed->Contents(group);
    }
    // Replaces the item of that name, as another computer's upload would.
    void Put(const std::string& name, const std::string& bytes)
    {
        const std::string group = GroupId();
        AssetStore& store = mService->Assets();
        for (const AssetRecord& member : store.Members(mOwner, group))
            if (member.mName == name) store.Delete(mOwner, member.mId, false);
        mSeed->Item(group, name, bytes);
    }

private:
    // The command's defaults: client "tolmonetsync", host Tolmonet tolmonetsync 1.0.
    std::string GroupId()
    {
        const std::string root = mSeed->Find(mSeed->ClientRoot("tolmonetsync"), "Tolmonet_tolmonetsync_1.0");
        return root.empty() ? std::string() : mSeed->Find(root, kGroup);
    }

    std::unique_ptr<LocalService> mService;
    std::int64_t mOwner = 0;
    std::unique_ptr<TreeSeeder> mSeed;
    std::shared_ptr<const FaultHandle> mCounter;
};

class CrashConsistency : public ::testing::Test {
protected:
    CrashConsistency() : mServer(mRoot / "service"), mFolder(mRoot / "folder"), mPref(mRoot / "pref")
    {
        fs::create_directories(mFolder);
        fs::create_directories(mPref);
    }

    std::vector<std::string> SyncArguments() const
    {
        return {"--server",   mServer.Url(),
                "--token",    kToken,
                "--pref-dir", mPref.string(),
                "-q",         "sync",
                "--dir",      "path=" + mFolder.string() + ",group=" + kGroup + ",ext=.txt"};
    }
    int Sync() const { return clitest::RunCli(SyncArguments()).mStatus; }

    // Starts a sync and kills it once the service has seen `requests` more
    // requests (or when it ends first). True if it was killed.
    bool SyncKilledAfter(int requests, std::chrono::microseconds extra)
    {
        const int start = mServer.Requests();
        const pid_t pid = clitest::StartCli(SyncArguments(), (mRoot / "out").string(), (mRoot / "err").string());
        std::atomic<bool> ended{false};
        std::thread killer([&] {
            while (!ended.load() && mServer.Requests() - start < requests)
                std::this_thread::sleep_for(std::chrono::microseconds(50));
            std::this_thread::sleep_for(extra);
            if (!ended.load()) kill(pid, SIGKILL);
        });
        const int status = clitest::WaitCli(pid);
        ended = true;
        killer.join();
        return status == -1;
    }

    std::map<std::string, std::string> LocalFiles() const
    {
        std::map<std::string, std::string> files;
        for (int i = 0; i < kFiles; ++i) files[FileName(i)] = ReadFileBytes(mFolder / FileName(i));
        return files;
    }
    // The newest backup directory's files by name.
    std::map<std::string, std::string> NewestBackups() const
    {
        std::map<std::string, std::string> backups;
        const fs::path root = mPref / "SyncBackup";
        if (!fs::exists(root)) return backups;
        fs::path newest;
        for (const fs::directory_entry& entry : fs::directory_iterator(root))
            if (newest.empty() || entry.path().filename() > newest.filename()) newest = entry.path();
        for (const fs::directory_entry& entry : fs::directory_iterator(newest))
            backups[entry.path().filename().string()] = ReadFileBytes(entry.path());
        return backups;
    }

    void CheckNothingLost(const std::map<std::string, std::string>& before,
                          const std::map<std::string, std::string>& server, int kill)
    {
        const std::map<std::string, std::string> backups = NewestBackups();
        for (int i = 0; i < kFiles; ++i) {
            const std::string name = FileName(i);
            ASSERT_TRUE(fs::exists(mFolder / name)) << "kill " << kill << ": " << name << " is gone";
            const std::string now = ReadFileBytes(mFolder / name);
            const std::string& old = before.at(name);
            const auto theirs = server.find(name);
            if (now == old) continue;
            ASSERT_TRUE(theirs != server.end() && now == theirs->second)
                << "kill " << kill << ": " << name << " holds neither its old nor its new bytes";
            const auto backup = backups.find(name);
            ASSERT_TRUE(backup != backups.end() && backup->second == old)
                << "kill " << kill << ": " << name << " was replaced without a backup";
        }
        const fs::path cache = mPref / "tolmonetsynccache.json";
        if (fs::exists(cache)) {
            const std::string text = ReadFileBytes(cache);
            ASSERT_FALSE(text.empty()) << "kill " << kill << ": empty cache file";
            boost::system::error_code error;
            boost::json::parse(text, error);
            ASSERT_FALSE(error) << "kill " << kill << ": torn cache file";
        }
        EXPECT_FALSE(fs::exists(mPref / "tarnvaultuser.txt"));  // a token sync never signs anybody in
    }

    testsupport::TempDir mRoot;
    ServiceSide mServer;
    fs::path mFolder;
    fs::path mPref;
};

TEST_F(CrashConsistency, KilledSyncsLoseNothingAndTheNextOneConverges)
{
    for (int i = 0; i < kFiles; ++i) WriteFileBytes(mFolder / FileName(i), "first " + std::to_string(i) + "\n");
    ASSERT_EQ(Sync(), 0);
    // How many requests a whole sync makes, to spread the kills over it.
    const int before = mServer.Requests();
    ASSERT_EQ(Sync(), 0);
    const int perSync = mServer.Requests() - before;
    ASSERT_GT(perSync, kFiles);

    std::mt19937 random(20261124);
    int killed = 0;
    for (int kill = 0; kill < kKills; ++kill) {
        // Changes on both sides, on different files.
        std::vector<int> order(kFiles);
        for (int i = 0; i < kFiles; ++i) order[i] = i;
        std::shuffle(order.begin(), order.end(), random);
        for (int c = 0; c < kChangesPerSide; ++c) {
            WriteFileBytes(mFolder / FileName(order[c]), "local " + std::to_string(kill) + "\n");
            mServer.Put(FileName(order[kChangesPerSide + c]), "server " + std::to_string(kill) + "\n");
        }
        const std::map<std::string, std::string> localBefore = LocalFiles();
        const std::map<std::string, std::string> serverBefore = mServer.Items();

        const int requests = 1 + kill * perSync / kKills;
        killed += SyncKilledAfter(requests, std::chrono::microseconds(random() % 2000)) ? 1 : 0;
        CheckNothingLost(localBefore, serverBefore, kill);
        if (HasFatalFailure()) return;

        ASSERT_EQ(Sync(), 0) << "kill " << kill << ": the next sync failed: " << ReadFileBytes(mRoot / "err");
        const std::map<std::string, std::string> server = mServer.Items();
        const std::map<std::string, std::string> local = LocalFiles();
        for (const auto& file : local)
            ASSERT_EQ(server.count(file.first) ? server.at(file.first) : "<none>", file.second)
                << "kill " << kill << ": " << file.first << " did not converge";
    }
    std::printf(
        "crash consistency: %d kills over syncs of %d files (%d requests each), %d of them inside a run; "
        "after every one nothing was lost and the next sync converged\n",
        kKills, kFiles, perSync, killed);
    // Most kills must land inside a run, or the test proves little.
    EXPECT_GE(killed, kKills * 3 / 4);
}

}  // namespace
