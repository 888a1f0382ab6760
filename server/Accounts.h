#pragma once
// Users and access tokens. Passwords are kept as a random salt and a
// PBKDF2-HMAC-SHA256 hash; tokens are kept only as their SHA-256, so the
// database never holds a usable secret.
//
// Threads: any. Errors: DatabaseError from the storage; std::invalid_argument
// for an empty user name or token.

#include <atomic>
#include <cstdint>
#include <string>

#include <boost/optional.hpp>

#include "server/Database.h"

namespace tolmonetsync {
namespace server {

struct UserInfo {
    std::string mName;
    std::string mEmail;
};

class Accounts {
public:
    explicit Accounts(Database& database);

    // Creates the user or replaces its password and email. An empty email
    // becomes NAME@localhost. Gives the user's number.
    std::int64_t SetUser(const std::string& name, const std::string& password, const std::string& email);
    // Costs one password hash whether or not the user exists.
    bool CheckPassword(const std::string& name, const std::string& password);
    // How many passwords CheckPassword has hashed; the work done is visible to tests.
    std::uint64_t HashesComputed() const;
    // The user's number, made with no password if there is none yet.
    std::int64_t EnsureUser(const std::string& name);
    // A token for that user; ttlSeconds 0 never expires, and one below 0
    // has expired already (for tests of refusal).
    void GrantToken(const std::string& name, const std::string& token, std::int64_t ttlSeconds = 0);
    // Ends every access token of that user now, as their lifetime would: for
    // trying what a client does with an expired token without waiting.
    void ExpireTokensOf(const std::string& name);
    // The user a token opens, if it is known and has not expired.
    boost::optional<std::int64_t> UserForToken(const std::string& token);
    boost::optional<UserInfo> User(std::int64_t user);

private:
    std::string Hash(const std::string& password, const std::string& salt);

    Database& mDatabase;
    std::atomic<std::uint64_t> mHashesComputed{0};
};

}  // namespace server
}  // namespace tolmonetsync
