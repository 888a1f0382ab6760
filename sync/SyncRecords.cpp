#include "sync/SyncRecords.h"

#include "sync/SyncCache.h"

namespace tolmonetsync {

SyncFile::SyncFile(const File& file, const UTF16String& name, const UTF16String& collectionName,
                   const ImmutableString& mimeType, SyncMetadata_Options options, std::uint64_t maxSize)
    : mMimeType(mimeType),
      mCollectionName(collectionName),
      mOptions(options),
      mMaxSize(maxSize),
      mFile(file),
      mName(name)
{
}

SyncDir::SyncDir(const Dir& dir, const UTF16String& extension, const UTF16String& collectionName,
                 const ImmutableString& mimeType, SyncMetadata_Options options, std::uint64_t maxSize)
    : mMimeType(mimeType),
      mCollectionName(collectionName),
      mOptions(options),
      mMaxSize(maxSize),
      mDir(dir),
      mExtension(extension)
{
}

CachedSyncFile::State CachedSyncFile::GetState(const boost::shared_ptr<SyncCache>& cache) const
{
    return GetState(cache->mSyncMode);
}

CachedSyncFile::State CachedSyncFile::GetState(SyncMode mode) const
{
    // No history on one side: the file on disk, if any, is the truth.
    if (mCachedServerModDate.is_not_a_date_time() || mServerModDate.is_not_a_date_time())
        return mFile.Exists() ? State_Push : State_Pull;

    if (UsesChecksum()) {
        // A nil checksum (file gone or unreadable) counts as no change.
        if (!mLocalChecksum.IsNil() && mLocalChecksum != mCachedLocalChecksum) return State_Push;
    } else if (!mLocalModDate.is_not_a_date_time() && mLocalModDate != mCachedLocalModDate) {
        // By equality, never by order: a file restored to an older date changed.
        return State_Push;
    }

    if (mode == SyncMode_LocalWins)
        return mCachedServerModDate == mServerModDate ? State_Current : State_Pull;
    // Whether the server changed is found out by the conditional download.
    return State_Pull;
}

}  // namespace tolmonetsync
