#pragma once
// `tolmonetsync login`, `logout` and `status`: the stored sign-in of the host
// identity and preference directory the global options name.

#include <string>
#include <vector>

#include "assets/SyncServer.h"
#include "cli/CommandLine.h"

namespace tolmonetsync {
namespace cli {

int RunLogin(GlobalOptions globals, const std::vector<std::string>& arguments);
int RunLogout(GlobalOptions globals, const std::vector<std::string>& arguments);
int RunStatus(GlobalOptions globals, const std::vector<std::string>& arguments);

// The keychain domain of this host identity's "Access" or "Refresh" entry,
// named as the client names it.
UTF16String OvraKeychainDomain(const char16_t* kind);

// "connected", "not-logged-in", "connection-failed".
const char* ConnectionStateName(SyncServer_ConnectionState state);

}  // namespace cli
}  // namespace tolmonetsync
