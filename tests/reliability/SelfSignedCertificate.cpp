#include "SelfSignedCertificate.h"

#include <functional>
#include <memory>
#include <stdexcept>
#include <string>

#include <openssl/bio.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509.h>
#include <openssl/x509v3.h>

namespace reliability {

namespace {

template <typename T, void (*Free)(T*)>
struct Freer {
    void operator()(T* object) const { Free(object); }
};
using KeyPointer = std::unique_ptr<EVP_PKEY, Freer<EVP_PKEY, EVP_PKEY_free>>;
using CertificatePointer = std::unique_ptr<X509, Freer<X509, X509_free>>;
using ExtensionPointer = std::unique_ptr<X509_EXTENSION, Freer<X509_EXTENSION, X509_EXTENSION_free>>;

void Check(bool ok, const char* step)
{
    if (!ok) throw std::runtime_error(std::string("cannot make a test certificate: ") + step);
}

void AddExtension(X509* certificate, int nid, const char* value)
{
    X509V3_CTX context;
    X509V3_set_ctx(&context, certificate, certificate, nullptr, nullptr, 0);
    const ExtensionPointer extension(X509V3_EXT_conf_nid(nullptr, &context, nid, value));
    Check(extension != nullptr && X509_add_ext(certificate, extension.get(), -1) == 1, value);
}

void WritePem(const std::filesystem::path& path, const std::function<int(BIO*)>& write)
{
    std::unique_ptr<BIO, Freer<BIO, BIO_free_all>> file(BIO_new_file(path.c_str(), "w"));
    Check(file != nullptr && write(file.get()) == 1, "writing a PEM file");
}

}  // namespace

void WriteSelfSignedCertificate(const std::filesystem::path& certificateFile,
                                const std::filesystem::path& privateKeyFile)
{
    const KeyPointer key(EVP_EC_gen("P-256"));
    Check(key != nullptr, "key generation");
    const CertificatePointer certificate(X509_new());
    Check(certificate != nullptr, "X509_new");
    X509* x509 = certificate.get();
    Check(X509_set_version(x509, 2) == 1, "version");
    Check(ASN1_INTEGER_set(X509_get_serialNumber(x509), 1) == 1, "serial number");
    Check(X509_gmtime_adj(X509_getm_notBefore(x509), -60) != nullptr, "start date");
    Check(X509_gmtime_adj(X509_getm_notAfter(x509), 24 * 60 * 60) != nullptr, "end date");
    Check(X509_set_pubkey(x509, key.get()) == 1, "public key");
    X509_NAME* name = X509_get_subject_name(x509);
    Check(X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_ASC, reinterpret_cast<const unsigned char*>("127.0.0.1"), -1,
                                     -1, 0) == 1,
          "subject");
    Check(X509_set_issuer_name(x509, name) == 1, "issuer");
    AddExtension(x509, NID_basic_constraints, "critical,CA:TRUE");
    AddExtension(x509, NID_subject_key_identifier, "hash");
    AddExtension(x509, NID_subject_alt_name, "IP:127.0.0.1,DNS:localhost");
    Check(X509_sign(x509, key.get(), EVP_sha256()) > 0, "signing");

    WritePem(certificateFile, [&](BIO* bio) { return PEM_write_bio_X509(bio, x509); });
    WritePem(privateKeyFile,
             [&](BIO* bio) { return PEM_write_bio_PrivateKey(bio, key.get(), nullptr, nullptr, 0, nullptr, nullptr); });
}

}  // namespace reliability
