// login, status, a sync on the stored sign-in, and logout, as processes, traced.

#include <gtest/gtest.h>

#include <regex>

#include "foundation/core/KeychainStoreFormat.h"
#include "support/CliProcess.h"
#include "support/SecretServiceSession.h"
#include "support/TempDir.h"

namespace {

using clitest::Contains;
using clitest::Finished;
using clitest::RunCli;
namespace fs = std::filesystem;

unsigned ModeOf(const fs::path& path)
{
    return static_cast<unsigned>(fs::status(path).permissions());
}

// Every value the keychain store of `pref` holds.
std::vector<std::string> StoredSecrets(const std::filesystem::path& pref)
{
    const std::string store = testsupport::ReadFileBytes(pref / "keychain.store");
    std::vector<std::string> values;
    for (const auto& entry : tolmocore::security::detail::ParseKeychainStore(
             reinterpret_cast<const unsigned char*>(store.data()), store.size()))
        values.push_back(tolmocore::utility::ToNarrow(entry.second));
    return values;
}

// The value after each secret key in a trace, in whichever form it was traced.
std::vector<std::string> TracedSecretValues(const std::string& trace)
{
    static const std::regex kSecret(
        R"re((password|client_secret|refresh_token|bearer_token|access_token|device_token|token)("?\s*[:=]\s*"?)([^&",\s]*))re",
        std::regex::icase);
    std::vector<std::string> values;
    for (std::sregex_iterator it(trace.begin(), trace.end(), kSecret), end; it != end; ++it) values.push_back((*it)[3]);
    return values;
}

TEST(SignInCommands, LoginStatusSyncLogoutCycleKeepsItsFilesPrivateAndTracesNoSecret)
{
    testsupport::TempDir root;
    const std::string password = "Pw@7q/x";  // goes out percent-encoded as Pw%407q%2fx
    const clitest::ServedService service(root / "service", "unused-token", {"--user", "bob:" + password});
    fs::create_directories(root / "folder");
    testsupport::WriteFileBytes(root / "folder" / "a.txt", "a");
    const auto run = [&](std::vector<std::string> arguments, const std::vector<std::string>& environment = {}) {
        const std::vector<std::string> where = {
            "--server",   service.ApiUrl(),         "--identity-server", service.Base() + "/ovra",
            "--pref-dir", (root / "pref").string(), "--trace",           "8"};
        arguments.insert(arguments.begin(), where.begin(), where.end());
        return RunCli(arguments, environment);
    };
    const std::vector<std::string> sync = {"sync", "-q", "--dir",
                                           "path=" + (root / "folder").string() + ",group=G,ext=.txt"};
    std::vector<std::string> known = {password, "Pw%407q%2fx"};
    const auto expectNoSecret = [&](const std::string& trace) {
        EXPECT_TRUE(Contains(trace, "Authenticate, url: ")) << "nothing traced: " << trace;
        EXPECT_TRUE(Contains(trace, "&password=***&")) << trace;
        for (const std::string& secret : known) EXPECT_FALSE(Contains(trace, secret)) << secret << " in " << trace;
        const std::vector<std::string> traced = TracedSecretValues(trace);
        EXPECT_GE(traced.size(), 5u);  // password, client secret and the three tokens of the answer
        for (const std::string& value : traced)
            EXPECT_TRUE(value == "***" || value == "<obfuscated>" || value.empty()) << value;
        EXPECT_FALSE(Contains(trace, "Bearer ")) << trace;
    };

    EXPECT_EQ(run({"status"}).mOut, "not-logged-in\n");
    const Finished unsigned_ = run(sync);
    EXPECT_EQ(unsigned_.mStatus, 1);
    EXPECT_TRUE(Contains(unsigned_.mErr, "not signed in")) << unsigned_.mErr;
    EXPECT_FALSE(fs::exists(root / "pref" / "tolmonetsynccache.json"));
    const Finished wrong = run({"login", "--user", "bob"}, {"TOLMONETSYNC_PASSWORD=wrong"});
    EXPECT_EQ(wrong.mStatus, 1);
    EXPECT_TRUE(Contains(wrong.mErr, "Authentication failed")) << wrong.mErr;

    const Finished login = run({"login", "--user", "bob"}, {"TOLMONETSYNC_PASSWORD=" + password});
    ASSERT_EQ(login.mStatus, 0) << login.mErr;
    // The command made the preference directory, and what it stores there is private.
    EXPECT_EQ(ModeOf(root / "pref"), 0700u);
    EXPECT_EQ(ModeOf(root / "pref" / "tarnvaultuser.txt"), 0600u);
    EXPECT_EQ(ModeOf(root / "pref" / "keychain.store"), 0600u);
    const std::vector<std::string> stored = StoredSecrets(root / "pref");
    ASSERT_EQ(stored.size(), 3u);  // the access, refresh and device tokens
    known.insert(known.end(), stored.begin(), stored.end());
    expectNoSecret(login.mErr);

    const Finished connected = run({"status"});
    EXPECT_EQ(connected.mStatus, 0);
    EXPECT_EQ(connected.mOut, "connected\n");
    const Finished synced = run(sync);
    EXPECT_EQ(synced.mStatus, 0) << synced.mErr;
    EXPECT_EQ(ModeOf(root / "pref" / "tolmonetsynccache.json"), 0600u);
    EXPECT_EQ(ModeOf(root / "pref" / "SyncBackup"), 0700u);
    std::vector<std::string> autoLoginSync = sync;
    autoLoginSync.insert(autoLoginSync.begin(), "--auto-login");
    const Finished autoLogin = run(autoLoginSync, {"TOLMONETSYNC_USERNAME=bob", "TOLMONETSYNC_PASSWORD=" + password});
    ASSERT_EQ(autoLogin.mStatus, 0) << autoLogin.mErr;
    expectNoSecret(autoLogin.mErr);

    // The access and refresh tokens go with the sign-in, and the device token too.
    EXPECT_EQ(run({"logout"}).mStatus, 0);
    EXPECT_TRUE(StoredSecrets(root / "pref").empty());
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

TEST(SignInCommands, SystemKeychainTakesOverAFileSignInAndNeverPrompts)
{
    std::string whyNot;
    if (!testsupport::StartSecretServiceSession(whyNot)) GTEST_SKIP() << whyNot;
    testsupport::TempDir root;
    const clitest::ServedService service(root / "service", "unused-token", {"--user", "carol:pw-9"});
    fs::create_directories(root / "folder");
    testsupport::WriteFileBytes(root / "folder" / "a.txt", "a");
    const auto run = [&](const std::string& keychain, std::vector<std::string> arguments,
                         const std::vector<std::string>& environment = {"TOLMONETSYNC_PASSWORD=pw-9"}) {
        const std::vector<std::string> where = {
            "--server",   service.ApiUrl(),         "--identity-server", service.Base() + "/ovra",
            "--pref-dir", (root / "pref").string(), "--keychain",        keychain};
        arguments.insert(arguments.begin(), where.begin(), where.end());
        return RunCli(arguments, environment);
    };

    ASSERT_EQ(run("file", {"login", "--user", "carol"}).mStatus, 0);
    EXPECT_EQ(StoredSecrets(root / "pref").size(), 3u);
    EXPECT_EQ(run("system", {"status"}).mOut, "connected\n") << "a file sign-in survives the change";
    const Finished login = run("system", {"login", "--user", "carol"});
    ASSERT_EQ(login.mStatus, 0) << login.mErr;
    EXPECT_TRUE(StoredSecrets(root / "pref").empty()) << "the tokens left the file for the system keychain";
    EXPECT_EQ(run("file", {"status"}).mOut, "not-logged-in\n");
    const Finished sync =
        run("system", {"sync", "-q", "--dir", "path=" + (root / "folder").string() + ",group=G,ext=.txt"});
    EXPECT_EQ(sync.mStatus, 0) << sync.mErr;
    EXPECT_EQ(run("system", {"logout"}).mStatus, 0);
    EXPECT_EQ(run("system", {"status"}).mOut, "not-logged-in\n");

    // A locked keychain is reported, never unlocked: the command ends at once.
    const testsupport::SecretServiceSession locked;
    ASSERT_TRUE(locked.Ready(whyNot)) << whyNot;
    ASSERT_TRUE(locked.LockDefaultCollection());
    const std::string sharedBus = std::getenv("DBUS_SESSION_BUS_ADDRESS");
    const std::string lockedBus = locked.BusVariable().substr(locked.BusVariable().find('=') + 1);
    ::setenv("DBUS_SESSION_BUS_ADDRESS", lockedBus.c_str(), 1);  // commands take the first entry
    const Finished refused = run("system", {"login", "--user", "carol"});
    ::setenv("DBUS_SESSION_BUS_ADDRESS", sharedBus.c_str(), 1);
    EXPECT_EQ(refused.mStatus, 1);
    EXPECT_TRUE(Contains(refused.mErr, "the system keychain cannot keep the sign-in")) << refused.mErr;
    EXPECT_TRUE(Contains(refused.mErr, "locked")) << refused.mErr;
    EXPECT_TRUE(StoredSecrets(root / "pref").empty());
    EXPECT_EQ(run("bad", {"status"}).mStatus, 2);
}

}  // namespace
