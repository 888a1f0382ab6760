// Load on the local service: sixteen users, each with a computer of their
// own, sync their own two hundred files at the same moment, round after round
// with changes, and then a second computer of each user brings the folder
// back. Deleted files come back too, as two-way syncs bring them.
// No request may fail and no file may be lost; the request rates are printed, not judged.

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <climits>
#include <cstdio>
#include <map>

#include "server/TreeSeeder.h"
#include "support/CliProcess.h"
#include "support/TestService.h"

namespace {

namespace fs = std::filesystem;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
using Contents = std::map<std::string, std::string>;

const int kUsers = 16;
const int kFiles = 200;
const int kRounds = 3;
const int kChanges = 20;  // and a quarter as many additions and deletions

// The files of a folder by name.
Contents Folder(const fs::path& folder)
{
    Contents contents;
    for (const fs::directory_entry& entry : fs::directory_iterator(folder))
        contents[entry.path().filename().string()] = ReadFileBytes(entry.path());
    return contents;
}

class ServiceLoad : public ::testing::Test {
protected:
    ServiceLoad()
        : mService([](tolmonetsync::server::LocalServiceOptions& options) {
              for (int user = 0; user < kUsers; ++user)
                  options.mTokens.push_back({"user" + std::to_string(user), "token-" + std::to_string(user)});
          })
    {
        tolmonetsync::server::FaultRule counter;  // counts every request, never fires
        counter.mPathPattern = ".*";
        counter.mNth = INT_MAX;
        mCounter = mService->Faults().Install(counter);
    }

    // The user's folder on their first or second computer.
    fs::path FolderOf(int user, const std::string& computer = "first") const
    {
        return mRoot / (computer + "-folder" + std::to_string(user));
    }

    // Every user's `computer` syncs at once; each must succeed.
    void SyncAll(const std::string& computer, const std::string& what)
    {
        const int requestsBefore = mCounter->Seen();
        const auto start = std::chrono::steady_clock::now();
        std::vector<pid_t> running;
        for (int user = 0; user < kUsers; ++user) {
            const std::string pref = (mRoot / (computer + "-pref" + std::to_string(user))).string();
            fs::create_directories(FolderOf(user, computer));
            running.push_back(clitest::StartCli(
                {"--server", mService->AssetServiceUrl(), "--token", "token-" + std::to_string(user), "--pref-dir",
                 pref, "-q", "sync", "--dir", "path=" + FolderOf(user, computer).string() + ",group=Load,ext=.txt"},
                "/dev/null", pref + ".err"));
        }
        for (int user = 0; user < kUsers; ++user)
            EXPECT_EQ(clitest::WaitCli(running[user]), 0)
                << what << ": user " << user
                << " failed: " << ReadFileBytes(mRoot / (computer + "-pref" + std::to_string(user) + ".err"));
        const double seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
        const int requests = mCounter->Seen() - requestsBefore;
        std::printf("%-34s %6d requests in %6.2f s: %7.0f requests/s\n", what.c_str(), requests, seconds,
                    requests / seconds);
    }

    // The user's group on the service, as the command's defaults name it.
    Contents ServerContents(int user)
    {
        tolmonetsync::server::TreeSeeder seed(*mService, "user" + std::to_string(user));
        const std::string root = seed.Find(seed.ClientRoot("tolmonetsync"), "Tolmonet_tolmonetsync_1.0");
        const std::string group = root.empty() ? std::string() : seed.Find(root, "Load");
        return group.empty() ? Contents() : seed.Contents(group);
    }

    testsupport::TempDir mRoot;
    testsupport::TestService mService;
    std::shared_ptr<const tolmonetsync::server::FaultHandle> mCounter;
};

TEST_F(ServiceLoad, SixteenUsersSyncTheirOwnFoldersAtOnceRoundAfterRoundAndLoseNothing)
{
    std::vector<Contents> expected(kUsers);
    for (int round = 0; round <= kRounds; ++round) {
        for (int user = 0; user < kUsers; ++user) {
            const fs::path folder = FolderOf(user);
            const std::string stamp = "user " + std::to_string(user) + " round " + std::to_string(round) + " ";
            fs::create_directories(folder);
            std::vector<fs::path> files;
            for (int i = 0; i < kFiles && round == 0; ++i)
                WriteFileBytes(folder / ("note" + std::to_string(1000 + i) + ".txt"), stamp + std::to_string(i));
            for (const fs::directory_entry& entry : fs::directory_iterator(folder)) files.push_back(entry.path());
            std::sort(files.begin(), files.end());
            // Different files each round and for each user.
            const std::size_t offset = (round * 37 + user * 11) % files.size();
            for (int k = 0; k < kChanges && round > 0; ++k)
                WriteFileBytes(files[(offset + k) % files.size()], stamp + "change " + std::to_string(k));
            for (int k = 0; k < kChanges / 4 && round > 0; ++k)
                WriteFileBytes(folder / ("added-" + std::to_string(round) + "-" + std::to_string(k) + ".txt"), stamp);
            expected[user] = Folder(folder);
            // In two-way mode a file deleted here comes back from the service.
            for (int k = 0; k < kChanges / 4 && round > 0; ++k)
                fs::remove(files[(offset + kChanges + k) % files.size()]);
        }
        const std::string what = round == 0 ? "first upload" : "round " + std::to_string(round);
        SyncAll("first", what + ", 16 x 200 files");
        // Compared whole, not printed: two hundred files each.
        for (int user = 0; user < kUsers; ++user) {
            EXPECT_TRUE(Folder(FolderOf(user)) == expected[user]) << what << ": user " << user << "'s folder";
            EXPECT_TRUE(ServerContents(user) == expected[user]) << what << ": user " << user << "'s group";
        }
        if (HasFailure()) return;
    }
    // A second computer of every user, with nothing yet, brings the folder back.
    SyncAll("second", "second computers, 16 x 200 files");
    for (int user = 0; user < kUsers; ++user)
        EXPECT_TRUE(Folder(FolderOf(user, "second")) == expected[user]) << "user " << user << "'s second computer";
}

}  // namespace
