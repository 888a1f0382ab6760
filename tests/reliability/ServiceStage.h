#pragma once
// The local service and one computer's two registered folders, "Keep" and
// "Fresh", staged for tests that fail a sync on the service's side; and the
// check that such a failure lost nothing.
//
// The client signs in as the service's user "alice" under the host identity
// UseStageHost() sets (the preferences root "Co_Matrix_1.0"). Every stage has
// its own preference directory and folders, removed with it, and a client
// identifier of its own on the service it is given.
//
// Threads: the test's thread only; the service answers on its own threads.

#include <filesystem>
#include <map>
#include <memory>
#include <set>
#include <string>

#include "server/TreeSeeder.h"
#include "support/SyncHarness.h"
#include "support/TestScopes.h"
#include "support/TestService.h"

namespace reliability {

// "Group/name" -> bytes, for the registered folders and the server's groups;
// a file's name -> its backed-up copies joined by "|", for the backups.
using FileMap = std::map<std::string, std::string>;

// The host identity of every stage, and short libcurl time-outs (a stall
// fails within seconds); RestoreTimeouts puts the usual ones back.
void UseStageHost();
void RestoreTimeouts();

class Stage {
public:
    // On `service`, which outlives the stage, as a client no other stage is.
    // Stopping a service waits for its kept-alive connections to idle out (a
    // second), so a test that stages many runs shares one.
    Stage(testsupport::TestService& service, const std::string& clientId);

    // A whole two-way sync of Keep (and Fresh if asked) by a new host and client.
    synctest::RunResult Sync(bool withFresh);

    // A synced Keep group, then a change on each side, a stale group on the
    // server and a new local group: every kind of request occurs in the next
    // sync with Fresh.
    void PrepareEveryRequestKind();

    const std::filesystem::path& Keep() const { return mKeep; }
    const std::string& ClientId() const { return mClient; }
    // Replaces (or adds) the group's item of that name, as another computer would.
    void PutOnServer(const char* group, const std::string& name, const std::string& bytes);

    // The ".txt" files of both folders.
    FileMap Local() const;
    // Each name's first item in the server's Keep and Fresh groups.
    FileMap Server();
    // The backup directories' names so far.
    std::set<std::string> BackupDirs() const;
    // Every backed-up copy, but for those in the directories named in `skip`.
    FileMap Backups(const std::set<std::string>& skip = std::set<std::string>()) const;
    // The cache file's bytes, or "<none>".
    std::string CacheFile() const { return synctest::CacheFileIn(mPrefs.Path()); }
    const std::filesystem::path& PrefDir() const { return mPrefs.Path(); }
    tolmonetsync::server::LocalService& Service() { return *mService; }
    tolmonetsync::server::TreeSeeder& Seed() { return mSeed; }
    // The id of the server's group collection of that name; empty if none.
    std::string GroupId(const char* group);
    // Clients made from now on send to this base URL instead of the service's.
    void SendTo(const std::string& apiUrl) { mApiUrl = apiUrl; }

private:
    testsupport::TempDir mRoot;
    testsupport::PrefDirScope mPrefs;
    std::filesystem::path mKeep;
    std::filesystem::path mFresh;
    std::string mClient;
    std::string mApiUrl;  // empty: the service's own
    tolmonetsync::server::LocalService* mService;
    tolmonetsync::server::TreeSeeder mSeed;
};

// What a failed run may have done to the registered files: each file of
// `before` holds its old bytes or, if the server held other bytes before the
// run, those; one removed by the run was gone from the server. Whatever was
// replaced or removed has its old bytes among `backups`, and a file that is
// new holds the server's bytes. Failures name `label`.
void ExpectNothingLost(const FileMap& before, const FileMap& serverBefore, const FileMap& after, const FileMap& backups,
                       const std::string& label);

}  // namespace reliability
