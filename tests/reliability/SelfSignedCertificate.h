#pragma once
// A certificate made on the spot for tests of HTTPS on loopback: self-signed,
// for "127.0.0.1" and "localhost", valid from a minute ago for a day, with
// a new P-256 key. Being its own issuer, it is also the CA file that makes a
// client trust it.

#include <filesystem>

namespace reliability {

// Writes the certificate and its private key as PEM files. Throws
// std::runtime_error if OpenSSL fails at any step.
void WriteSelfSignedCertificate(const std::filesystem::path& certificateFile,
                                const std::filesystem::path& privateKeyFile);

}  // namespace reliability
