#pragma once
// `tolmonetsync serve`: the local asset service in the foreground until
// SIGINT or SIGTERM.

#include <string>
#include <vector>

#include "cli/CommandLine.h"

namespace tolmonetsync {
namespace cli {

// Runs the command with the arguments after "serve" (global options may be
// among them). Returns the exit
// status: 0 after a clean stop, 1 when the service fails, 2 for bad usage.
int RunServe(GlobalOptions globals, const std::vector<std::string>& arguments);

}  // namespace cli
}  // namespace tolmonetsync
