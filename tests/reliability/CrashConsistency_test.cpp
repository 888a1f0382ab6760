// The command's sync killed with SIGKILL at fifty moments of a sync over a
// thousand files with changes on both sides. After each kill, before
// anything else runs: every file holds its old bytes or its new ones, a
// replaced file's old bytes are in a backup directory of the run, the cache
// file is absent or whole; and the next sync converges.

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <csignal>
#include <cstdio>
#include <numeric>
#include <random>
#include <thread>

#include <boost/json/parse.hpp>

#include "ServiceStage.h"
#include "support/CliProcess.h"

namespace {

namespace fs = std::filesystem;
using namespace reliability;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;

const int kFiles = 1000;
const int kKills = 50;
const int kChangesPerSide = 8;

std::string FileName(int index)
{
    return "f" + std::to_string(1000 + index) + ".txt";
}

class CrashConsistency : public ::testing::Test {
protected:
    // The command as the stage's host and client, on its Keep folder.
    std::vector<std::string> SyncArguments()
    {
        const std::string server = mStage.Service().AssetServiceUrl(), pref = mStage.PrefDir().string();
        const std::string keep = "path=" + mStage.Keep().string() + ",group=Keep,ext=.txt";
        return {"--server",      server, "--token",     testsupport::kAliceToken,
                "--pref-dir",    pref,   "--client-id", mStage.ClientId(),
                "--company",     "Co",   "--app",       "Matrix",
                "--app-version", "1.0",  "-q",          "sync",
                "--dir",         keep};
    }

    // Starts a sync and kills it once the service has seen `requests` more
    // requests and `extra` has passed (unless it ended first). True if killed.
    bool SyncKilledAfter(int requests, std::chrono::microseconds extra)
    {
        const int start = mCounter->Seen();
        const pid_t pid = clitest::StartCli(SyncArguments(), (mOutputs / "out").string(), (mOutputs / "err").string());
        std::atomic<bool> ended{false};
        std::thread killer([&] {
            while (!ended.load() && mCounter->Seen() - start < requests)
                std::this_thread::sleep_for(std::chrono::microseconds(50));
            std::this_thread::sleep_for(extra);
            if (!ended.load()) kill(pid, SIGKILL);
        });
        const int status = clitest::WaitCli(pid);
        ended = true;
        killer.join();
        return status == -1;
    }

    testsupport::TestService mService;
    Stage mStage{mService, "matrix"};
    testsupport::TempDir mOutputs;
    const std::shared_ptr<const tolmonetsync::server::FaultHandle> mCounter = testsupport::CountRequests(*mService);
};

TEST_F(CrashConsistency, KilledSyncsLoseNothingAndTheNextOneConverges)
{
    for (int i = 0; i < kFiles; ++i) WriteFileBytes(mStage.Keep() / FileName(i), "first " + std::to_string(i) + "\n");
    ASSERT_EQ(clitest::RunCli(SyncArguments()).mStatus, 0);
    // How many requests a whole sync makes, to spread the kills over it.
    const int before = mCounter->Seen();
    ASSERT_EQ(clitest::RunCli(SyncArguments()).mStatus, 0);
    const int perSync = mCounter->Seen() - before;
    ASSERT_GT(perSync, kFiles);

    std::mt19937 random(20261124);
    int killed = 0;
    for (int kill = 0; kill < kKills; ++kill) {
        const std::string label = "kill " + std::to_string(kill);
        // Changes on both sides, on different files.
        std::vector<int> order(kFiles);
        std::iota(order.begin(), order.end(), 0);
        std::shuffle(order.begin(), order.end(), random);
        for (int c = 0; c < kChangesPerSide; ++c) {
            WriteFileBytes(mStage.Keep() / FileName(order[c]), "local " + std::to_string(kill) + "\n");
            mStage.PutOnServer("Keep", FileName(order[kChangesPerSide + c]), "server " + std::to_string(kill) + "\n");
        }
        const FileMap localBefore = mStage.Local();
        const FileMap serverBefore = mStage.Server();
        const std::set<std::string> earlierBackups = mStage.BackupDirs();

        killed += SyncKilledAfter(1 + kill * perSync / kKills, std::chrono::microseconds(random() % 2000)) ? 1 : 0;
        ExpectNothingLost(localBefore, serverBefore, mStage.Local(), mStage.Backups(earlierBackups), label);
        const std::string cache = mStage.CacheFile();
        if (cache != "<none>") {
            boost::system::error_code error;
            boost::json::parse(cache, error);
            EXPECT_FALSE(error) << label << ": torn cache file";
        }
        EXPECT_FALSE(fs::exists(mStage.PrefDir() / "tarnvaultuser.txt"));  // a token sync signs nobody in
        if (HasFailure()) return;

        const clitest::Finished next = clitest::RunCli(SyncArguments());
        ASSERT_EQ(next.mStatus, 0) << label << ": the next sync failed: " << next.mErr;
        ASSERT_EQ(mStage.Local(), mStage.Server()) << label << ": no convergence";
    }
    std::printf("crash consistency: %d kills over syncs of %d files (%d requests each), %d inside a run\n", kKills,
                kFiles, perSync, killed);
    // Most kills must land inside a run, or the test proves little.
    EXPECT_GE(killed, kKills * 3 / 4);
}

}  // namespace
