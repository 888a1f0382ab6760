// HTTPS on loopback: the local service serves with a certificate made by the
// test, and a client trusts it only when given its CA, through a processor's
// settings or, for the command, --ca-file or TOLMONETSYNC_CA_FILE. Refused,
// a request gets no answer (-100) with a text a person can read, and never
// reaches the service.

#include <gtest/gtest.h>

#include <climits>

#include "SelfSignedCertificate.h"
#include "foundation/net/CurlRequestProcessor.h"
#include "support/CliProcess.h"
#include "support/ResponseRecorder.h"
#include "support/TestService.h"

namespace {

namespace fs = std::filesystem;
using namespace tolmonet;
using namespace tolmonet::http;
using testsupport::WriteFileBytes;

class Tls : public ::testing::Test {
protected:
    Tls() { reliability::WriteSelfSignedCertificate(Certificate(), Key()); }

    fs::path Certificate() const { return mFiles / "cert.pem"; }
    fs::path Key() const { return mFiles / "key.pem"; }

    // The answer to a signed-in GET of a client root under `base` through `processor`.
    static boost::shared_ptr<Response> GetRoot(RequestProcessor& processor, const std::string& base)
    {
        testsupport::ResponseRecorder recorder(processor);
        HeaderList headers;
        headers.emplace(ImmutableString::CreateStatic("Authorization"),
                        ImmutableString::CreateDynamic(std::string("Bearer ") + testsupport::kAliceToken));
        EXPECT_TRUE(processor.GET(Guid::CreateUnique(), recorder.Handler(),
                                  ImmutableString::CreateDynamic(base + "/collections?name=tls"), headers,
                                  Configuration()));
        if (!recorder.WaitFor(1)) return boost::shared_ptr<Response>();
        return recorder.Responses().at(0).mResponse;
    }

    testsupport::TempDir mFiles;
};

TEST_F(Tls, OnlyAClientThatTrustsTheCaIsAnswered)
{
    testsupport::TestService service([&](tolmonetsync::server::LocalServiceOptions& options) {
        options.mCertificateFile = Certificate().string();
        options.mPrivateKeyFile = Key().string();
    });
    tolmonetsync::server::FaultRule counter;  // counts what reaches the service, never fires
    counter.mPathPattern = ".*";
    counter.mNth = INT_MAX;
    const auto reached = service->Faults().Install(counter);
    const std::string https = service->AssetServiceUrl();
    ASSERT_EQ(https.rfind("https://127.0.0.1:", 0), 0u) << https;
    EXPECT_EQ(service->IdentityServiceUrl().rfind("https://127.0.0.1:", 0), 0u);

    CurlRequestProcessor systemStoreOnly;
    const boost::shared_ptr<Response> refused = GetRoot(systemStoreOnly, https);
    ASSERT_TRUE(refused != nullptr) << "no handler call";
    EXPECT_EQ(refused->status, kStatusNoResponse);
    const std::string text = refused->BodyText().ToStdString();
    EXPECT_NE(text.find("certificate"), std::string::npos) << text;
    EXPECT_EQ(text.find_first_of("\r\n"), std::string::npos) << text;

    const boost::shared_ptr<Response> plain = GetRoot(systemStoreOnly, "http" + https.substr(5));
    ASSERT_TRUE(plain != nullptr) << "no handler call";
    EXPECT_LE(plain->status, 0);
    EXPECT_EQ(reached->Seen(), 0);

    CurlProcessorSettings settings;
    settings.mCAFile = Certificate().string();
    CurlRequestProcessor trusting(settings);
    const boost::shared_ptr<Response> answered = GetRoot(trusting, https);
    ASSERT_TRUE(answered != nullptr) << "no handler call";
    EXPECT_EQ(answered->status, 200) << answered->BodyText().ToStdString();
    EXPECT_EQ(reached->Seen(), 1);
}

TEST_F(Tls, CommandSyncsWithServeOverHttpsOnlyWhenItTrustsTheCaAndServeNeedsAUsableOne)
{
    clitest::ServedService served(mFiles / "served", "tls-token",
                                  {"--cert", Certificate().string(), "--key", Key().string()});
    ASSERT_EQ(served.Base().rfind("https://127.0.0.1:", 0), 0u) << served.Base();
    fs::create_directories(mFiles / "notes");
    WriteFileBytes(mFiles / "notes" / "a.txt", "over TLS");
    const std::vector<std::string> sync = {
        "--server",  served.ApiUrl(), "--token",
        "tls-token", "--pref-dir",    (mFiles / "prefs").string(),
        "sync",      "--dir",         "path=" + (mFiles / "notes").string() + ",group=Notes,ext=.txt"};

    const clitest::Finished refused = clitest::RunCli(sync);
    EXPECT_EQ(refused.mStatus, 1) << refused.mOut << refused.mErr;
    EXPECT_NE(refused.mErr.find("certificate"), std::string::npos) << refused.mErr;

    std::vector<std::string> trusting = {"--ca-file", Certificate().string()};
    trusting.insert(trusting.end(), sync.begin(), sync.end());
    const clitest::Finished accepted = clitest::RunCli(trusting);
    EXPECT_EQ(accepted.mStatus, 0) << accepted.mOut << accepted.mErr;
    EXPECT_NE(accepted.mOut.find("Notes/a.txt"), std::string::npos) << accepted.mOut;

    const clitest::Finished fromEnvironment = clitest::RunCli(sync, {"TOLMONETSYNC_CA_FILE=" + Certificate().string()});
    EXPECT_EQ(fromEnvironment.mStatus, 0) << fromEnvironment.mOut << fromEnvironment.mErr;
    EXPECT_EQ(served.Stop(), 0);

    WriteFileBytes(mFiles / "garbage.pem", "not a certificate");
    const clitest::Finished unreadable = clitest::RunCli({"serve", "--data", (mFiles / "data").string(), "--cert",
                                                          (mFiles / "garbage.pem").string(), "--key", Key().string()});
    EXPECT_EQ(unreadable.mStatus, 1);
    EXPECT_NE(unreadable.mErr.find("cannot serve HTTPS"), std::string::npos) << unreadable.mErr;
}

}  // namespace
