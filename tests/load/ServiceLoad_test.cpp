// Load on the local service: sixteen users, each with a computer of their
// own, sync their own two hundred files at the same moment, round after round
// with changes, and then a second computer of each user brings the folder
// back. Deleted files come back too, as two-way syncs bring them.
// No request may fail and no file may be lost; the request rates are printed, not judged.

#include <gtest/gtest.h>

#include <chrono>
#include <climits>
#include <cstdio>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "CliProcess.h"
#include "server/LocalService.h"
#include "server/TreeSeeder.h"
#include "support/TempDir.h"

namespace {

namespace fs = std::filesystem;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
using namespace tolmonetsync::server;

const int kComputers = 16;
const int kFiles = 200;
const int kRounds = 3;
const int kChangesPerRound = 20;
const int kDeletesPerRound = 5;
const int kAdditionsPerRound = 5;
const char kGroup[] = "Load";

using Contents = std::map<std::string, std::string>;

// The files of a folder by name.
Contents FolderContents(const fs::path& folder)
{
    Contents contents;
    for (const fs::directory_entry& entry : fs::directory_iterator(folder))
        if (entry.is_regular_file()) contents[entry.path().filename().string()] = ReadFileBytes(entry.path());
    return contents;
}

// One computer: its user's token, a folder and a preference directory.
struct Computer {
    std::string mUser;
    std::string mToken;
    fs::path mFolder;
    fs::path mPref;
};

class ServiceLoad : public ::testing::Test {
protected:
    ServiceLoad()
    {
        LocalServiceOptions options;
        options.mDataDirectory = (mRoot / "service").string();
        for (int i = 0; i < kComputers; ++i) {
            Computer computer{"user" + std::to_string(i), "load-token-" + std::to_string(i),
                              mRoot / ("folder" + std::to_string(i)), mRoot / ("pref" + std::to_string(i))};
            options.mTokens.push_back({computer.mUser, computer.mToken});
            mComputers.push_back(computer);
        }
        mService.reset(new LocalService(options));
        mService->Start();
        FaultRule counter;  // counts every request, never fires
        counter.mPathPattern = ".*";
        counter.mNth = INT_MAX;
        mCounter = mService->Faults().Install(counter);
    }
    ~ServiceLoad() override { mService->Stop(); }

    static void MakeComputer(const Computer& computer)
    {
        fs::create_directories(computer.mFolder);
        fs::create_directories(computer.mPref);
    }

    // Every computer syncs at once; each must succeed. Returns requests per second.
    double SyncAll(const std::vector<Computer>& computers, const std::string& what)
    {
        const int requestsBefore = mCounter->Seen();
        const auto start = std::chrono::steady_clock::now();
        std::vector<pid_t> running;
        for (std::size_t i = 0; i < computers.size(); ++i) {
            const Computer& computer = computers[i];
            running.push_back(
                clitest::StartCli({"--server", mService->AssetServiceUrl(), "--token", computer.mToken, "--pref-dir",
                                   computer.mPref.string(), "-q", "sync", "--dir",
                                   "path=" + computer.mFolder.string() + ",group=" + kGroup + ",ext=.txt"},
                                  OutputPath(i, "out"), OutputPath(i, "err")));
        }
        for (std::size_t i = 0; i < running.size(); ++i)
            EXPECT_EQ(clitest::WaitCli(running[i]), 0)
                << what << ": " << computers[i].mUser << " failed: " << ReadFileBytes(OutputPath(i, "err"));
        const double seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
        const int requests = mCounter->Seen() - requestsBefore;
        std::printf("%-34s %6d requests in %6.2f s: %7.0f requests/s\n", what.c_str(), requests, seconds,
                    requests / seconds);
        return requests / seconds;
    }

    // The user's group on the service: each name's item and its bytes.
    Contents ServerContents(const Computer& computer)
    {
        TreeSeeder seed(*mService, computer.mUser);
        // The command's defaults: client "tolmonetsync", host Tolmonet tolmonetsync 1.0.
        const std::string root = seed.Find(seed.ClientRoot("tolmonetsync"), "Tolmonet_tolmonetsync_1.0");
        const std::string group = root.empty() ? std::string() : seed.Find(root, kGroup);
        return group.empty() ? Contents() : seed.Contents(group);
    }

    // Each folder holds what is expected of it, and its user's group the same.
    void ExpectFolders(const std::vector<Contents>& expected, const std::string& when)
    {
        for (std::size_t c = 0; c < mComputers.size(); ++c) {
            EXPECT_TRUE(FolderContents(mComputers[c].mFolder) == expected[c])
                << when << ": " << mComputers[c].mUser << "'s folder is not as expected";
            EXPECT_TRUE(ServerContents(mComputers[c]) == expected[c])
                << when << ": the service does not hold " << mComputers[c].mUser << "'s folder";
        }
    }

    std::string OutputPath(std::size_t computer, const char* stream) const
    {
        return (mRoot / (std::string(stream) + std::to_string(computer))).string();
    }

    testsupport::TempDir mRoot;
    std::vector<Computer> mComputers;
    std::unique_ptr<LocalService> mService;
    std::shared_ptr<const FaultHandle> mCounter;
};

std::string FileName(int index)
{
    return "note" + std::to_string(1000 + index) + ".txt";
}

TEST_F(ServiceLoad, SixteenUsersSyncTheirOwnFoldersAtOnceRoundAfterRoundAndLoseNothing)
{
    std::vector<Contents> expected(mComputers.size());
    for (std::size_t c = 0; c < mComputers.size(); ++c) {
        MakeComputer(mComputers[c]);
        for (int i = 0; i < kFiles; ++i)
            WriteFileBytes(mComputers[c].mFolder / FileName(i),
                           mComputers[c].mUser + " first " + std::to_string(i) + "\n");
        expected[c] = FolderContents(mComputers[c].mFolder);
    }
    SyncAll(mComputers, "first upload, 16 x 200 files");
    ExpectFolders(expected, "after the first upload");

    for (int round = 1; round <= kRounds; ++round) {
        for (std::size_t c = 0; c < mComputers.size(); ++c) {
            const Computer& computer = mComputers[c];
            std::vector<fs::path> files;
            for (const fs::directory_entry& entry : fs::directory_iterator(computer.mFolder))
                files.push_back(entry.path());
            std::sort(files.begin(), files.end());
            // Different files each round and on each computer.
            const std::size_t offset = (round * 37 + c * 11) % files.size();
            for (int k = 0; k < kChangesPerRound; ++k)
                WriteFileBytes(files[(offset + k) % files.size()], computer.mUser + " round " + std::to_string(round) +
                                                                       " change " + std::to_string(k) + "\n");
            for (int k = 0; k < kAdditionsPerRound; ++k)
                WriteFileBytes(computer.mFolder / ("added-" + std::to_string(round) + "-" + std::to_string(k) + ".txt"),
                               computer.mUser + " added in round " + std::to_string(round) + "\n");
            expected[c] = FolderContents(computer.mFolder);
            // In two-way mode a file deleted here comes back from the service.
            for (int k = 0; k < kDeletesPerRound; ++k)
                fs::remove(files[(offset + kChangesPerRound + k) % files.size()]);
        }
        SyncAll(mComputers, "round " + std::to_string(round) + ", 30 changes each");
        ExpectFolders(expected, "after round " + std::to_string(round));
        if (HasFailure()) return;
    }

    // A second computer of every user, with nothing yet, brings the folder back.
    std::vector<Computer> second;
    for (std::size_t c = 0; c < mComputers.size(); ++c) {
        Computer computer = mComputers[c];
        computer.mFolder = mRoot / ("second-folder" + std::to_string(c));
        computer.mPref = mRoot / ("second-pref" + std::to_string(c));
        MakeComputer(computer);
        second.push_back(computer);
    }
    SyncAll(second, "second computers, 16 x 200 files");
    for (std::size_t c = 0; c < mComputers.size(); ++c)
        EXPECT_TRUE(FolderContents(second[c].mFolder) == FolderContents(mComputers[c].mFolder))
            << mComputers[c].mUser << "'s second computer does not hold the folder";
}

}  // namespace
