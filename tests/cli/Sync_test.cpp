// `tolmonetsync sync` run as a process against `tolmonetsync serve`: what it
// does to the disk, the cache file, the backups and the service, what it
// prints, and how it refuses.

#include <gtest/gtest.h>

#include <sys/file.h>

#include <fcntl.h>
#include <unistd.h>

#include <map>

#include <boost/json/parse.hpp>

#include "support/CliProcess.h"
#include "support/TempDir.h"

namespace {

namespace fs = std::filesystem;
using clitest::Contains;
using clitest::Finished;
using clitest::RunCli;
using testsupport::WriteFileBytes;

const char kToken[] = "cli-test-token";

// One computer of the test user: a folder of ".txt" files and a preference
// directory, synced through the command.
class Computer {
public:
    Computer(const fs::path& root, const std::string& name)
        : mFolder(root / name / "folder"), mPref(root / name / "pref")
    {
        fs::create_directories(mFolder);  // the command makes the preference directory
    }

    Finished Sync(const clitest::ServedService& service, std::vector<std::string> options = {},
                  const std::string& group = "Notes") const
    {
        std::vector<std::string> arguments = {"--server", service.ApiUrl(), "--pref-dir", mPref.string(), "sync"};
        arguments.insert(arguments.end(), options.begin(), options.end());
        arguments.insert(arguments.end(), {"--dir", DirSpec(group)});
        return RunCli(arguments, {std::string("TOLMONETSYNC_TOKEN=") + kToken});
    }
    std::string DirSpec(const std::string& group = "Notes") const
    {
        return "path=" + mFolder.string() + ",group=" + group + ",ext=.txt";
    }
    void Write(const std::string& name, const std::string& bytes) const { WriteFileBytes(mFolder / name, bytes); }
    std::string Read(const std::string& name) const { return testsupport::ReadFileBytes(mFolder / name); }
    // `backups` or `restore` on this computer's preference directory.
    Finished Backups(std::vector<std::string> arguments) const
    {
        arguments.insert(arguments.begin(), {"--pref-dir", mPref.string()});
        return RunCli(arguments);
    }

    fs::path mFolder;
    fs::path mPref;
};

class SyncCommand : public ::testing::Test {
protected:
    SyncCommand()
        : mService(mRoot / "service", kToken), mLaptop(mRoot.Path(), "laptop"), mDesktop(mRoot.Path(), "desktop")
    {
    }

    // The laptop's two files on the server and on the desktop.
    void SyncBothComputers()
    {
        mLaptop.Write("a.txt", "a1");
        mLaptop.Write("b.txt", "b1");
        ASSERT_EQ(mLaptop.Sync(mService).mStatus, 0);
        ASSERT_EQ(mDesktop.Sync(mService).mStatus, 0);
    }

    testsupport::TempDir mRoot;
    clitest::ServedService mService;
    Computer mLaptop;
    Computer mDesktop;
};

TEST_F(SyncCommand, DryRunPrintsThePlanAndChangesNothingAnywhere)
{
    SyncBothComputers();
    // A change on the server, and a group the laptop does not name.
    mDesktop.Write("a.txt", "a2");
    const Computer stale(mRoot.Path(), "stale");
    stale.Write("x.txt", "x");
    ASSERT_EQ(mDesktop.Sync(mService, {"--dir", stale.DirSpec("Stale")}).mStatus, 0);
    mLaptop.Write("b.txt", "b2");  // and a change here
    const auto before = testsupport::Snapshot(mRoot / "laptop", true);
    for (int run = 0; run < 2; ++run) {  // the second sees the server as the first left it
        const Finished planned = mLaptop.Sync(mService, {"--dry-run"});
        ASSERT_EQ(planned.mStatus, 0) << planned.mErr;
        EXPECT_TRUE(Contains(planned.mOut, "delete    server group Stale")) << planned.mOut;
        EXPECT_TRUE(Contains(planned.mOut, "upload    Notes/b.txt: changed locally")) << planned.mOut;
        EXPECT_FALSE(Contains(planned.mOut, "uploaded"));
        EXPECT_EQ(testsupport::Snapshot(mRoot / "laptop", true),
                  before);  // the folder, no backup directory, the same cache file
    }
}

TEST_F(SyncCommand, GroupGuardRefusesUnlessPruneIsGiven)
{
    SyncBothComputers();
    // A new computer plans to make the group only once the server lacks it.
    const auto notesOnServer = [&](const char* probe) {
        const Finished plan = Computer(mRoot.Path(), probe).Sync(mService, {"--dry-run"});
        return plan.mStatus == 0 && !Contains(plan.mOut, "create    server group Notes");
    };
    const Finished refused = mLaptop.Sync(mService, {}, "Other");
    EXPECT_EQ(refused.mStatus, 1);
    EXPECT_TRUE(Contains(refused.mErr, "refusing to delete server groups that no --dir or --file names: Notes"))
        << refused.mErr;
    EXPECT_EQ(std::count(refused.mErr.begin(), refused.mErr.end(), '\n'), 1);
    EXPECT_TRUE(notesOnServer("probe1"));

    const Finished pruned = mLaptop.Sync(mService, {"--prune-groups"}, "Other");
    EXPECT_EQ(pruned.mStatus, 0) << pruned.mErr;
    EXPECT_FALSE(notesOnServer("probe2"));
}

TEST_F(SyncCommand, JsonOutputParsesAndCountsWhatMoved)
{
    mLaptop.Write("a.txt", "a1");
    const Finished result = mLaptop.Sync(mService, {"--json"});
    ASSERT_EQ(result.mStatus, 0) << result.mErr;
    const boost::json::value json = boost::json::parse(result.mOut);
    EXPECT_TRUE(json.at("ok").as_bool());
    EXPECT_EQ(json.at("mode").as_string(), "two-way");
    EXPECT_EQ(json.at("plan").at("records").at(0).at("action").as_string(), "upload");
    EXPECT_EQ(json.at("result").at("uploaded").to_number<int>(), 1);

    // --mode reaches the engine: server-wins plans to remove a file the server lacks.
    mLaptop.Write("extra.txt", "only here");
    const Finished serverWins = mLaptop.Sync(mService, {"--mode", "server-wins", "--dry-run", "--json"});
    const boost::json::value planned = boost::json::parse(serverWins.mOut);
    EXPECT_EQ(planned.at("mode").as_string(), "server-wins");
    const auto& removals = planned.at("plan").at("localRemovals").as_array();
    ASSERT_EQ(removals.size(), 1u) << serverWins.mOut;
    EXPECT_EQ(removals[0].as_string(), (mLaptop.mFolder / "extra.txt").string());
}

TEST_F(SyncCommand, PlanAndSummaryPrintNamesEscapedAndJsonExact)
{
    // ESC sequences, BEL, CR and a right-to-left override: enough to rewrite
    // what a terminal shows, had they been printed raw.
    const std::string hostile = "x\x1b[2K\x07\rok\xE2\x80\xAEtxt.exe\\.txt";
    const std::string printed = "x\\x1b[2K\\x07\\x0dok\\u202etxt.exe\\\\.txt";
    mLaptop.Write(hostile, "from the disk");
    const Finished upload = mLaptop.Sync(mService);
    ASSERT_EQ(upload.mStatus, 0) << upload.mErr;
    EXPECT_TRUE(Contains(upload.mOut, "upload    Notes/" + printed + ": not on the server")) << upload.mOut;
    EXPECT_TRUE(Contains(upload.mOut, "uploaded 1, downloaded 0")) << upload.mOut;
    EXPECT_EQ(upload.mErr, "");
    EXPECT_TRUE(fs::exists(mLaptop.mPref / "tolmonetsynccache.json"));

    for (const char control : {'\x1b', '\x07', '\r'}) EXPECT_FALSE(Contains(upload.mOut, std::string(1, control)));
    EXPECT_FALSE(Contains(upload.mOut, "\xE2\x80\xAE"));

    const Finished json = mDesktop.Sync(mService, {"--json", "--dry-run"});
    ASSERT_EQ(json.mStatus, 0) << json.mErr;
    EXPECT_EQ(boost::json::parse(json.mOut).at("plan").at("records").at(0).at("name").as_string(), hostile);
}

TEST_F(SyncCommand, TheTokenComesFromAPrivateFileAndAnArgumentDrawsAWarning)
{
    mLaptop.Write("a.txt", "a1");
    const auto sync = [&](const std::vector<std::string>& credentials) {
        std::vector<std::string> arguments = {"--server", mService.ApiUrl(), "--pref-dir", mLaptop.mPref.string()};
        arguments.insert(arguments.end(), credentials.begin(), credentials.end());
        for (const char* more : {"sync", "-q", "--dir"}) arguments.push_back(more);
        arguments.push_back(mLaptop.DirSpec());
        return RunCli(arguments);
    };
    const fs::path file = mRoot / "token";
    WriteFileBytes(file, "not-a-token\n");
    fs::permissions(file, fs::perms::owner_read | fs::perms::owner_write);
    const Finished refused = sync({"--token-file", file.string()});
    EXPECT_EQ(refused.mStatus, 1);  // a failed sync: one line, with the service's 401 text
    EXPECT_TRUE(Contains(refused.mErr, "access token")) << refused.mErr;
    EXPECT_EQ(std::count(refused.mErr.begin(), refused.mErr.end(), '\n'), 1) << refused.mErr;

    WriteFileBytes(file, std::string("  ") + kToken + " \nthe rest is ignored\n");
    const Finished fromFile = sync({"--token-file", file.string()});
    EXPECT_EQ(fromFile.mStatus, 0) << fromFile.mErr;
    EXPECT_EQ(fromFile.mOut + fromFile.mErr, "");  // -q: nothing printed, and no warning

    const Finished fromArgument = sync({"--token", kToken});
    EXPECT_EQ(fromArgument.mStatus, 0) << fromArgument.mErr;
    EXPECT_TRUE(Contains(fromArgument.mErr, "warning: other local users can read the --token argument"))
        << fromArgument.mErr;

    fs::permissions(file, fs::perms::group_read, fs::perm_options::add);
    const Finished shared = sync({"--token-file", file.string()});
    EXPECT_EQ(shared.mStatus, 2);
    EXPECT_TRUE(Contains(shared.mErr, "--token-file " + file.string() + ": ")) << shared.mErr;
    EXPECT_TRUE(Contains(shared.mErr, "chmod 600")) << shared.mErr;
    EXPECT_EQ(sync({"--token-file", mRoot.Path().string()}).mStatus, 2);  // not a regular file
    fs::permissions(file, fs::perms::owner_read | fs::perms::owner_write);
    EXPECT_EQ(sync({"--token", kToken, "--token-file", file.string()}).mStatus, 2);
}

TEST_F(SyncCommand, MigrateCopiesTheEarlierVersionsPreferencesAndSaysFromWhich)
{
    mLaptop.Write("a.txt", "a1");
    ASSERT_EQ(mLaptop.Sync(mService, {"--app-version", "1.0"}).mStatus, 0);

    const Finished migrated =
        mDesktop.Sync(mService, {"--app-version", "1.1", "--migrate", "major", "--migrate", "previous-major"});
    ASSERT_EQ(migrated.mStatus, 0) << migrated.mErr;
    EXPECT_TRUE(Contains(migrated.mOut, "version 1.0's (Tolmonet_tolmonetsync_1.0) were copied")) << migrated.mOut;
    EXPECT_TRUE(Contains(migrated.mOut, "download  Notes/a.txt: missing locally")) << migrated.mOut;
    EXPECT_TRUE(migrated.mErr.empty()) << migrated.mErr;  // nothing traced unasked
}

TEST_F(SyncCommand, RestoreBringsBackTheReplacedBytesAndBacksUpTheNewOnes)
{
    SyncBothComputers();
    mLaptop.Write("a.txt", "a2");
    ASSERT_EQ(mLaptop.Sync(mService).mStatus, 0);
    ASSERT_EQ(mDesktop.Sync(mService).mStatus, 0);  // a1 is replaced by a download
    const std::string path = (mDesktop.mFolder / "a.txt").string();
    const Finished listed = mDesktop.Backups({"backups"});
    EXPECT_TRUE(Contains(listed.mOut, "replaced-by-download  " + path + " (Notes/a.txt), 2 bytes")) << listed.mOut;

    const int lock = ::open((mDesktop.mPref / "tolmonetsync.lock").c_str(), O_RDONLY);
    ASSERT_EQ(::flock(lock, LOCK_SH), 0);  // as a running sync holds it
    const Finished refused = mDesktop.Backups({"restore", path});
    ::close(lock);
    EXPECT_EQ(refused.mStatus, 1);
    EXPECT_TRUE(Contains(refused.mErr, "a sync of this preference directory is running")) << refused.mErr;
    EXPECT_EQ(mDesktop.Read("a.txt"), "a2");

    const Finished restored = mDesktop.Backups({"restore", path});
    ASSERT_EQ(restored.mStatus, 0) << restored.mErr;
    EXPECT_TRUE(Contains(restored.mOut, "restored " + path + " from Backup_")) << restored.mOut;
    EXPECT_EQ(std::count(restored.mOut.begin(), restored.mOut.end(), '\n'), 1);
    EXPECT_EQ(mDesktop.Read("a.txt"), "a1");
    const boost::json::value runs = boost::json::parse(mDesktop.Backups({"backups", "--json"}).mOut).at("runs");
    ASSERT_EQ(runs.as_array().size(), 2u);
    const boost::json::value& newest = runs.at(0).at("copies").at(0);
    EXPECT_EQ(newest.at("reason").as_string(), "replaced-by-restore");
    EXPECT_EQ(
        testsupport::ReadFileBytes(mDesktop.mPref / "SyncBackup" / runs.at(0).at("run").as_string().c_str() / "a.txt"),
        "a2");

    for (const std::vector<std::string>& nothing :
         {std::vector<std::string>{"restore", (mDesktop.mFolder / "b.txt").string()},
          std::vector<std::string>{"restore", path, "--from", "Backup_19990101-000000_000000"}}) {
        const Finished missing = mDesktop.Backups(nothing);
        EXPECT_EQ(missing.mStatus, 1);
        EXPECT_TRUE(Contains(missing.mErr, "no backup copy of ")) << missing.mErr;
    }
}

TEST_F(SyncCommand, KeepServerCopiesKeepsTheServersLosingVersionOnlyWhenAsked)
{
    // Computers without history: each one's file replaces the server's.
    mLaptop.Write("a.txt", "laptop a");
    ASSERT_EQ(mLaptop.Sync(mService).mStatus, 0);
    mDesktop.Write("a.txt", "desktop a");
    ASSERT_EQ(mDesktop.Sync(mService).mStatus, 0);
    EXPECT_EQ(mDesktop.Backups({"backups"}).mOut, "no backup copies\n");  // nothing kept unasked
    const Computer fresh(mRoot.Path(), "fresh");
    fresh.Write("a.txt", "fresh a");
    ASSERT_EQ(fresh.Sync(mService, {"--keep-server-copies"}).mStatus, 0);

    const boost::json::value runs = boost::json::parse(fresh.Backups({"backups", "--json"}).mOut).at("runs");
    ASSERT_EQ(runs.as_array().size(), 1u) << runs;
    const boost::json::value& kept = runs.at(0).at("copies").at(0);
    EXPECT_EQ(kept.at("reason").as_string(), "server-copy-kept");
    EXPECT_EQ(kept.at("copy").as_string(), "a.txt.server-copy");
    EXPECT_EQ(testsupport::ReadFileBytes(fresh.mPref / "SyncBackup" / runs.at(0).at("run").as_string().c_str() /
                                         "a.txt.server-copy"),
              "desktop a");
    EXPECT_EQ(Computer(mRoot.Path(), "probe").Sync(mService).mStatus, 0);
    EXPECT_EQ(testsupport::ReadFileBytes(mRoot / "probe" / "folder" / "a.txt"), "fresh a");  // and then uploaded
}

TEST(CommandUsage, BadOptionsAndSpecsExitTwoNamingTheMistake)
{
    testsupport::TempDir root;
    fs::create_directories(root / "dir");
    const std::string dir = (root / "dir").string();
    const struct {
        std::vector<std::string> mArguments;
        std::string mMessage;
    } cases[] = {
        {{"sync"}, "nothing to sync"},
        {{"sync", "--mode", "both"}, "--mode both"},
        {{"sync", "--bogus"}, "unknown option '--bogus'"},
        {{"sync", "--dir"}, "--dir needs a value"},
        {{"sync", "--dir", "path=" + dir + ",ext=.txt"}, "missing key 'group'"},
        {{"sync", "--dir", "path=" + dir + ",group=G,ext=.txt,colour=red"}, "unknown key 'colour'"},
        {{"sync", "--dir", "path=" + dir + "/missing,group=G,ext=.txt"}, "does not exist"},
        {{"sync", "--dir", "path=" + dir + ",group=G,ext=txt"}, "ext=txt"},
        {{"sync", "--dir", "path=" + dir + ",group=G,ext=.txt,max-size=12kb"}, "max-size=12kb is not a size"},
        {{"sync", "--dir", "path=" + dir + ",group=G,ext=.txt,group=H"}, "'group' given twice"},
        {{"sync", "--file", "path=" + dir + "/a.txt,group=G,type=application/vnd.halvane.tarnvault.collection"},
         "is a collection media type"},
        {{"sync", "--file", "path=" + dir + "/a.txt,group=G,type=text"}, "not a media type"},
        {{"sync", "--file", "path=" + dir + "/nowhere/a.txt,group=G"}, "does not exist"},
        {{"sync", "--migrate", "minor", "--file", "path=" + dir + "/a.txt,group=G"}, "--migrate minor"},
        {{"sync", "--max-delete", "-1", "--file", "path=" + dir + "/a.txt,group=G"}, "--max-delete -1: give a whole"},
        {{"frobnicate"}, "unknown command 'frobnicate'"},
        {{"restore"}, "give the PATH"},
        {{"backups", "--all"}, "unknown option '--all'"},
        {{"doctor", "--mode", "two-way"}, "unknown option '--mode'"},
        {{"--ca-file", dir + "/missing.pem", "status"}, "--ca-file: no such file"},
        {{"login", "--user", "ann", "--password", "secret"}, "unknown option '--password'"},  // never an argument
        {{"serve", "--listen", "127.0.0.1:0"}, "--data is required"},
        {{"serve", "--data", dir, "--token", "no-colon"}, "expected NAME:TOKEN"},
        {{"serve", "--data", dir, "--cert", dir + "/cert.pem"}, "--cert and --key go together"},
    };
    for (const auto& bad : cases) {
        const Finished finished = RunCli(bad.mArguments);
        EXPECT_EQ(finished.mStatus, 2) << bad.mMessage;
        EXPECT_TRUE(Contains(finished.mErr, bad.mMessage)) << finished.mErr;
        EXPECT_TRUE(Contains(finished.mErr, "usage: tolmonetsync")) << finished.mErr;
    }
    // A missing file is not bad usage: the sync brings it back.
    const Finished missingFile = RunCli({"--server", "http://127.0.0.1:9/api", "--token", "t", "--pref-dir",
                                         (root / "pref").string(), "sync", "--file", "path=" + dir + "/a.txt,group=G"});
    EXPECT_EQ(missingFile.mStatus, 1) << missingFile.mErr;
    for (const char* command : {"sync", "serve", "demo", "backups", "restore", "doctor"})
        EXPECT_EQ(RunCli({command, "--help"}).mStatus, 0) << command;
}

TEST(DemoCommand, RunsTheMainJobAndRemovesWhatItMade)
{
    testsupport::TempDir temp;
    const Finished demo = RunCli({"demo"}, {"TMPDIR=" + temp.Path().string()});
    ASSERT_EQ(demo.mStatus, 0) << demo.mOut << demo.mErr;
    EXPECT_TRUE(Contains(demo.mOut, "uploaded 3, downloaded 0")) << demo.mOut;
    EXPECT_TRUE(Contains(demo.mOut, "uploaded 1, downloaded 1")) << demo.mOut;
    EXPECT_TRUE(Contains(demo.mOut, "layout.json")) << demo.mOut;
    EXPECT_TRUE(fs::is_empty(temp.Path()));
}

}  // namespace
