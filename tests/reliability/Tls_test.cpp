// HTTPS on loopback: the local service serves with the test certificate in
// tls/, and the command trusts it only when given its CA, by --ca-file or
// TOLMONETSYNC_CA_FILE. Refused, a sync fails with one line a person can
// read, and no request reaches the service; nor does plain HTTP on its port.

#include <gtest/gtest.h>

#include <algorithm>

#include "ServiceStage.h"
#include "support/CliProcess.h"

namespace {

namespace fs = std::filesystem;
using clitest::Contains;
using clitest::Finished;
using clitest::RunCli;
using testsupport::WriteFileBytes;

class Tls : public ::testing::Test {
protected:
    Tls()
    {
        fs::create_directories(mFiles / "notes");
        WriteFileBytes(mFiles / "notes" / "a.txt", "over TLS");
    }

    // Self-signed for 127.0.0.1 and localhost, so its own CA file; a P-256 key.
    static fs::path Certificate() { return fs::path(TLS_FIXTURES) / "cert.pem"; }
    static fs::path Key() { return fs::path(TLS_FIXTURES) / "key.pem"; }
    std::vector<std::string> Sync(const std::string& apiUrl, const std::string& token) const
    {
        return {"--server", apiUrl,       "--token",
                token,      "--pref-dir", (mFiles / "prefs").string(),
                "sync",     "--dir",      "path=" + (mFiles / "notes").string() + ",group=Notes,ext=.txt"};
    }

    testsupport::TempDir mFiles;
};

TEST_F(Tls, CommandIsAnsweredOnlyOverHttpsAndOnlyWhenItTrustsTheCa)
{
    testsupport::TestService service([](tolmonetsync::server::LocalServiceOptions& options) {
        options.mCertificateFile = Certificate().string();
        options.mPrivateKeyFile = Key().string();
    });
    const auto reached = reliability::CountRequests(*service);
    const std::string https = service->AssetServiceUrl();
    ASSERT_EQ(https.rfind("https://127.0.0.1:", 0), 0u) << https;
    EXPECT_EQ(service->IdentityServiceUrl().rfind("https://127.0.0.1:", 0), 0u);
    const std::vector<std::string> sync = Sync(https, testsupport::kAliceToken);

    const Finished refused = RunCli(sync);
    EXPECT_EQ(refused.mStatus, 1) << refused.mErr;
    EXPECT_TRUE(Contains(refused.mErr, "certificate")) << refused.mErr;
    EXPECT_EQ(std::count(refused.mErr.begin(), refused.mErr.end(), '\n'), 2) << refused.mErr;  // and the warning
    EXPECT_EQ(RunCli(Sync("http" + https.substr(5), testsupport::kAliceToken)).mStatus, 1);
    EXPECT_EQ(reached->Seen(), 0);

    std::vector<std::string> trusting = {"--ca-file", Certificate().string()};
    trusting.insert(trusting.end(), sync.begin(), sync.end());
    const Finished accepted = RunCli(trusting);
    EXPECT_EQ(accepted.mStatus, 0) << accepted.mOut << accepted.mErr;
    EXPECT_TRUE(Contains(accepted.mOut, "Notes/a.txt")) << accepted.mOut;
    EXPECT_GT(reached->Seen(), 0);
    const Finished fromEnvironment = RunCli(sync, {"TOLMONETSYNC_CA_FILE=" + Certificate().string()});
    EXPECT_EQ(fromEnvironment.mStatus, 0) << fromEnvironment.mOut << fromEnvironment.mErr;
}

TEST_F(Tls, ServeServesHttpsOnlyWithAUsableCertificate)
{
    clitest::ServedService served(mFiles / "served", "tls-token",
                                  {"--cert", Certificate().string(), "--key", Key().string()});
    ASSERT_EQ(served.Base().rfind("https://127.0.0.1:", 0), 0u) << served.Base();
    const Finished accepted =
        RunCli(Sync(served.ApiUrl(), "tls-token"), {"TOLMONETSYNC_CA_FILE=" + Certificate().string()});
    EXPECT_EQ(accepted.mStatus, 0) << accepted.mOut << accepted.mErr;
    EXPECT_EQ(served.Stop(), 0);

    WriteFileBytes(mFiles / "garbage.pem", "not a certificate");
    const Finished unreadable = RunCli({"serve", "--data", (mFiles / "data").string(), "--cert",
                                        (mFiles / "garbage.pem").string(), "--key", Key().string()});
    EXPECT_EQ(unreadable.mStatus, 1);
    EXPECT_TRUE(Contains(unreadable.mErr, "cannot serve HTTPS")) << unreadable.mErr;
}

}  // namespace
