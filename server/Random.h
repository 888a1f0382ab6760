#pragma once
// Random text from OpenSSL's generator. Throws std::runtime_error if the
// generator fails. Threads: any.

#include <cstddef>
#include <string>

namespace tolmonetsync {
namespace server {

// Lower-case hexadecimal text of that many random bytes: ids and entity tags.
std::string RandomHex(std::size_t bytes);
// URL-safe text (A-Z a-z 0-9 - _) of that many random bytes: tokens, salts.
std::string RandomUrlSafe(std::size_t bytes);
// Raw random bytes.
std::string RandomBytes(std::size_t bytes);
// SHA-256 of the text as lower-case hexadecimal.
std::string Sha256Hex(const std::string& text);

}  // namespace server
}  // namespace tolmonetsync
