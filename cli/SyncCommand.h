#pragma once
// `tolmonetsync sync`: keeps the directories and files named on the command
// line in step with the asset service.

#include <string>
#include <vector>

#include "cli/CommandLine.h"

namespace tolmonetsync {
namespace cli {

// The arguments after "sync" (global options may be among them). Returns the
// exit status: 0 done, 1 the sync failed, 2 bad usage.
int RunSync(GlobalOptions globals, const std::vector<std::string>& arguments);

}  // namespace cli
}  // namespace tolmonetsync
