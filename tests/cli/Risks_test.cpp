// What `tolmonetsync sync` says before anything moves and what it refuses:
// the risks of real two-computer histories, the opt-in limits, the plan in
// short. The service runs in this process so that a test can date the
// server's versions as another computer's clock would.

#include <gtest/gtest.h>

#include <set>

#include <boost/json/parse.hpp>

#include "server/Accounts.h"
#include "server/AssetStore.h"
#include "server/TreeSeeder.h"
#include "support/CliProcess.h"
#include "support/TempDir.h"
#include "support/TestService.h"

namespace {

namespace fs = std::filesystem;
using clitest::Contains;
using clitest::Finished;
using testsupport::WriteFileBytes;

const char kClientId[] = "risks";

class SyncRisksCommand : public ::testing::Test {
protected:
    struct Computer {
        fs::path mFolder, mPref;
    };

    Computer Make(const std::string& name, const std::map<std::string, std::string>& files = {})
    {
        const Computer computer{mRoot / name / "folder", mRoot / name / "pref"};
        fs::create_directories(computer.mFolder);
        for (const auto& [file, bytes] : files) Write(computer, file, bytes);
        return computer;
    }
    static void Write(const Computer& computer, const std::string& name, const std::string& bytes)
    {
        WriteFileBytes(computer.mFolder / name, bytes);
    }
    Finished Sync(const Computer& computer, std::vector<std::string> options, const std::string& group = "Notes")
    {
        const std::string dir = "path=" + computer.mFolder.string() + ",group=" + group + ",ext=.txt";
        std::vector<std::string> arguments = {"--server", mService->AssetServiceUrl(), "--pref-dir",
                                              computer.mPref.string()};
        arguments.insert(arguments.end(), {"--client-id", kClientId, "sync", "--dir", dir});
        arguments.insert(arguments.end(), options.begin(), options.end());
        return clitest::RunCli(arguments, {std::string("TOLMONETSYNC_TOKEN=") + testsupport::kAliceToken});
    }
    // Another computer syncs the group "Stale" (two items) beside "Notes".
    int SyncStaleGroup()
    {
        const Computer other = Make("other", {{"x.txt", "x"}, {"y.txt", "y"}});
        fs::create_directories(mRoot / "other" / "notes");
        const std::string notes = "path=" + (mRoot / "other" / "notes").string() + ",group=Notes,ext=.txt";
        return Sync(other, {"--dir", notes}, "Stale").mStatus;
    }
    // Every asset under the client root: path, tag and date.
    std::string Store()
    {
        std::string state;
        Walk(tolmonetsync::server::TreeSeeder(*mService, "alice").ClientRoot(kClientId), "",
             [&](const auto& asset, const std::string& path) {
                 state += path + " " + asset.mEtag + " " + std::to_string(asset.mModified) + "\n";
             });
        return state;
    }
    // Dates every item a second apart in 2020, as another computer's clock would.
    void RedateItems()
    {
        std::int64_t second = 1577836800;
        Walk(tolmonetsync::server::TreeSeeder(*mService, "alice").ClientRoot(kClientId), "",
             [&](const auto& asset, const std::string&) {
                 if (!asset.mCollection) mService->Assets().SetModified(mOwner, asset.mId, ++second * 1000000);
             });
    }
    template <typename Visit>
    void Walk(const std::string& id, const std::string& prefix, const Visit& visit)
    {
        for (const auto& asset : mService->Assets().Members(mOwner, id)) {
            visit(asset, prefix + asset.mName);
            if (asset.mCollection) Walk(asset.mId, prefix + asset.mName + "/", visit);
        }
    }

    testsupport::TempDir mRoot;
    testsupport::TestService mService;
    const std::int64_t mOwner = mService->GetAccounts().EnsureUser("alice");
};

// "KIND NAME" of each risk in a --json answer.
std::set<std::string> RisksIn(const Finished& run)
{
    std::set<std::string> risks;
    const boost::json::value answer = boost::json::parse(run.mOut);
    for (const auto& risk : answer.at("plan").at("risks").as_array())
        risks.insert(std::string(risk.at("kind").as_string()) + " " + std::string(risk.at("name").as_string()));
    return risks;
}

TEST_F(SyncRisksCommand, ThePlanNamesTheRisksOfTwoComputerHistories)
{
    const Computer laptop = Make("laptop", {{"changed.txt", "c1"}, {"deleted.txt", "d1"}, {"newer.txt", "n1"}});
    const Computer desktop = Make("desktop");
    ASSERT_EQ(Sync(laptop, {}).mStatus, 0);
    RedateItems();
    ASSERT_EQ(Sync(desktop, {}).mStatus, 0);
    // The laptop changes two files and adds one; another computer syncs a
    // group this one does not name.
    Write(laptop, "changed.txt", "c laptop");
    Write(laptop, "newer.txt", "n laptop");
    Write(laptop, "both.txt", "b laptop");
    ASSERT_EQ(Sync(laptop, {}).mStatus, 0);
    ASSERT_EQ(SyncStaleGroup(), 0);
    // The desktop changes the same file, deletes one, makes its own both.txt.
    Write(desktop, "changed.txt", "c desktop");
    fs::remove(desktop.mFolder / "deleted.txt");
    Write(desktop, "both.txt", "b desktop");
    Write(desktop, "mine.txt", "only here");

    const struct {
        const char* mMode;
        std::set<std::string> mRisks;
    } rows[] = {
        {"two-way",
         {"conflict Notes/changed.txt", "restore-deleted Notes/deleted.txt", "first-sync-overwrite Notes/both.txt",
          "group-delete Stale"}},
        {"local-wins",
         {"conflict Notes/changed.txt", "conflict Notes/newer.txt", "first-sync-overwrite Notes/both.txt",
          "group-delete Stale"}},
        {"server-wins", {"local-delete Notes/mine.txt", "group-delete Stale"}},
    };
    for (const auto& row : rows) {
        const Finished planned = Sync(desktop, {"--dry-run", "--json", "--mode", row.mMode});
        ASSERT_EQ(planned.mStatus, 0) << planned.mErr;
        EXPECT_EQ(RisksIn(planned), row.mRisks) << row.mMode;
    }
    const Finished text = Sync(desktop, {"--dry-run"});
    EXPECT_TRUE(Contains(text.mOut, "upload    Notes/changed.txt: changed locally [risk conflict: the server's"))
        << text.mOut;
    EXPECT_TRUE(Contains(text.mOut,
                         "with everything in it: no registration names it [risk group-delete: deleted on "
                         "the server with its 2 item(s)]"));
    // Only asked about: the server may or may not have a newer version.
    EXPECT_TRUE(Contains(text.mOut, "check     Notes/newer.txt: unchanged locally")) << text.mOut;

    // The fingerprint beside the cache file names the preferences root.
    const Finished foreign = Sync(desktop, {"--dry-run", "--json", "--app-version", "2.0"});
    EXPECT_EQ(RisksIn(foreign).count("foreign-cache "), 1u) << foreign.mOut;
    EXPECT_TRUE(Contains(testsupport::ReadFileBytes(desktop.mPref / "tolmonetsynccache.fingerprint"),
                         mService->AssetServiceUrl()));
}

TEST_F(SyncRisksCommand, ASyncOverALimitChangesNothingOnEitherSide)
{
    const Computer laptop = Make("laptop", {{"a.txt", "a1"}, {"b.txt", "b1"}});
    ASSERT_EQ(Sync(laptop, {}).mStatus, 0);
    ASSERT_EQ(SyncStaleGroup(), 0);
    Write(laptop, "a.txt", "a2");
    Write(laptop, "extra.txt", "only here");

    const struct {
        std::vector<std::string> mOptions;
        const char* mRefusal;  // nullptr: within the limits
    } rows[] = {
        // The two items of the pruned group count: the prepare deletes it.
        {{"--prune-groups", "--max-delete", "1"}, "max-delete 1: this sync would delete 2 ("},
        {{"--mode", "server-wins", "--max-delete", "2"}, "max-delete 2: this sync would delete 3 ("},
        {{"--max-overwrite", "0"}, "max-overwrite 0: this sync would overwrite 1 ("},
        {{"--prune-groups", "--max-delete", "2", "--max-overwrite", "1"}, nullptr},
    };
    for (const auto& row : rows) {
        const auto localBefore = testsupport::Snapshot(mRoot / "laptop", true);
        const std::string serverBefore = Store();
        const Finished run = Sync(laptop, row.mOptions);
        if (row.mRefusal == nullptr) {
            EXPECT_EQ(run.mStatus, 0) << run.mErr;
            EXPECT_FALSE(Contains(Store(), "Stale"));
            continue;
        }
        EXPECT_EQ(run.mStatus, 1) << row.mRefusal;
        EXPECT_EQ(run.mErr.rfind(std::string("tolmonetsync sync: over the limit ") + row.mRefusal, 0), 0u) << run.mErr;
        EXPECT_EQ(std::count(run.mErr.begin(), run.mErr.end(), '\n'), 1);
        EXPECT_EQ(testsupport::Snapshot(mRoot / "laptop", true), localBefore) << row.mRefusal;
        EXPECT_EQ(Store(), serverBefore) << row.mRefusal;
    }
}

TEST_F(SyncRisksCommand, ALongPlanIsShortUnlessEveryFileIsAsked)
{
    std::map<std::string, std::string> files;
    for (int i = 0; i < 45; ++i) files["n" + std::to_string(10 + i) + ".txt"] = std::to_string(i);
    ASSERT_EQ(Sync(Make("laptop", files), {}).mStatus, 0);
    const Computer desktop = Make("desktop", {{"n17.txt", "mine"}});

    const Finished brief = Sync(desktop, {"--dry-run"});
    ASSERT_EQ(brief.mStatus, 0) << brief.mErr;
    EXPECT_TRUE(Contains(brief.mOut, "44 download, 1 upload")) << brief.mOut;
    EXPECT_TRUE(Contains(brief.mOut, "upload    Notes/n17.txt: no earlier sync")) << brief.mOut;
    EXPECT_FALSE(Contains(brief.mOut, "Notes/n18.txt"));
    EXPECT_LT(std::count(brief.mOut.begin(), brief.mOut.end(), '\n'), 5);

    const Finished every = Sync(desktop, {"--dry-run", "-v"});
    EXPECT_TRUE(Contains(every.mOut, "download  Notes/n18.txt: missing locally")) << every.mOut;
    EXPECT_EQ(std::count(every.mOut.begin(), every.mOut.end(), '\n'), 45);
}

}  // namespace
