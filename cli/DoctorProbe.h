#pragma once
// The doctor's look at the sign-in: what is stored, and what the service says
// to it. The connection check of the library folds every failure into one
// state; the doctor sends its own root request (a GET) to tell them apart.

#include <string>
#include <vector>

#include "cli/DoctorChecks.h"

namespace tolmonetsync {
namespace cli {

struct StoredSignIn {
    std::string mUser;         // from the last-user file; empty if none
    std::string mAccessToken;  // from the keychain; never printed
    DoctorFinding mFinding;    // "sign-in"
};

// The last-user file and the keychain of the current host identity and
// preference directory, and whether they agree. Reads only.
StoredSignIn CheckStoredSignIn();

// GET SERVICE/collections?name=CLIENT with the token (none if empty), once:
// a "service" finding (accepted, 401, refused connection, TLS failure, 5xx)
// and a "clock" finding from the answer's Date header.
std::vector<DoctorFinding> ProbeService(const std::string& serviceUrl, const std::string& clientId,
                                        const std::string& token);

// How far a clock may be off before the doctor says so.
constexpr long kClockToleranceSeconds = 120;

}  // namespace cli
}  // namespace tolmonetsync
