#pragma once
// `tolmonetsync doctor`: what needs attention in the sign-in, the service,
// the clock, the cache file, the registered folders and the backups. It reads
// and sends one GET; it never prepares a sync or writes a file.

#include <string>
#include <vector>

#include "cli/CommandLine.h"

namespace tolmonetsync {
namespace cli {

// Exit status 0 when nothing needs attention, 1 otherwise, 2 bad usage.
int RunDoctor(GlobalOptions globals, const std::vector<std::string>& arguments);

}  // namespace cli
}  // namespace tolmonetsync
