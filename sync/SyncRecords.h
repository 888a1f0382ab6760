#pragma once
// What the host registers (SyncFile, SyncDir) and the per-file record of a
// plan (CachedSyncFile), with the decision a record makes about itself.

#include <cstdint>

#include <boost/date_time/posix_time/posix_time_types.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/core/Dir.h"
#include "foundation/core/File.h"
#include "foundation/core/Guid.h"
#include "foundation/core/ImmutableString.h"
#include "foundation/core/Strings.h"

namespace tolmonetsync {

using tolmocore::filesupport::Dir;
using tolmocore::filesupport::File;

class SyncCache;

// Who wins in a pass.
enum SyncMode : std::int32_t {
    SyncMode_TwoWay = 0,       // local changes go up, everything else comes down
    SyncMode_ServerWins = 1,   // the server's state replaces the local state
    SyncMode_LocalWins = 2,    // the local state replaces the server's state
};

// What shows that a local file changed. Only the checksum bit is tested; any
// value without it means the modification date.
enum SyncMetadata_Options : std::int32_t {
    SyncMetadata_ModDate = 1,
    SyncMetadata_Checksum = 2,
};

// Uploads stop below this size when the server is where a record came from.
constexpr std::uint64_t kServerRecordMaxSize = 16 * 1024 * 1024;

// One file kept in step. Identified in registration by mFile.
class SyncFile {
public:
    SyncFile() = default;
    SyncFile(const File& file, const UTF16String& name, const UTF16String& collectionName,
             const ImmutableString& mimeType, SyncMetadata_Options options, std::uint64_t maxSize);

    bool UsesChecksum() const { return (mOptions & SyncMetadata_Checksum) != 0; }

    ImmutableString mMimeType;      // sent with an upload
    UTF16String mCollectionName;    // the group on the server
    SyncMetadata_Options mOptions = SyncMetadata_ModDate;
    std::uint64_t mMaxSize = 0;     // files of this size or larger are not uploaded
    File mFile;                     // where the file lies on disk
    UTF16String mName;              // the item's name in the group
};

// A directory whose files of one extension are all kept in step.
class SyncDir {
public:
    SyncDir() = default;
    SyncDir(const Dir& dir, const UTF16String& extension, const UTF16String& collectionName,
            const ImmutableString& mimeType, SyncMetadata_Options options, std::uint64_t maxSize);

    ImmutableString mMimeType;
    UTF16String mCollectionName;
    SyncMetadata_Options mOptions = SyncMetadata_ModDate;
    std::uint64_t mMaxSize = 0;
    Dir mDir;
    UTF16String mExtension;  // with its dot (".xmp"), compared exactly
};

// One record of a plan: the file's present state beside what was kept from
// the last successful sync.
class CachedSyncFile : public SyncFile {
public:
    enum State {
        State_Current = 0,  // nothing to do
        State_Push = 1,     // the local side should go up
        State_Pull = 2,     // the server's side should come down
    };

    CachedSyncFile() = default;
    explicit CachedSyncFile(const SyncFile& file) : SyncFile(file) {}

    // The decision, given the cache's mode; see the pass for what follows.
    State GetState(const boost::shared_ptr<SyncCache>& cache) const;
    State GetState(SyncMode mode) const;

    // The file beside mFile that a download writes: its name plus ".temp".
    File GetSafeRenameFile() const;
    // Puts the downloaded ".temp" file in place of mFile, copying mFile into
    // backupDir first. Throws on failure, leaving the ".temp" file. The
    // rename is durable only once mFile's directory is synced
    // (SyncCache::NoteSwap).
    void SafeRenameSwap(const Dir& backupDir);
    // The content checksum; nil if the file is missing or unreadable.
    Guid ComputeChecksum() const;
    // Reads the present local state: the checksum or the date, per mOptions.
    void FreshenModDate();

    boost::posix_time::ptime mServerModDate;        // the item's date now; not persisted
    UTF8String mCachedServerEtag;                   // persisted
    boost::posix_time::ptime mCachedServerModDate;  // persisted
    boost::posix_time::ptime mCachedLocalModDate;   // persisted
    Guid mCachedLocalChecksum;                      // persisted
    boost::posix_time::ptime mLocalModDate;         // not persisted
    Guid mLocalChecksum;                            // not persisted
};

}  // namespace tolmonetsync
