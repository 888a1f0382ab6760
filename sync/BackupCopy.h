#pragma once
// The copy a sync or a restore makes into a backup directory, and how the
// backup index describes it.

#include <cstdint>
#include <string>

#include "foundation/core/Dir.h"
#include "foundation/core/File.h"
#include "foundation/core/Guid.h"
#include "sync/BackupIndex.h"

namespace tolmonetsync {

struct BackupCopy {
    std::uint64_t mSize = 0;
    Guid mChecksum;  // the records' content checksum of the bytes copied
};

// Copies `source` into `backupDir` under its own name (replacing a copy of
// that name), with the original's permission bits. Throws on failure.
BackupCopy CopyIntoBackup(const tolmocore::filesupport::File& source, const tolmocore::filesupport::Dir& backupDir);

// The records' content checksum of bytes in memory.
Guid ChecksumOfBytes(const std::string& bytes);

// The index entry for a copy of `original` named `copyName` in `backupDir`,
// made now; mName is the original's file name.
BackupEntry DescribeBackup(const tolmocore::filesupport::File& original, const tolmocore::filesupport::Dir& backupDir,
                           const UTF16String& copyName, const UTF16String& group, BackupReason reason,
                           const BackupCopy& copy);

}  // namespace tolmonetsync
