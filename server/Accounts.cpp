#include "server/Accounts.h"

#include <chrono>
#include <stdexcept>

#include <openssl/evp.h>

#include "server/Random.h"

namespace tolmonetsync {
namespace server {

namespace {

const int kIterations = 60000;
const std::size_t kSaltBytes = 16;
const std::size_t kHashBytes = 32;

std::string Derive(const std::string& password, const std::string& salt)
{
    std::string hash(kHashBytes, '\0');
    if (PKCS5_PBKDF2_HMAC(password.data(), static_cast<int>(password.size()),
                          reinterpret_cast<const unsigned char*>(salt.data()), static_cast<int>(salt.size()),
                          kIterations, EVP_sha256(), static_cast<int>(kHashBytes),
                          reinterpret_cast<unsigned char*>(&hash[0])) != 1) {
        throw std::runtime_error("password hashing failed");
    }
    return hash;
}

std::int64_t NowSeconds()
{
    return std::chrono::duration_cast<std::chrono::seconds>(std::chrono::system_clock::now().time_since_epoch())
        .count();
}

bool SameBytes(const std::string& a, const std::string& b)
{
    // No early exit, so the time taken tells nothing about the hash.
    if (a.size() != b.size()) return false;
    unsigned char diff = 0;
    for (std::size_t i = 0; i < a.size(); ++i) diff |= static_cast<unsigned char>(a[i] ^ b[i]);
    return diff == 0;
}

}  // namespace

Accounts::Accounts(Database& database) : mDatabase(database) {}

std::int64_t Accounts::SetUser(const std::string& name, const std::string& password, const std::string& email)
{
    if (name.empty()) throw std::invalid_argument("empty user name");
    const std::string salt = RandomBytes(kSaltBytes);
    const std::string hash = Hash(password, salt);
    const std::string mail = email.empty() ? name + "@localhost" : email;
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    Statement(*db,
              "INSERT INTO users(name, salt, hash, email) VALUES(?1, ?2, ?3, ?4)"
              " ON CONFLICT(name) DO UPDATE SET salt = ?2, hash = ?3, email = ?4")
        .Bind(1, name)
        .Bind(2, salt)
        .Bind(3, hash)
        .Bind(4, mail)
        .Run();
    Statement find(*db, "SELECT id FROM users WHERE name = ?1");
    find.Bind(1, name).Step();
    return find.Int(0);
}

bool Accounts::CheckPassword(const std::string& name, const std::string& password)
{
    std::string salt;
    std::string hash;
    {
        Database::Lease db = mDatabase.Acquire();
        Statement find(*db, "SELECT salt, hash FROM users WHERE name = ?1");
        if (find.Bind(1, name).Step() && !find.IsNull(0)) {
            salt = find.Text(0);
            hash = find.Text(1);
        }
    }
    // An unknown user (or one without a password) costs the same hash as a
    // wrong password, so the time of the answer does not tell which names exist.
    const bool known = !salt.empty();
    const std::string derived = Hash(password, known ? salt : std::string(kSaltBytes, '\0'));
    return SameBytes(derived, known ? hash : std::string(kHashBytes, '\0')) && known;
}

std::string Accounts::Hash(const std::string& password, const std::string& salt)
{
    ++mHashesComputed;
    return Derive(password, salt);
}

std::uint64_t Accounts::HashesComputed() const
{
    return mHashesComputed;
}

std::int64_t Accounts::EnsureUser(const std::string& name)
{
    if (name.empty()) throw std::invalid_argument("empty user name");
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    Statement(*db, "INSERT OR IGNORE INTO users(name, email) VALUES(?1, ?2)")
        .Bind(1, name)
        .Bind(2, name + "@localhost")
        .Run();
    Statement find(*db, "SELECT id FROM users WHERE name = ?1");
    find.Bind(1, name).Step();
    return find.Int(0);
}

void Accounts::GrantToken(const std::string& name, const std::string& token, std::int64_t ttlSeconds)
{
    if (token.empty()) throw std::invalid_argument("empty token");
    const std::int64_t user = EnsureUser(name);
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    Statement(*db, "INSERT OR REPLACE INTO tokens(hash, user_id, expires) VALUES(?1, ?2, ?3)")
        .Bind(1, Sha256Hex(token))
        .Bind(2, user)
        .Bind(3, ttlSeconds != 0 ? NowSeconds() + ttlSeconds : std::int64_t(0))
        .Run();
}

void Accounts::ExpireTokensOf(const std::string& name)
{
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    Statement(*db, "UPDATE tokens SET expires = 1 WHERE user_id = (SELECT id FROM users WHERE name = ?1)")
        .Bind(1, name)
        .Run();
}

boost::optional<std::int64_t> Accounts::UserForToken(const std::string& token)
{
    if (token.empty()) return boost::none;
    Database::Lease db = mDatabase.Acquire();
    Statement find(*db, "SELECT user_id, expires FROM tokens WHERE hash = ?1");
    if (!find.Bind(1, Sha256Hex(token)).Step()) return boost::none;
    const std::int64_t expires = find.Int(1);
    if (expires != 0 && expires <= NowSeconds()) return boost::none;
    return find.Int(0);
}

boost::optional<UserInfo> Accounts::User(std::int64_t user)
{
    Database::Lease db = mDatabase.Acquire();
    Statement find(*db, "SELECT name, email FROM users WHERE id = ?1");
    if (!find.Bind(1, user).Step()) return boost::none;
    return UserInfo{find.Text(0), find.Text(1)};
}

}  // namespace server
}  // namespace tolmonetsync
