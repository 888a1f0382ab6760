// HTTPS on loopback: the local service serves with a certificate made by the
// test, and a client trusts it only when given its CA, through a processor's
// settings or, for the command, --ca-file or TOLMONETSYNC_CA_FILE. Refused,
// a request gets no answer (-100) with a text a person can read, and never
// reaches the service.

#include <gtest/gtest.h>

#include <climits>
#include <memory>

#include "CliProcess.h"
#include "SelfSignedCertificate.h"
#include "foundation/net/CurlRequestProcessor.h"
#include "server/LocalService.h"
#include "support/ResponseRecorder.h"
#include "support/TempDir.h"

namespace {

namespace fs = std::filesystem;
using namespace tolmonet;
using namespace tolmonet::http;
using namespace tolmonetsync::server;
using reliability::WriteSelfSignedCertificate;
using testsupport::WriteFileBytes;

const char kToken[] = "tls-token";

class TlsService : public ::testing::Test {
protected:
    void SetUp() override { WriteSelfSignedCertificate(Certificate(), Key()); }

    fs::path Certificate() const { return mFiles / "cert.pem"; }
    fs::path Key() const { return mFiles / "key.pem"; }

    // The service in this process, serving HTTPS; a rule that counts every
    // request reaching it and never fires.
    void StartService()
    {
        LocalServiceOptions options;
        options.mDataDirectory = (mFiles / "service").string();
        options.mTokens.push_back({"tls", kToken});
        options.mCertificateFile = Certificate().string();
        options.mPrivateKeyFile = Key().string();
        mService.reset(new LocalService(options));
        mService->Start();
        FaultRule counter;
        counter.mPathPattern = ".*";
        counter.mNth = INT_MAX;
        mReached = mService->Faults().Install(counter);
    }

    // A signed-in GET of a client root through `processor`.
    boost::shared_ptr<Response> GetRoot(RequestProcessor& processor)
    {
        testsupport::ResponseRecorder recorder(processor);
        HeaderList headers;
        headers.emplace(ImmutableString::CreateStatic("Authorization"),
                        ImmutableString::CreateDynamic(std::string("Bearer ") + kToken));
        const std::string url = mService->AssetServiceUrl() + "/collections?name=tls";
        EXPECT_TRUE(processor.GET(Guid::CreateUnique(), recorder.Handler(), ImmutableString::CreateDynamic(url),
                                  headers, Configuration()));
        if (!recorder.WaitFor(1)) return boost::shared_ptr<Response>();
        return recorder.Responses().at(0).mResponse;
    }

    testsupport::TempDir mFiles;
    std::unique_ptr<LocalService> mService;
    std::shared_ptr<const FaultHandle> mReached;
};

TEST_F(TlsService, ClientWithoutTheCaRefusesTheCertificateWithAReadableText)
{
    StartService();
    CurlRequestProcessor processor;  // the system's store only
    const boost::shared_ptr<Response> response = GetRoot(processor);
    ASSERT_TRUE(response != nullptr) << "no handler call";
    EXPECT_EQ(response->status, kStatusNoResponse);
    const std::string text = response->BodyText().ToStdString();
    EXPECT_NE(text.find("certificate"), std::string::npos) << text;
    EXPECT_EQ(text.find_first_of("\r\n"), std::string::npos) << text;
    EXPECT_EQ(mReached->Seen(), 0);
}

TEST_F(TlsService, ClientGivenTheCaIsAnswered)
{
    StartService();
    EXPECT_EQ(mService->AssetServiceUrl().rfind("https://127.0.0.1:", 0), 0u) << mService->AssetServiceUrl();
    EXPECT_EQ(mService->IdentityServiceUrl().rfind("https://127.0.0.1:", 0), 0u);
    CurlProcessorSettings settings;
    settings.mCAFile = Certificate().string();
    CurlRequestProcessor processor(settings);
    const boost::shared_ptr<Response> response = GetRoot(processor);
    ASSERT_TRUE(response != nullptr) << "no handler call";
    EXPECT_EQ(response->status, 200) << response->BodyText().ToStdString();
    EXPECT_EQ(mReached->Seen(), 1);
}

TEST_F(TlsService, PlainHttpClientIsNotAnsweredOnTheHttpsPort)
{
    StartService();
    CurlRequestProcessor processor;
    testsupport::ResponseRecorder recorder(processor);
    std::string url = mService->AssetServiceUrl();
    url.replace(0, 5, "http");  // "https" -> "http"
    ASSERT_TRUE(processor.GET(Guid::CreateUnique(), recorder.Handler(),
                              ImmutableString::CreateDynamic(url + "/collections?name=tls"), HeaderList(),
                              Configuration()));
    ASSERT_TRUE(recorder.WaitFor(1));
    EXPECT_LE(recorder.Responses().at(0).mResponse->status, 0);
    EXPECT_EQ(mReached->Seen(), 0);
}

TEST_F(TlsService, CommandSyncsWithServeOverHttpsOnlyWhenItTrustsTheCa)
{
    clitest::ServedService served(mFiles / "served", kToken,
                                  {"--cert", Certificate().string(), "--key", Key().string()});
    ASSERT_EQ(served.Base().rfind("https://127.0.0.1:", 0), 0u) << served.Base();
    fs::create_directories(mFiles / "notes");
    WriteFileBytes(mFiles / "notes" / "a.txt", "over TLS");
    const std::vector<std::string> sync = {
        "--server", served.ApiUrl(), "--token",
        kToken,     "--pref-dir",    (mFiles / "prefs").string(),
        "sync",     "--dir",         "path=" + (mFiles / "notes").string() + ",group=Notes,ext=.txt"};

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
}

TEST_F(TlsService, ServeAndCaFileRefuseWhatTheyCannotUse)
{
    const clitest::Finished keyless =
        clitest::RunCli({"serve", "--data", mFiles.Path().string(), "--cert", Certificate().string()});
    EXPECT_EQ(keyless.mStatus, 2);
    EXPECT_NE(keyless.mErr.find("--cert and --key go together"), std::string::npos) << keyless.mErr;

    WriteFileBytes(mFiles / "garbage.pem", "not a certificate");
    const clitest::Finished unreadable = clitest::RunCli({"serve", "--data", (mFiles / "data").string(), "--cert",
                                                          (mFiles / "garbage.pem").string(), "--key", Key().string()});
    EXPECT_EQ(unreadable.mStatus, 1);
    EXPECT_NE(unreadable.mErr.find("cannot serve HTTPS"), std::string::npos) << unreadable.mErr;

    const clitest::Finished missingCa = clitest::RunCli({"--ca-file", (mFiles / "missing.pem").string(), "status"});
    EXPECT_EQ(missingCa.mStatus, 2);
    EXPECT_NE(missingCa.mErr.find("--ca-file: no such file"), std::string::npos) << missingCa.mErr;
}

}  // namespace
