#pragma once
// `tolmonetsync demo`: the main job end to end on the embedded default, a
// local service on a free port with temporary data.

#include <string>
#include <vector>

#include "cli/CommandLine.h"

namespace tolmonetsync {
namespace cli {

// The arguments after "demo". Returns 0 when every sync of the demo
// succeeded, 1 otherwise, 2 for bad usage.
int RunDemo(GlobalOptions globals, const std::vector<std::string>& arguments);

}  // namespace cli
}  // namespace tolmonetsync
