#pragma once
// For hosts: the backup copies the library made, and putting one back.

#include <stdexcept>
#include <string>
#include <vector>

#include "foundation/core/File.h"
#include "sync/BackupIndex.h"
#include "sync/PrefDirLock.h"

namespace tolmonetsync {

struct BackupRun {
    std::string mRun;                  // the "Backup_..." directory's name
    std::vector<BackupEntry> mCopies;  // in the order they were made
};

// The runs in the backup index whose directory still exists, newest first.
// Never throws.
std::vector<BackupRun> ListBackups();

// No copy of that file (in that run) to put back.
struct NoBackupCopy : std::runtime_error {
    using std::runtime_error::runtime_error;
};

struct RestoreResult {
    BackupEntry mFrom;         // the copy that came back
    std::string mBackedUpRun;  // where the replaced file went; empty if there was none
};

// Puts back the newest copy of `target` (of run `run` when not empty): reads
// the copy whole and checks it against its checksum in the index, copies the
// present file into a new backup directory made without pruning (recorded
// as "replaced-by-restore"), then replaces the file in one rename, keeping
// its permissions. Throws SyncRunning while a sync of the preference
// directory runs, NoBackupCopy when there is no intact copy, and other
// exceptions for a failed read or write; the file is then as it was.
RestoreResult RestoreFromBackup(const tolmocore::filesupport::File& target, const std::string& run = std::string());

}  // namespace tolmonetsync
