#include "server/Database.h"

#include <cerrno>
#include <cstring>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <sqlite3.h>

namespace tolmonetsync {
namespace server {

namespace {

const char kSchema[] =
    "CREATE TABLE IF NOT EXISTS users ("
    " id INTEGER PRIMARY KEY AUTOINCREMENT, name TEXT NOT NULL UNIQUE,"
    " salt BLOB, hash BLOB, email TEXT NOT NULL);"
    "CREATE TABLE IF NOT EXISTS tokens ("
    " hash TEXT PRIMARY KEY, user_id INTEGER NOT NULL, expires INTEGER NOT NULL);"
    "CREATE TABLE IF NOT EXISTS assets ("
    " seq INTEGER PRIMARY KEY AUTOINCREMENT, id TEXT NOT NULL UNIQUE, owner INTEGER NOT NULL,"
    " collection INTEGER NOT NULL, media_type TEXT NOT NULL, name TEXT NOT NULL,"
    " size INTEGER NOT NULL DEFAULT 0, etag TEXT NOT NULL DEFAULT '',"
    " created INTEGER NOT NULL, modified INTEGER NOT NULL, trashed INTEGER NOT NULL DEFAULT 0,"
    " client_id TEXT);"
    "CREATE INDEX IF NOT EXISTS assets_owner ON assets(owner, seq);"
    // A search by name reads only the assets so named, however large their collection.
    "CREATE INDEX IF NOT EXISTS assets_name ON assets(owner, name, trashed);"
    "CREATE UNIQUE INDEX IF NOT EXISTS assets_client_root ON assets(owner, client_id)"
    " WHERE client_id IS NOT NULL;"
    "CREATE TABLE IF NOT EXISTS members ("
    " collection TEXT NOT NULL, asset TEXT NOT NULL, ord INTEGER NOT NULL,"
    " PRIMARY KEY(collection, asset));"
    "CREATE INDEX IF NOT EXISTS members_order ON members(collection, ord);"
    "CREATE INDEX IF NOT EXISTS members_asset ON members(asset);";

void Check(sqlite3* db, int rc)
{
    if (rc != SQLITE_OK && rc != SQLITE_ROW && rc != SQLITE_DONE) {
        throw DatabaseError(db ? sqlite3_errmsg(db) : sqlite3_errstr(rc));
    }
}

// SQLite makes its WAL and shared-memory files with the database's own mode,
// so a database made 0600 keeps all three readable by the service's user alone.
void MakePrivateFile(const std::string& path)
{
    const int fd = ::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
    if (fd < 0) throw DatabaseError("cannot open " + path + ": " + std::strerror(errno));
    struct stat status {};
    // One made by an older service may be wider; it holds password hashes.
    if (::fstat(fd, &status) == 0 && (status.st_mode & 077) != 0) ::fchmod(fd, status.st_mode & 0700);
    ::close(fd);
}

}  // namespace

// --- Statement ---

Statement::Statement(Connection& connection, const char* sql)
    : mConnection(connection), mStatement(connection.Prepared(sql))
{
}

Statement::~Statement()
{
    sqlite3_reset(mStatement);
    sqlite3_clear_bindings(mStatement);
}

Statement& Statement::Bind(int index, const std::string& text)
{
    Check(mConnection.Handle(),
          sqlite3_bind_text(mStatement, index, text.data(), static_cast<int>(text.size()), SQLITE_TRANSIENT));
    return *this;
}

Statement& Statement::Bind(int index, std::int64_t value)
{
    Check(mConnection.Handle(), sqlite3_bind_int64(mStatement, index, value));
    return *this;
}

bool Statement::Step()
{
    const int rc = sqlite3_step(mStatement);
    Check(mConnection.Handle(), rc);
    return rc == SQLITE_ROW;
}

void Statement::Run()
{
    while (Step()) {
    }
}

std::string Statement::Text(int column) const
{
    const auto* text = reinterpret_cast<const char*>(sqlite3_column_blob(mStatement, column));
    const int size = sqlite3_column_bytes(mStatement, column);
    return text ? std::string(text, static_cast<std::size_t>(size)) : std::string();
}

std::int64_t Statement::Int(int column) const
{
    return sqlite3_column_int64(mStatement, column);
}

bool Statement::IsNull(int column) const
{
    return sqlite3_column_type(mStatement, column) == SQLITE_NULL;
}

// --- Connection ---

Connection::Connection(const std::string& path)
{
    const int rc =
        sqlite3_open_v2(path.c_str(), &mDb, SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE | SQLITE_OPEN_NOMUTEX, nullptr);
    if (rc != SQLITE_OK) {
        const std::string message = mDb ? sqlite3_errmsg(mDb) : sqlite3_errstr(rc);
        sqlite3_close(mDb);
        throw DatabaseError("cannot open " + path + ": " + message);
    }
    sqlite3_busy_timeout(mDb, 10000);
    // FULL makes each commit durable in WAL mode, so an acknowledged change survives a crash.
    Exec("PRAGMA journal_mode=WAL; PRAGMA synchronous=FULL; PRAGMA foreign_keys=ON;");
}

Connection::~Connection()
{
    for (auto& entry : mStatements) sqlite3_finalize(entry.second);
    sqlite3_close(mDb);
}

void Connection::Exec(const char* sql)
{
    char* message = nullptr;
    if (sqlite3_exec(mDb, sql, nullptr, nullptr, &message) != SQLITE_OK) {
        const std::string text = message ? message : "unknown SQLite error";
        sqlite3_free(message);
        throw DatabaseError(text);
    }
}

sqlite3_stmt* Connection::Prepared(const char* sql)
{
    auto found = mStatements.find(sql);
    if (found != mStatements.end()) return found->second;
    sqlite3_stmt* statement = nullptr;
    Check(mDb, sqlite3_prepare_v2(mDb, sql, -1, &statement, nullptr));
    mStatements.emplace(sql, statement);
    return statement;
}

std::int64_t Connection::Changes() const
{
    return sqlite3_changes64(mDb);
}

// --- Transaction ---

Transaction::Transaction(Connection& connection, bool write) : mConnection(connection)
{
    mConnection.Exec(write ? "BEGIN IMMEDIATE" : "BEGIN");
}

Transaction::~Transaction()
{
    if (mDone) return;
    try {
        mConnection.Exec("ROLLBACK");
    } catch (const DatabaseError&) {
        // Nothing more to undo: SQLite has already rolled back.
    }
}

void Transaction::Commit()
{
    mConnection.Exec("COMMIT");
    mDone = true;
}

// --- Database ---

Database::Database(const std::string& path, std::size_t poolSize) : mPath(path), mPoolSize(poolSize)
{
    MakePrivateFile(path);
    auto first = std::make_unique<Connection>(path);
    first->Exec(kSchema);
    mIdle.push_back(std::move(first));
}

Database::~Database() = default;

Database::Lease::Lease(Database& database, std::unique_ptr<Connection> connection)
    : mDatabase(&database), mConnection(std::move(connection))
{
}

Database::Lease::~Lease()
{
    if (mConnection) mDatabase->Release(std::move(mConnection));
}

Database::Lease Database::Acquire()
{
    {
        std::lock_guard<std::mutex> lock(mPoolMutex);
        if (!mIdle.empty()) {
            std::unique_ptr<Connection> connection = std::move(mIdle.back());
            mIdle.pop_back();
            return Lease(*this, std::move(connection));
        }
    }
    // More requests than pooled connections: open one; it joins the pool if there is room.
    return Lease(*this, std::make_unique<Connection>(mPath));
}

void Database::Release(std::unique_ptr<Connection> connection)
{
    std::lock_guard<std::mutex> lock(mPoolMutex);
    if (mIdle.size() < mPoolSize) mIdle.push_back(std::move(connection));
}

}  // namespace server
}  // namespace tolmonetsync
