#pragma once
// The local asset service: a real HTTP service on loopback, storing users,
// tokens and assets in SQLite under a data directory and content as files
// beside it. Host developers run it, tests start it in-process on port 0.
//
// Every request under /api needs "Authorization: Bearer TOKEN"; a missing or
// unknown token is 401 with a one-line text. Each user sees only their own
// tree. Routes and answers: server/AssetRoutes.h. Refusals are one line of
// text with the status AssetStore gives; a malformed request is 400.
//
// Lifetime. The constructor opens the storage and records the users and
// tokens; Start binds and serves on a thread of its own; Stop (also from the
// destructor) ends every connection and waits for the threads. A service
// may be started again on the same data directory after a stop, and what it
// acknowledged before is there.
//
// Threads: Port, Faults, SetAnswerStyle, Assets and Accounts may be used from
// any thread while the service runs. Start and Stop from one thread.

#include <cstdint>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include <httplib.h>

#include "server/AnswerStyle.h"
#include "server/BodyGate.h"
#include "server/FaultHooks.h"
#include "server/SignInThrottle.h"

namespace tolmonetsync {
namespace server {

class Accounts;
class AssetStore;
class ContentFiles;
class DataDirectoryLock;
class Database;
class Router;
class Sessions;

struct ServiceUser {
    std::string mName;
    std::string mPassword;
    std::string mEmail;  // empty: NAME@localhost
};

struct ServiceToken {
    std::string mUser;
    std::string mToken;
};

struct LocalServiceOptions {
    std::string mDataDirectory;
    std::string mHost = "127.0.0.1";
    int mPort = 0;  // 0 picks a free port
    std::vector<ServiceUser> mUsers;
    std::vector<ServiceToken> mTokens;
    std::int64_t mTokenTtlSeconds = 0;  // for mTokens; 0 never expires
    int mWorkers = 32;                  // each kept-alive connection holds one while it lasts
    // Defences against slow and greedy clients. A connection whose client
    // sends or reads nothing for the time-out is closed. Over the cap a new
    // connection waits to be accepted, never refused: server/ConnectionQueue.h.
    int mReadTimeoutSeconds = 10;
    int mWriteTimeoutSeconds = 10;
    int mMaxConnections = 128;   // open at once, served or waiting for a worker
    SignInDelays mSignInDelays;  // the growing wait after failed sign-ins
    // Users whose sign-in is refused with "access_denied_non_t1".
    std::vector<std::string> mDeniedUsers;
    // Either given: HTTPS with this certificate chain and private key (PEM
    // files), else plain HTTP.
    std::string mCertificateFile;
    std::string mPrivateKeyFile;
    // Uploads over this many bytes are refused with 413 (1 GiB).
    std::uint64_t mMaxUploadBytes = std::uint64_t(1) << 30;
};

class LocalService {
public:
    // Throws DataDirectoryInUse if another service (in any process) has the
    // data directory, and std::runtime_error (DatabaseError among them) if
    // the storage cannot be opened. A new data directory is made 0700, the
    // database and content files 0600.
    explicit LocalService(const LocalServiceOptions& options);
    ~LocalService();
    LocalService(const LocalService&) = delete;
    LocalService& operator=(const LocalService&) = delete;

    // Binds and starts serving; throws std::runtime_error if it cannot bind
    // or cannot read the certificate and key it was given.
    void Start();
    void Stop();

    int Port() const;
    // Whether it serves HTTPS.
    bool Secure() const;
    // "http://127.0.0.1:PORT/api" ("https" with a certificate), the client's base URL.
    std::string AssetServiceUrl() const;
    // "http://127.0.0.1:PORT/ovra" (or "https"), the identity service's base URL.
    std::string IdentityServiceUrl() const;

    FaultHooks& Faults() { return mFaults; }
    void SetAnswerStyle(const AnswerStyle& style);
    AnswerStyle GetAnswerStyle() const;
    Accounts& GetAccounts() { return *mAccounts; }
    AssetStore& Assets() { return *mAssets; }
    ContentFiles& Content() { return *mContent; }

private:
    // Who may send this request, from its headers alone.
    Admission Admit(const httplib::Request& request) const;
    // With the body read: a fault, or the route's answer.
    void Answer(const httplib::Request& request, httplib::Response& response, const Admission& admission,
                ContentFiles::Incoming* upload);
    void Serve(const httplib::Request& request, httplib::Response& response, std::int64_t user,
               ContentFiles::Incoming* upload);
    // Handled means the fault is the whole answer.
    bool ApplyFault(const FaultRule& rule, const httplib::Request& request, httplib::Response& response);

    LocalServiceOptions mOptions;
    std::unique_ptr<DataDirectoryLock> mLock;  // first made, last gone
    std::unique_ptr<Database> mDatabase;
    std::unique_ptr<ContentFiles> mContent;
    std::unique_ptr<Accounts> mAccounts;
    std::unique_ptr<AssetStore> mAssets;
    std::unique_ptr<Router> mRouter;
    std::unique_ptr<Sessions> mSessions;
    std::unique_ptr<SignInThrottle> mThrottle;
    std::unique_ptr<Router> mIdentityRouter;
    std::unique_ptr<BodyGate> mGate;
    std::unique_ptr<httplib::Server> mServer;
    std::thread mThread;
    int mPort = 0;
    FaultHooks mFaults;
    mutable std::mutex mStyleMutex;  // guards mStyle
    AnswerStyle mStyle;
};

}  // namespace server
}  // namespace tolmonetsync
