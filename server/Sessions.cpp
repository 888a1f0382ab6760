#include "server/Sessions.h"

#include <chrono>

#include "server/Random.h"

namespace tolmonetsync {
namespace server {

namespace {

const std::size_t kTokenBytes = 24;

const char kSchema[] =
    "CREATE TABLE IF NOT EXISTS sessions ("
    " device_hash TEXT PRIMARY KEY, user_id INTEGER NOT NULL, refresh_hash TEXT NOT NULL UNIQUE);"
    "CREATE TABLE IF NOT EXISTS session_tokens ("
    " token_hash TEXT PRIMARY KEY, device_hash TEXT NOT NULL);"
    "CREATE INDEX IF NOT EXISTS session_tokens_device ON session_tokens(device_hash);";

std::int64_t NowSeconds()
{
    return std::chrono::duration_cast<std::chrono::seconds>(std::chrono::system_clock::now().time_since_epoch())
        .count();
}

}  // namespace

Sessions::Sessions(Database& database, Accounts& accounts, std::int64_t accessTtlSeconds)
    : mDatabase(database), mAccounts(accounts), mAccessTtlSeconds(accessTtlSeconds > 0 ? accessTtlSeconds : 3600)
{
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    db->Exec(kSchema);
    PurgeExpired(*db);
}

void Sessions::PurgeExpired(Connection& db)
{
    Statement(db, "DELETE FROM tokens WHERE expires != 0 AND expires <= ?1").Bind(1, NowSeconds()).Run();
    Statement(db, "DELETE FROM session_tokens WHERE token_hash NOT IN (SELECT hash FROM tokens)").Run();
}

std::string Sessions::GrantAccess(Connection& db, std::int64_t user, const std::string& deviceHash)
{
    const std::string access = RandomUrlSafe(kTokenBytes);
    Statement(db, "INSERT INTO tokens(hash, user_id, expires) VALUES(?1, ?2, ?3)")
        .Bind(1, Sha256Hex(access))
        .Bind(2, user)
        .Bind(3, NowSeconds() + mAccessTtlSeconds)
        .Run();
    Statement(db, "INSERT INTO session_tokens(token_hash, device_hash) VALUES(?1, ?2)")
        .Bind(1, Sha256Hex(access))
        .Bind(2, deviceHash)
        .Run();
    return access;
}

boost::optional<IssuedTokens> Sessions::SignIn(const std::string& name, const std::string& password)
{
    if (!mAccounts.CheckPassword(name, password)) return boost::none;
    IssuedTokens issued;
    issued.mUser = mAccounts.EnsureUser(name);
    issued.mDevice = RandomUrlSafe(kTokenBytes);
    issued.mRefresh = RandomUrlSafe(kTokenBytes);
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    Statement(*db, "INSERT INTO sessions(device_hash, user_id, refresh_hash) VALUES(?1, ?2, ?3)")
        .Bind(1, Sha256Hex(issued.mDevice))
        .Bind(2, issued.mUser)
        .Bind(3, Sha256Hex(issued.mRefresh))
        .Run();
    issued.mAccess = GrantAccess(*db, issued.mUser, Sha256Hex(issued.mDevice));
    PurgeExpired(*db);
    return issued;
}

boost::optional<IssuedTokens> Sessions::Refresh(const std::string& refreshToken)
{
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    Statement find(*db, "SELECT device_hash, user_id FROM sessions WHERE refresh_hash = ?1");
    if (refreshToken.empty() || !find.Bind(1, Sha256Hex(refreshToken)).Step()) return boost::none;
    const std::string deviceHash = find.Text(0);
    IssuedTokens issued;
    issued.mUser = find.Int(1);
    issued.mRefresh = RandomUrlSafe(kTokenBytes);
    Statement(*db, "UPDATE sessions SET refresh_hash = ?1 WHERE device_hash = ?2")
        .Bind(1, Sha256Hex(issued.mRefresh))
        .Bind(2, deviceHash)
        .Run();
    issued.mAccess = GrantAccess(*db, issued.mUser, deviceHash);
    PurgeExpired(*db);
    return issued;
}

bool Sessions::Invalidate(const std::string& deviceToken)
{
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    const std::string deviceHash = Sha256Hex(deviceToken);
    Statement find(*db, "SELECT 1 FROM sessions WHERE device_hash = ?1");
    if (!find.Bind(1, deviceHash).Step()) return false;
    Statement(*db, "DELETE FROM tokens WHERE hash IN (SELECT token_hash FROM session_tokens WHERE device_hash = ?1)")
        .Bind(1, deviceHash)
        .Run();
    Statement(*db, "DELETE FROM session_tokens WHERE device_hash = ?1").Bind(1, deviceHash).Run();
    Statement(*db, "DELETE FROM sessions WHERE device_hash = ?1").Bind(1, deviceHash).Run();
    return true;
}

}  // namespace server
}  // namespace tolmonetsync
