// HTTPS on loopback: the local service serves with a certificate made by the
// test, and the command trusts it only when given its CA, by --ca-file or
// TOLMONETSYNC_CA_FILE. Refused, a sync fails with one line a person can
// read, and no request reaches the service; nor does plain HTTP on its port.

#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <stdexcept>

#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509v3.h>

#include "ServiceStage.h"
#include "support/CliProcess.h"

namespace {

namespace fs = std::filesystem;
using clitest::Contains;
using clitest::Finished;
using clitest::RunCli;
using testsupport::WriteFileBytes;

void Check(bool ok, const char* step)
{
    if (!ok) throw std::runtime_error(std::string("cannot make a test certificate: ") + step);
}

void AddExtension(X509* certificate, int nid, const char* value)
{
    X509V3_CTX context;
    X509V3_set_ctx(&context, certificate, certificate, nullptr, nullptr, 0);
    X509_EXTENSION* extension = X509V3_EXT_conf_nid(nullptr, &context, nid, value);
    Check(extension != nullptr && X509_add_ext(certificate, extension, -1) == 1, value);
    X509_EXTENSION_free(extension);
}

// A certificate for "127.0.0.1" and "localhost", valid from a minute ago for
// a day, with a new P-256 key; self-signed, so it is its own CA file.
void WriteSelfSignedCertificate(const std::filesystem::path& certificateFile,
                                const std::filesystem::path& privateKeyFile)
{
    const std::unique_ptr<EVP_PKEY, decltype(&EVP_PKEY_free)> key(EVP_EC_gen("P-256"), EVP_PKEY_free);
    const std::unique_ptr<X509, decltype(&X509_free)> certificate(X509_new(), X509_free);
    X509* x509 = certificate.get();
    Check(key && x509, "key or certificate");
    X509_NAME* name = X509_get_subject_name(x509);
    const auto address = reinterpret_cast<const unsigned char*>("127.0.0.1");
    Check(X509_set_version(x509, 2) == 1 && ASN1_INTEGER_set(X509_get_serialNumber(x509), 1) == 1 &&
              X509_gmtime_adj(X509_getm_notBefore(x509), -60) != nullptr &&
              X509_gmtime_adj(X509_getm_notAfter(x509), 24 * 60 * 60) != nullptr &&
              X509_set_pubkey(x509, key.get()) == 1 &&
              X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_ASC, address, -1, -1, 0) == 1 &&
              X509_set_issuer_name(x509, name) == 1,
          "fields");
    AddExtension(x509, NID_basic_constraints, "critical,CA:TRUE");
    AddExtension(x509, NID_subject_key_identifier, "hash");
    AddExtension(x509, NID_subject_alt_name, "IP:127.0.0.1,DNS:localhost");
    Check(X509_sign(x509, key.get(), EVP_sha256()) > 0, "signing");

    const std::unique_ptr<BIO, decltype(&BIO_free_all)> certificateOut(BIO_new_file(certificateFile.c_str(), "w"),
                                                                       BIO_free_all);
    const std::unique_ptr<BIO, decltype(&BIO_free_all)> keyOut(BIO_new_file(privateKeyFile.c_str(), "w"), BIO_free_all);
    Check(certificateOut && keyOut && PEM_write_bio_X509(certificateOut.get(), x509) == 1 &&
              PEM_write_bio_PrivateKey(keyOut.get(), key.get(), nullptr, nullptr, 0, nullptr, nullptr) == 1,
          "writing the PEM files");
}

class Tls : public ::testing::Test {
protected:
    Tls()
    {
        WriteSelfSignedCertificate(Certificate(), Key());
        fs::create_directories(mFiles / "notes");
        WriteFileBytes(mFiles / "notes" / "a.txt", "over TLS");
    }

    fs::path Certificate() const { return mFiles / "cert.pem"; }
    fs::path Key() const { return mFiles / "key.pem"; }
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
    testsupport::TestService service([&](tolmonetsync::server::LocalServiceOptions& options) {
        options.mCertificateFile = Certificate().string();
        options.mPrivateKeyFile = Key().string();
    });
    const auto reached = testsupport::CountRequests(*service);
    const std::string https = service->AssetServiceUrl();
    ASSERT_EQ(https.rfind("https://127.0.0.1:", 0), 0u) << https;
    EXPECT_EQ(service->IdentityServiceUrl().rfind("https://127.0.0.1:", 0), 0u);
    const std::vector<std::string> sync = Sync(https, testsupport::kAliceToken);

    const Finished refused = RunCli(sync);
    EXPECT_EQ(refused.mStatus, 1) << refused.mErr;
    EXPECT_TRUE(Contains(refused.mErr, "certificate")) << refused.mErr;
    EXPECT_EQ(std::count(refused.mErr.begin(), refused.mErr.end(), '\n'), 2) << refused.mErr;  // and the warning
    EXPECT_EQ(RunCli(Sync("http" + https.substr(5), testsupport::kAliceToken)).mStatus, 1);
    // The doctor tells the untrusted certificate apart from other failures.
    const Finished doctor = RunCli({"--server", https, "--pref-dir", (mFiles / "prefs").string(), "doctor"});
    EXPECT_EQ(doctor.mStatus, 1);
    EXPECT_TRUE(Contains(doctor.mOut, "attention service     TLS failure at " + https)) << doctor.mOut;
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
