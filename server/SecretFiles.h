#pragma once
// Users and tokens read from files, so that no secret has to stand on a
// command line where every local user can read it.
//
// A file is taken only if it is a regular file that its owner alone may
// read or write (no group or other permission bits). One entry a line:
// "NAME:PASSWORD[:EMAIL]" in a users file, "NAME:TOKEN" in a tokens file, as
// the arguments --user and --token take them; blank lines and lines that
// start with '#' are skipped.
//
// Errors: std::invalid_argument with a one-line reason that names the file
// (and the line for a malformed entry) and never holds a secret.

#include <string>
#include <vector>

#include "server/LocalService.h"

namespace tolmonetsync {
namespace server {

std::vector<ServiceUser> ReadUsersFile(const std::string& path);
std::vector<ServiceToken> ReadTokensFile(const std::string& path);

}  // namespace server
}  // namespace tolmonetsync
