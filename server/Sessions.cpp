#include "server/Sessions.h"

#include <chrono>

#include "server/Random.h"

namespace tolmonetsync {
namespace server {

namespace {

const std::size_t kTokenBytes = 24;

const char kSchema[] =
    "CREATE TABLE IF NOT EXISTS sessions ("
    " device_hash TEXT PRIMARY KEY, user_id INTEGER NOT NULL, refresh_hash TEXT NOT NULL UNIQUE,"
    " used INTEGER NOT NULL DEFAULT 0);"
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
    // Data directories made before sessions could end lack the column; their
    // sessions count as used now.
    bool hasUsed = false;
    for (Statement column(*db, "PRAGMA table_info(sessions)"); column.Step();) hasUsed |= column.Text(1) == "used";
    if (!hasUsed) db->Exec("ALTER TABLE sessions ADD COLUMN used INTEGER NOT NULL DEFAULT 0;");
    Statement(*db, "UPDATE sessions SET used = ?1 WHERE used = 0").Bind(1, NowSeconds()).Run();
    PurgeExpired(*db);
}

void Sessions::PurgeExpired(Connection& db)
{
    const std::int64_t now = NowSeconds();
    Statement(db, "DELETE FROM sessions WHERE used <= ?1").Bind(1, now - kSessionIdleSeconds).Run();
    Statement(db,
              "DELETE FROM tokens WHERE hash IN (SELECT token_hash FROM session_tokens"
              " WHERE device_hash NOT IN (SELECT device_hash FROM sessions))")
        .Run();
    Statement(db, "DELETE FROM tokens WHERE expires != 0 AND expires <= ?1").Bind(1, now).Run();
    Statement(db,
              "DELETE FROM session_tokens WHERE token_hash NOT IN (SELECT hash FROM tokens)"
              " OR device_hash NOT IN (SELECT device_hash FROM sessions)")
        .Run();
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
    Statement(*db, "INSERT INTO sessions(device_hash, user_id, refresh_hash, used) VALUES(?1, ?2, ?3, ?4)")
        .Bind(1, Sha256Hex(issued.mDevice))
        .Bind(2, issued.mUser)
        .Bind(3, Sha256Hex(issued.mRefresh))
        .Bind(4, NowSeconds())
        .Run();
    issued.mAccess = GrantAccess(*db, issued.mUser, Sha256Hex(issued.mDevice));
    PurgeExpired(*db);
    return issued;
}

boost::optional<IssuedTokens> Sessions::Refresh(const std::string& refreshToken)
{
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    Statement find(*db, "SELECT device_hash, user_id FROM sessions WHERE refresh_hash = ?1 AND used > ?2");
    if (refreshToken.empty() ||
        !find.Bind(1, Sha256Hex(refreshToken)).Bind(2, NowSeconds() - kSessionIdleSeconds).Step())
        return boost::none;
    const std::string deviceHash = find.Text(0);
    IssuedTokens issued;
    issued.mUser = find.Int(1);
    issued.mRefresh = RandomUrlSafe(kTokenBytes);
    Statement(*db, "UPDATE sessions SET refresh_hash = ?1, used = ?2 WHERE device_hash = ?3")
        .Bind(1, Sha256Hex(issued.mRefresh))
        .Bind(2, NowSeconds())
        .Bind(3, deviceHash)
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
