#pragma once
// One sync as the command line runs it: preview, the group guard, prepare,
// the pass, and what is printed about each. Shared by `sync` and `demo`.

#include <ostream>
#include <string>
#include <vector>

#include "sync/SyncFilesService.h"
#include "sync/SyncRecords.h"

namespace tolmonetsync {
namespace cli {

struct SyncJob {
    std::string mServer;  // empty: the client's built-in base URL
    std::string mClientId;
    std::string mToken;  // empty without mAutoLogin: the stored sign-in, proved first
    bool mAutoLogin = false;
    std::vector<std::string> mMigrate;  // "major", "previous-major"
    std::vector<SyncDir> mDirs;
    std::vector<SyncFile> mFiles;
    SyncMode mMode = SyncMode_TwoWay;
    bool mDryRun = false;
    bool mPruneGroups = false;
    bool mKeepServerCopies = false;  // the server's version, before an upload replaces it
    SyncLimits mLimits;       // off unless --max-delete or --max-overwrite
    bool mEveryFile = false;  // -v: a long plan is listed whole
};

enum class Output {
    Text,   // plan, progress (on a terminal) and summary
    Json,   // one JSON object on stdout at the end
    Quiet,  // errors only
};

// Runs the job and prints about it. Returns the exit status: 0 done, 1 the
// sync failed or was refused (one line on `err`), 2 a registration given
// twice. Returns only when no request of the sync is in flight.
int RunSyncJob(const SyncJob& job, Output output, std::ostream& out, std::ostream& err);

// The client's parameters: address, client identifier, token or auto
// sign-in, migration forms.
ParameterList MakeJobParameters(const SyncJob& job);

// "two-way", "server-wins", "local-wins".
const char* ModeName(SyncMode mode);
// False for any other text.
bool ParseModeName(const std::string& text, SyncMode& mode);

}  // namespace cli
}  // namespace tolmonetsync
