#pragma once
// Sign-in sessions of the identity service: a sign-in on a device makes a
// session with a device token and a refresh token, and grants access tokens
// that the asset service accepts. A refresh rotates the refresh token (the
// old one stops working) and grants a new access token; invalidating the
// device token ends the session and withdraws its access tokens at once.
// Every token is random URL-safe text, stored only as its SHA-256.
// Expired access tokens are deleted at start-up and whenever a sign-in or a
// refresh grants a new one, so the tables hold only what can still open
// something; no timer is needed. Sessions themselves do not expire.
//
// Threads: any. Errors: DatabaseError from the storage.

#include <cstdint>
#include <string>

#include <boost/optional.hpp>

#include "server/Accounts.h"
#include "server/Database.h"

namespace tolmonetsync {
namespace server {

struct IssuedTokens {
    std::int64_t mUser = 0;
    std::string mAccess;
    std::string mRefresh;
    std::string mDevice;  // empty after a refresh: the device token stays as it was
};

class Sessions {
public:
    // A session (its refresh and device tokens) that neither signs in nor
    // refreshes for this long ends, with its access tokens.
    static const std::int64_t kSessionIdleSeconds = 30 * 24 * 3600;

    // Access tokens live `accessTtlSeconds` (0: an hour).
    Sessions(Database& database, Accounts& accounts, std::int64_t accessTtlSeconds);

    // None for an unknown user or a wrong password.
    boost::optional<IssuedTokens> SignIn(const std::string& name, const std::string& password);
    // None for a refresh token that is unknown, was rotated away, or whose
    // session went unused for kSessionIdleSeconds.
    boost::optional<IssuedTokens> Refresh(const std::string& refreshToken);
    // Ends the session of that device token; false if there was none.
    bool Invalidate(const std::string& deviceToken);

private:
    // Deletes expired access tokens, idle sessions with their tokens, and
    // links to either; the caller holds the write lock.
    void PurgeExpired(Connection& db);
    std::string GrantAccess(Connection& db, std::int64_t user, const std::string& deviceHash);

    Database& mDatabase;
    Accounts& mAccounts;
    std::int64_t mAccessTtlSeconds;
};

}  // namespace server
}  // namespace tolmonetsync
