#include "server/ServiceArguments.h"

#include <cstdlib>
#include <stdexcept>

namespace tolmonetsync {
namespace server {

namespace {

const char kUrlSafe[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-_.~";

}  // namespace

ServiceUser ParseUserArgument(const std::string& text)
{
    const std::size_t first = text.find(':');
    if (first == std::string::npos || first == 0) throw std::invalid_argument("expected NAME:PASSWORD[:EMAIL]");
    ServiceUser user;
    user.mName = text.substr(0, first);
    std::string rest = text.substr(first + 1);
    const std::size_t last = rest.rfind(':');
    if (last != std::string::npos && rest.find('@', last) != std::string::npos) {
        user.mEmail = rest.substr(last + 1);
        rest.erase(last);
    }
    if (rest.empty()) throw std::invalid_argument("empty password for user " + user.mName);
    user.mPassword = rest;
    return user;
}

ServiceToken ParseTokenArgument(const std::string& text)
{
    const std::size_t colon = text.find(':');
    if (colon == std::string::npos || colon == 0 || colon + 1 == text.size()) {
        throw std::invalid_argument("expected NAME:TOKEN");
    }
    ServiceToken token{text.substr(0, colon), text.substr(colon + 1)};
    // The client sends tokens unquoted in places, so only URL-safe ones work everywhere.
    if (token.mToken.find_first_not_of(kUrlSafe) != std::string::npos) {
        throw std::invalid_argument("a token may hold only letters, digits, '-', '_', '.' and '~'");
    }
    return token;
}

void ParseListenArgument(const std::string& text, LocalServiceOptions& options)
{
    const std::size_t colon = text.rfind(':');
    if (colon == std::string::npos) throw std::invalid_argument("expected HOST:PORT");
    const std::string host = text.substr(0, colon);
    const std::string port = text.substr(colon + 1);
    if (host != "127.0.0.1" && host != "localhost") throw std::invalid_argument("the service listens on loopback only");
    char* end = nullptr;
    const long number = std::strtol(port.c_str(), &end, 10);
    if (port.empty() || *end != '\0' || number < 0 || number > 65535) throw std::invalid_argument("bad port " + port);
    options.mHost = "127.0.0.1";
    options.mPort = static_cast<int>(number);
}

std::int64_t ParseSecondsArgument(const std::string& text)
{
    std::int64_t seconds = 0;
    for (char c : text) {
        if (c < '0' || c > '9' || seconds > 100000000) throw std::invalid_argument("expected a number of seconds");
        seconds = seconds * 10 + (c - '0');
    }
    if (seconds < 1) throw std::invalid_argument("expected a number of seconds, at least 1");
    return seconds;
}

std::uint64_t ParseBytesArgument(const std::string& text)
{
    std::uint64_t bytes = 0;
    for (char c : text) {
        if (c < '0' || c > '9' || bytes > (std::uint64_t(1) << 60))
            throw std::invalid_argument("expected a number of bytes");
        bytes = bytes * 10 + static_cast<std::uint64_t>(c - '0');
    }
    if (bytes < 1) throw std::invalid_argument("expected a number of bytes, at least 1");
    return bytes;
}

}  // namespace server
}  // namespace tolmonetsync
