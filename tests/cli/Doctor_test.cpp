// `tolmonetsync doctor` as a process against the local service: a clean
// setup passes, each planted trouble is named on its own line, and nothing
// it runs changes the disk or sends anything but GETs.

#include <gtest/gtest.h>

#include <functional>

#include <boost/json/parse.hpp>

#include "cli/NameForms.h"
#include "cli/ProgressBar.h"
#include "server/Accounts.h"
#include "support/CliProcess.h"
#include "support/TempDir.h"
#include "support/TestService.h"

namespace {

namespace fs = std::filesystem;
using clitest::Contains;
using clitest::Finished;
using clitest::RunCli;
using testsupport::WriteFileBytes;

class DoctorCommand : public ::testing::Test {
protected:
    DoctorCommand()
        : mService([](tolmonetsync::server::LocalServiceOptions& options) {
              options.mUsers.push_back({"ann", "ann-password", ""});
          })
    {
        fs::create_directories(mRoot / "folder");
        WriteFileBytes(mRoot / "folder" / "a.txt", "a1");
    }

    Finished Run(const std::vector<std::string>& command, const std::string& server = std::string())
    {
        std::vector<std::string> arguments = {
            "--server",          server.empty() ? mService->AssetServiceUrl() : server,
            "--identity-server", mService->IdentityServiceUrl(),
            "--pref-dir",        (mRoot / "pref").string()};
        arguments.insert(arguments.end(), command.begin(), command.end());
        return RunCli(arguments, {"TOLMONETSYNC_PASSWORD=ann-password"});
    }
    std::vector<std::string> Doctor() const
    {
        return {"doctor", "--dir", "path=" + (mRoot / "folder").string() + ",group=Notes,ext=.txt"};
    }

    testsupport::TempDir mRoot;
    testsupport::TestService mService;
};

TEST_F(DoctorCommand, PassesACleanSetupAndNamesEachPlantedTroubleWithoutChangingAnything)
{
    ASSERT_EQ(Run({"login", "--user", "ann"}).mStatus, 0);
    ASSERT_EQ(Run({"sync", "-q", "--dir", "path=" + (mRoot / "folder").string() + ",group=Notes,ext=.txt"}).mStatus, 0);
    const auto every = testsupport::CountRequests(*mService);
    tolmonetsync::server::FaultRule gets;
    gets.mMethod = "GET";
    gets.mPathPattern = ".*";
    gets.mNth = 1 << 30;
    const auto readOnly = mService->Faults().Install(gets);
    const auto before = testsupport::Snapshot(mRoot.Path(), true);

    const Finished clean = Run(Doctor());
    EXPECT_EQ(clean.mStatus, 0) << clean.mOut << clean.mErr;
    EXPECT_TRUE(Contains(clean.mOut, "nothing needs attention")) << clean.mOut;
    EXPECT_TRUE(Contains(clean.mOut, "ok        clock")) << clean.mOut;
    EXPECT_FALSE(Contains(clean.mOut, "no Date header")) << clean.mOut;
    const Finished json = Run({"--json", "doctor"});
    EXPECT_EQ(boost::json::parse(json.mOut).at("ok"), true) << json.mOut;

    const fs::path folder = mRoot / "folder";
    const fs::path fingerprint = mRoot / "pref" / "tolmonetsynccache.fingerprint";
    const bool hadFingerprint = fs::exists(fingerprint);
    const std::string ownFingerprint = hadFingerprint ? testsupport::ReadFileBytes(fingerprint) : std::string();
    const struct {
        const char* mWhat;
        std::function<void()> mPlant;
        std::string mServer;  // empty: the test service
        std::string mLine;
    } troubles[] = {
        {"a leftover download", [&] { WriteFileBytes(folder / "a.txt.temp", "half"); }, "",
         "attention leftovers   1 unfinished download(s): " + (folder / "a.txt.temp").string()},
        {"a hidden temporary", [&] { WriteFileBytes(folder / ".a.txt.tmsw-Ab12Cd", ""); }, "",
         "temporary file(s) of an interrupted write"},
        {"a foreign cache", [&] { WriteFileBytes(fingerprint, R"({"user":"someone-else","root":"x","service":"y"})"); },
         "", "attention cache-owner foreign: the cache file was written for user someone-else"},
        {"names only Unicode tells apart",
         [&] {
             WriteFileBytes(folder / "caf\xC3\xA9.txt", "nfc");
             WriteFileBytes(folder / "cafe\xCC\x81.txt", "nfd");
         },
         "", "attention names"},
        {"a refused connection", [] {}, "http://127.0.0.1:1/api", "attention service     connection refused"},
        {"a failing service",
         [&] {
             tolmonetsync::server::FaultRule rule;
             rule.mPathPattern = "/api/collections";
             rule.mStatus = 503;
             mService->Faults().Install(rule);
         },
         "", "failed (HTTP 503)"},
        {"an expired sign-in", [&] { mService->GetAccounts().ExpireTokensOf("ann"); }, "",
         "refuses the token (HTTP 401): it expired"},
    };
    for (const auto& trouble : troubles) {
        trouble.mPlant();
        const auto planted = testsupport::Snapshot(mRoot.Path(), true);
        const Finished found = Run(Doctor(), trouble.mServer);
        EXPECT_EQ(found.mStatus, 1) << trouble.mWhat << "\n" << found.mOut << found.mErr;
        EXPECT_TRUE(Contains(found.mOut, trouble.mLine)) << trouble.mWhat << "\n" << found.mOut;
        // The doctor wrote nothing of its own.
        EXPECT_EQ(testsupport::Snapshot(mRoot.Path(), true), planted) << trouble.mWhat;
        for (const char* name : {"a.txt.temp", ".a.txt.tmsw-Ab12Cd", "caf\xC3\xA9.txt", "cafe\xCC\x81.txt"})
            fs::remove(folder / name);
        fs::remove(fingerprint);
        if (hadFingerprint) WriteFileBytes(fingerprint, ownFingerprint);
    }
    EXPECT_EQ(testsupport::Snapshot(mRoot.Path(), true), before);
    EXPECT_GT(every->Seen(), 0);
    EXPECT_EQ(every->Seen(), readOnly->Seen()) << "the doctor sent something other than a GET";
}

TEST(NameFoldKey, FoldsCaseAndComposedLatinLettersOnly)
{
    using tolmonetsync::cli::NameFoldKey;
    const struct {
        std::string mFirst;
        std::string mSecond;
        bool mSame;
    } cases[] = {
        {"Notes.TXT", "notes.txt", true},
        {"caf\xC3\xA9", "cafe\xCC\x81", true},               // NFC and NFD
        {"\xC3\x89t\xC3\xA9", "E\xCC\x81te\xCC\x81", true},  // upper case, decomposed
        {"\xC5\x81\xC3\xB3"
         "d\xC5\xBA",
         "\xC5\x82o\xCC\x81"
         "dz\xCC\x81",
         true},  // Latin Extended-A
        {"cafe", "caf\xC3\xA9", false},
        {"stra\xC3\x9F"
         "e",
         "strasse", false},        // no folding beyond case and composition
        {"a\xFF", "A\xFF", true},  // bytes that are not UTF-8 stay as they are
        {"a\xFF", "a\xFE", false},
    };
    for (const auto& pair : cases)
        EXPECT_EQ(NameFoldKey(pair.mFirst) == NameFoldKey(pair.mSecond), pair.mSame)
            << pair.mFirst << " / " << pair.mSecond;
}

TEST(VersionOption, PrintsTheNameAndTheProjectVersion)
{
    const Finished version = RunCli({"--version"});
    EXPECT_EQ(version.mStatus, 0);
    EXPECT_EQ(version.mOut, "tolmonetsync " TOLMONETSYNC_VERSION "\n");
}

TEST(ProgressBar, ShowsFilesDoneOfTotalBytesMovedAndTheRateOnlyOnATerminal)
{
    std::ostringstream terminal;
    {
        tolmonetsync::cli::ProgressBar bar(terminal, true);
        bar.DrawTransfer("syncing", 0.5f, 4, 3 * 512 * 1024, 2.0);
    }
    EXPECT_EQ(terminal.str().substr(0, terminal.str().find('\r', 1)),
              "\rsyncing [###############...............] 50% 2/4 files, 1.5 MiB at 768.0 KiB/s");
    std::ostringstream pipe;
    tolmonetsync::cli::ProgressBar(pipe, false).DrawTransfer("syncing", 0.5f, 4, 1, 1.0);
    EXPECT_EQ(pipe.str(), "");
}

}  // namespace
