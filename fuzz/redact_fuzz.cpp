// The trace redaction on arbitrary text: it never crashes, and a secret
// planted in any form it knows (query field, percent-encoded key, JSON member
// at any depth, header line), with arbitrary text before and after, never
// survives.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "foundation/core/Redaction.h"

namespace {

const char* const kKeys[] = {"password",     "client_secret", "refresh_token", "token",
                             "bearer_token", "access_token",  "device_token",  "Authorization"};
const char kMarker[] = "PLANTED";

// The key in the case that `bits` choose, letter by letter.
std::string Spelled(const std::string& key, unsigned bits)
{
    std::string spelled = key;
    for (std::size_t i = 0; i < spelled.size(); ++i) {
        const char c = spelled[i];
        if (((bits >> (i % 8)) & 1) != 0 && c >= 'a' && c <= 'z') spelled[i] = static_cast<char>(c - 'a' + 'A');
    }
    return spelled;
}

std::string Planted(int shape, const std::string& key)
{
    switch (shape) {
        case 0:
            return "?" + key + "=" + kMarker + "%2fsecret&";
        case 1:  // the key's first letter percent-encoded
            return "&%" + std::string(1, "0123456789abcdef"[(key[0] >> 4) & 15]) +
                   std::string(1, "0123456789abcdef"[key[0] & 15]) + key.substr(1) + "=" + kMarker;
        case 2:
            return "{\"" + key + "\" : \"" + kMarker + "\\\"x\"}";
        case 3:
            return "{\"\\u00" + std::string(1, "0123456789abcdef"[(key[0] >> 4) & 15]) +
                   std::string(1, "0123456789abcdef"[key[0] & 15]) + key.substr(1) + "\":[{\"a\":\"" + kMarker +
                   "\"}]}";
        case 4:
            return "{\"" + key + "\":" + kMarker + "}";
        default:
            return "\n" + key + ": Bearer " + kMarker + "\n";
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const std::string input(reinterpret_cast<const char*>(data), size);
    (void)tolmocore::debug::RedactSecrets(input);
    if (size < 3 || input.find(kMarker) != std::string::npos) return 0;

    // Two bytes choose the key, its case and the form; the rest is split
    // around the planted secret.
    const std::string key = Spelled(kKeys[data[0] % 8], data[1]);
    const int shape = (data[0] / 8) % 6;
    const std::string rest = input.substr(3);
    const std::size_t cut = rest.empty() ? 0 : data[2] % (rest.size() + 1);
    const std::string text = rest.substr(0, cut) + Planted(shape, key) + rest.substr(cut);
    if (tolmocore::debug::RedactSecrets(text).find(kMarker) != std::string::npos) std::abort();
    return 0;
}
