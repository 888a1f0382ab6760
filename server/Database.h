#pragma once
// The service's SQLite database: one file in WAL mode under the data
// directory, a small pool of open connections, and prepared statements kept
// per connection so a request never reopens or recompiles anything.
//
// Threads. Any thread may Lease a connection; a lease is used by one thread
// at a time and goes back to the pool when it is destroyed. Writers take
// WriteLock first: one writer at a time keeps check-then-change steps whole
// without busy retries, while readers go on in parallel under WAL.
//
// Errors. Every SQLite failure throws DatabaseError with SQLite's message.

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <string>
#include <vector>

struct sqlite3;
struct sqlite3_stmt;

namespace tolmonetsync {
namespace server {

class DatabaseError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

class Connection;

// One prepared statement, reset and unbound when the object goes.
class Statement {
public:
    Statement(Connection& connection, const char* sql);
    ~Statement();
    Statement(const Statement&) = delete;
    Statement& operator=(const Statement&) = delete;

    Statement& Bind(int index, const std::string& text);
    Statement& Bind(int index, std::int64_t value);
    // True while a row is there to read.
    bool Step();
    // Runs to the end; for statements that give no rows.
    void Run();
    std::string Text(int column) const;
    std::int64_t Int(int column) const;
    bool IsNull(int column) const;

private:
    Connection& mConnection;
    sqlite3_stmt* mStatement;
};

class Connection {
public:
    explicit Connection(const std::string& path);
    ~Connection();
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    void Exec(const char* sql);
    sqlite3* Handle() const { return mDb; }
    sqlite3_stmt* Prepared(const char* sql);  // cached by text
    std::int64_t Changes() const;

private:
    sqlite3* mDb = nullptr;
    std::map<std::string, sqlite3_stmt*> mStatements;
};

// BEGIN on construction; ROLLBACK on destruction unless Commit ran.
class Transaction {
public:
    Transaction(Connection& connection, bool write);
    ~Transaction();
    void Commit();

private:
    Connection& mConnection;
    bool mDone = false;
};

class Database {
public:
    // Opens (and creates) the file and its tables. The file is made (or
    // narrowed to) mode 0600.
    explicit Database(const std::string& path, std::size_t poolSize = 4);
    ~Database();

    class Lease {
    public:
        Lease(Database& database, std::unique_ptr<Connection> connection);
        ~Lease();
        Lease(Lease&&) = default;
        Connection& operator*() const { return *mConnection; }
        Connection* operator->() const { return mConnection.get(); }

    private:
        Database* mDatabase;
        std::unique_ptr<Connection> mConnection;
    };

    Lease Acquire();
    std::mutex& WriteLock() { return mWriteMutex; }

private:
    void Release(std::unique_ptr<Connection> connection);

    std::string mPath;
    std::size_t mPoolSize;
    std::mutex mPoolMutex;  // guards mIdle
    std::vector<std::unique_ptr<Connection> > mIdle;
    std::mutex mWriteMutex;
};

}  // namespace server
}  // namespace tolmonetsync
