#pragma once
// `tolmonetsync backups` and `tolmonetsync restore`: the backup copies the
// library made, from its index, and putting one back.

#include <string>
#include <vector>

#include "cli/CommandLine.h"

namespace tolmonetsync {
namespace cli {

// Lists runs newest first with their copies. Exit 0, 2 for bad usage.
int RunBackups(GlobalOptions globals, const std::vector<std::string>& arguments);
// Exit 0 restored, 1 no copy or refused (one line on stderr), 2 bad usage.
int RunRestore(GlobalOptions globals, const std::vector<std::string>& arguments);

}  // namespace cli
}  // namespace tolmonetsync
