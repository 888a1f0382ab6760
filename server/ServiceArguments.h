#pragma once
// The service's command-line values: "--user NAME:PASSWORD[:EMAIL]",
// "--token NAME:TOKEN", "--listen HOST:PORT" and the numbers. Each throws
// std::invalid_argument with a one-line reason for a value it cannot take.

#include <cstdint>
#include <string>

#include "server/LocalService.h"

namespace tolmonetsync {
namespace server {

// The password runs to the last ':' only when what follows it holds an '@',
// so a password may itself hold ':'.
ServiceUser ParseUserArgument(const std::string& text);
ServiceToken ParseTokenArgument(const std::string& text);
// Only loopback hosts: the service is for one machine.
void ParseListenArgument(const std::string& text, LocalServiceOptions& options);
// A whole number of seconds, at least 1.
std::int64_t ParseSecondsArgument(const std::string& text);
// A whole number of bytes, at least 1.
std::uint64_t ParseBytesArgument(const std::string& text);

}  // namespace server
}  // namespace tolmonetsync
