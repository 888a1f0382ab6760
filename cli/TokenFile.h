#pragma once
// The access token read from a file, so that it stays off the command line,
// where every local user can read it.

#include <string>

namespace tolmonetsync {
namespace cli {

// The first line of the file, without the white space around it. Throws
// UsageError, naming the file and the fix, unless the file is a regular file
// that nobody but its owner may read or write, and holds a token.
std::string ReadTokenFile(const std::string& path);

}  // namespace cli
}  // namespace tolmonetsync
