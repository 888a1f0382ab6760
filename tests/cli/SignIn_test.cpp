// login, status, a sync on the stored sign-in, a restart, and logout, as processes.

#include <gtest/gtest.h>

#include <sys/stat.h>

#include <memory>

#include "CliProcess.h"
#include "support/TempDir.h"

namespace {

using clitest::Finished;
using clitest::RunCli;
namespace fs = std::filesystem;

unsigned ModeOf(const fs::path& path)
{
    struct stat info;
    return ::stat(path.c_str(), &info) == 0 ? info.st_mode & 07777 : ~0u;
}

TEST(SignInCommands, LoginStatusSyncRestartSyncLogoutCycle)
{
    testsupport::TempDir root;
    auto service = std::make_unique<clitest::ServedService>(root / "service", "unused-token");
    std::filesystem::create_directories(root / "folder");
    testsupport::WriteFileBytes(root / "folder" / "a.txt", "a");
    auto run = [&](std::vector<std::string> arguments, const std::vector<std::string>& environment = {}) {
        const std::vector<std::string> where = {"--server",          service->ApiUrl(),
                                                "--identity-server", service->Base() + "/ovra",
                                                "--pref-dir",        (root / "pref").string()};
        arguments.insert(arguments.begin(), where.begin(), where.end());
        return RunCli(arguments, environment);
    };
    const std::vector<std::string> sync = {"sync", "-q", "--dir",
                                           "path=" + (root / "folder").string() + ",group=G,ext=.txt"};

    EXPECT_EQ(run({"status"}).mOut, "not-logged-in\n");
    const Finished unsigned_ = run(sync);
    EXPECT_EQ(unsigned_.mStatus, 1);
    EXPECT_NE(unsigned_.mErr.find("not signed in"), std::string::npos) << unsigned_.mErr;

    const Finished wrong = run({"login", "--user", "ann"}, {"TOLMONETSYNC_PASSWORD=wrong"});
    EXPECT_EQ(wrong.mStatus, 1);
    EXPECT_NE(wrong.mErr.find("Authentication failed"), std::string::npos) << wrong.mErr;
    EXPECT_EQ(run({"login", "--user", "ann", "--password", "secret"}).mStatus, 2);  // never from an argument

    const Finished login = run({"login", "--user", "ann"}, {"TOLMONETSYNC_PASSWORD=secret"});
    ASSERT_EQ(login.mStatus, 0) << login.mErr;
    // The command made the preference directory, and what it stores there is private.
    EXPECT_EQ(ModeOf(root / "pref"), 0700u);
    EXPECT_EQ(ModeOf(root / "pref" / "tarnvaultuser.txt"), 0600u);
    EXPECT_EQ(ModeOf(root / "pref" / "keychain.store"), 0600u);
    const Finished connected = run({"status"});
    EXPECT_EQ(connected.mStatus, 0);
    EXPECT_EQ(connected.mOut, "connected\n");
    const Finished synced = run(sync);
    EXPECT_EQ(synced.mStatus, 0) << synced.mErr;
    EXPECT_EQ(ModeOf(root / "pref" / "tolmonetsynccache.json"), 0600u);
    EXPECT_EQ(ModeOf(root / "pref" / "SyncBackup"), 0700u);

    // Every command is a new process; the service restarts too, on its data.
    service.reset();
    service = std::make_unique<clitest::ServedService>(root / "service", "unused-token");
    EXPECT_EQ(run({"status"}).mOut, "connected\n");
    const Finished again = run(sync);
    EXPECT_EQ(again.mStatus, 0) << again.mErr;

    EXPECT_EQ(run({"logout"}).mStatus, 0);
    const Finished after = run({"status"});
    EXPECT_EQ(after.mStatus, 1);
    EXPECT_EQ(after.mOut, "not-logged-in\n");
}

TEST(SignInCommands, APreferenceDirectoryOthersCanWriteIsRefusedUnlessAllowed)
{
    testsupport::TempDir root;
    const fs::path pref = root / "shared";
    fs::create_directory(pref);
    fs::permissions(pref, fs::perms::all);
    const Finished refused = RunCli({"--pref-dir", pref.string(), "status"});
    EXPECT_EQ(refused.mStatus, 1);
    EXPECT_EQ(refused.mErr, "tolmonetsync status: Refusing the preference directory " + pref.string() +
                                ": it is writable by other users (mode 0777)\n");
    EXPECT_TRUE(fs::is_empty(pref));

    const Finished allowed = RunCli({"--allow-shared-pref-dir", "--pref-dir", pref.string(), "status"});
    EXPECT_EQ(allowed.mOut, "not-logged-in\n") << allowed.mErr;
}

}  // namespace
