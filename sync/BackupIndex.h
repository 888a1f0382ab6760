#pragma once
// "SyncBackup/index.json": where every copy in a backup directory came from
// and why. A file beside the "Backup_" directories, 0600, replaced as a whole
// on each write and never written through a link planted at its name.

#include <cstdint>
#include <string>
#include <vector>

#include "foundation/core/File.h"

namespace tolmonetsync {

// Why a copy was made; the index spells these as below.
enum class BackupReason {
    ReplacedByDownload,   // "replaced-by-download"
    RemovedByServerWins,  // "removed-by-server-wins"
    ServerCopyKept,       // "server-copy-kept": the server's version, kept before an upload replaced it
    ReplacedByRestore,    // "replaced-by-restore"
};
const char* BackupReasonName(BackupReason reason);

struct BackupEntry {
    std::string mRun;     // the "Backup_..." directory's name
    std::string mCopy;    // the copy's name in it (backups are flat)
    std::string mPath;    // the original's full path, UTF-8
    std::string mGroup;   // the server group, if the file has one
    std::string mName;    // the item's name in the group
    std::string mReason;  // BackupReasonName
    std::uint64_t mSize = 0;
    std::string mChecksum;  // the records' content checksum (the cache file's), as GUID text
    std::string mTime;      // local time of the copy, ISO 8601
    // Set when this copy overwrote an earlier one of the same name in the same
    // run: that one's original path. The earlier entry stays, but its copy is
    // gone.
    std::string mReplaces;
};

// The index file: "index.json" in "SyncBackup" under the preference directory.
tolmocore::filesupport::File BackupIndexFile();

// Every entry, oldest first. A missing index gives none; a damaged one gives
// the entries that could be read and a trace line. Never throws.
std::vector<BackupEntry> ReadBackupIndex();

// Appends `added` (noting collisions within a run), drops the entries of runs
// whose directory is gone (pruned ones) and writes the index. Throws on a
// failed write; the index then keeps its old content.
void UpdateBackupIndex(std::vector<BackupEntry> added);

// Whether the entry's copy is still the one in its run's directory: no later
// entry of the same run has its name.
bool IsLatestOfItsName(const std::vector<BackupEntry>& index, std::size_t position);

}  // namespace tolmonetsync
