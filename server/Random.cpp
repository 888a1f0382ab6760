#include "server/Random.h"

#include <stdexcept>

#include <openssl/evp.h>
#include <openssl/rand.h>

namespace tolmonetsync {
namespace server {

namespace {

std::string Hex(const unsigned char* data, std::size_t size)
{
    static const char kDigits[] = "0123456789abcdef";
    std::string text;
    text.reserve(size * 2);
    for (std::size_t i = 0; i < size; ++i) {
        text += kDigits[data[i] >> 4];
        text += kDigits[data[i] & 15];
    }
    return text;
}

}  // namespace

std::string RandomBytes(std::size_t bytes)
{
    std::string data(bytes, '\0');
    if (bytes && RAND_bytes(reinterpret_cast<unsigned char*>(&data[0]), static_cast<int>(bytes)) != 1) {
        throw std::runtime_error("random generator failed");
    }
    return data;
}

std::string RandomHex(std::size_t bytes)
{
    const std::string data = RandomBytes(bytes);
    return Hex(reinterpret_cast<const unsigned char*>(data.data()), data.size());
}

std::string RandomUrlSafe(std::size_t bytes)
{
    static const char kAlphabet[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-_";
    const std::string data = RandomBytes(bytes);
    std::string text;
    for (unsigned char c : data) text += kAlphabet[c & 63];
    return text;
}

std::string Sha256Hex(const std::string& text)
{
    unsigned char digest[EVP_MAX_MD_SIZE];
    unsigned int size = 0;
    if (EVP_Digest(text.data(), text.size(), digest, &size, EVP_sha256(), nullptr) != 1) {
        throw std::runtime_error("hash failed");
    }
    return Hex(digest, size);
}

}  // namespace server
}  // namespace tolmonetsync
