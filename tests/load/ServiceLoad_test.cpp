// Load on the local service: sixteen users, each with a computer of their
// own, sync their own two hundred files at the same moment, then again after
// changes, additions and deletions on every computer (a two-way sync brings
// deleted files back), and then a second computer of each user brings the
// folder back. No sync may fail and no file may be lost; the request rates
// are printed, not judged.

#include <gtest/gtest.h>

#include <chrono>
#include <climits>
#include <cstdio>
#include <map>

#include "support/CliProcess.h"
#include "support/TestService.h"

namespace {

namespace fs = std::filesystem;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
using Contents = std::map<std::string, std::string>;

const int kUsers = 16;
const int kFiles = 200;

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

    // The user's folder on computer "first" or "second".
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

    testsupport::TempDir mRoot;
    testsupport::TestService mService;
    std::shared_ptr<const tolmonetsync::server::FaultHandle> mCounter;
};

TEST_F(ServiceLoad, SixteenUsersSyncTheirOwnFoldersAtOnceAndLoseNothing)
{
    std::vector<Contents> expected(kUsers);
    for (int user = 0; user < kUsers; ++user) {
        fs::create_directories(FolderOf(user));
        for (int i = 0; i < kFiles; ++i)
            WriteFileBytes(FolderOf(user) / ("note" + std::to_string(1000 + i) + ".txt"),
                           "user " + std::to_string(user) + " note " + std::to_string(i));
    }
    SyncAll("first", "first upload, 16 x 200 files");
    for (int user = 0; user < kUsers; ++user) {
        // Twenty changes, five additions and (after the expectation) five
        // deletions, on different files for each user.
        const std::string stamp = "user " + std::to_string(user) + " changed ";
        for (int k = 0; k < 25; ++k) {
            const fs::path file = FolderOf(user) / ("note" + std::to_string(1000 + (user * 11 + k) % kFiles) + ".txt");
            WriteFileBytes(k < 20 ? file : FolderOf(user) / ("added" + std::to_string(k) + ".txt"),
                           stamp + std::to_string(k));
        }
        expected[user] = Folder(FolderOf(user));
        for (int k = 25; k < 30; ++k)
            fs::remove(FolderOf(user) / ("note" + std::to_string(1000 + (user * 11 + k) % kFiles) + ".txt"));
    }
    SyncAll("first", "changes, 16 x 30");
    // Compared whole, not printed: two hundred files each.
    for (int user = 0; user < kUsers; ++user)
        EXPECT_TRUE(Folder(FolderOf(user)) == expected[user]) << "user " << user << "'s folder";
    SyncAll("second", "second computers, 16 x 200 files");
    for (int user = 0; user < kUsers; ++user)
        EXPECT_TRUE(Folder(FolderOf(user, "second")) == expected[user]) << "user " << user << "'s second computer";
}

}  // namespace
