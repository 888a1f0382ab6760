#include "SelfSignedCertificate.h"

#include <memory>
#include <stdexcept>
#include <string>

#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509v3.h>

namespace reliability {

namespace {

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

}  // namespace

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

}  // namespace reliability
