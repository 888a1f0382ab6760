// login, status, a sync on the stored sign-in, a restart, and logout, as processes.

#include <gtest/gtest.h>

#include <memory>

#include "CliProcess.h"
#include "support/TempDir.h"

namespace {

using clitest::Finished;
using clitest::RunCli;

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
    const Finished connected = run({"status"});
    EXPECT_EQ(connected.mStatus, 0);
    EXPECT_EQ(connected.mOut, "connected\n");
    const Finished synced = run(sync);
    EXPECT_EQ(synced.mStatus, 0) << synced.mErr;

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

}  // namespace
