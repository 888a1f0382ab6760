// The service frame: registration, the small queries, the cache pointer.

#include "sync/SyncFilesService.h"

#include <algorithm>
#include <stdexcept>

#include "sync/CacheFingerprint.h"

namespace tolmonetsync {

boost::recursive_mutex& SyncMutex()
{
    // Never destroyed: a pass may still finish on another thread while the
    // process exits.
    static boost::recursive_mutex* mutex = new boost::recursive_mutex;
    return *mutex;
}

SyncFilesService::SyncFilesService(const ParameterList& parameters) : mParameters(parameters) {}

SyncFilesService::~SyncFilesService() = default;

bool SyncFilesService::RegisterSyncFile(const SyncFile& file)
{
    const bool known = std::any_of(mSyncFiles.begin(), mSyncFiles.end(),
                                   [&](const SyncFile& entry) { return entry.mFile == file.mFile; });
    if (known) return false;
    mSyncFiles.push_back(file);
    return true;
}

bool SyncFilesService::UnregisterSyncFile(const File& file)
{
    auto found = std::find_if(mSyncFiles.begin(), mSyncFiles.end(),
                              [&](const SyncFile& entry) { return entry.mFile == file; });
    if (found == mSyncFiles.end()) return false;
    mSyncFiles.erase(found);
    return true;
}

bool SyncFilesService::RegisterSyncDirectory(const SyncDir& dir)
{
    const bool known = std::any_of(mSyncDirs.begin(), mSyncDirs.end(),
                                   [&](const SyncDir& entry) { return entry.mDir == dir.mDir; });
    if (known) return false;
    mSyncDirs.push_back(dir);
    return true;
}

bool SyncFilesService::UnregisterSyncDirectory(const Dir& dir)
{
    auto found = std::find_if(mSyncDirs.begin(), mSyncDirs.end(),
                              [&](const SyncDir& entry) { return entry.mDir == dir; });
    if (found == mSyncDirs.end()) return false;
    mSyncDirs.erase(found);
    return true;
}

boost::shared_ptr<SyncCache> SyncFilesService::LiveCache() const
{
    std::lock_guard<std::mutex> lock(mCacheMutex);
    return mCache.lock();
}

void SyncFilesService::SetCache(const boost::shared_ptr<SyncCache>& cache)
{
    std::lock_guard<std::mutex> lock(mCacheMutex);
    mCache = cache;
}

void SyncFilesService::CancelAll()
{
    if (const boost::shared_ptr<SyncCache> cache = LiveCache()) cache->CancelAll();
}

float SyncFilesService::Progress() const
{
    const boost::shared_ptr<SyncCache> cache = LiveCache();
    return cache ? cache->Progress() : 1.0f;
}

std::int32_t SyncFilesService::GetStatus() const
{
    const boost::shared_ptr<SyncCache> cache = LiveCache();
    return cache ? cache->mStatus.load() : static_cast<std::int32_t>(SyncStatus_None);
}

boost::posix_time::ptime SyncFilesService::GetLatestSyncDate() const
{
    const File cacheFile = SyncCache::GetCache();
    return cacheFile.Exists() ? cacheFile.Modified() : boost::posix_time::ptime();
}

void SyncFilesService::DeleteCaches()
{
    try {
        const File cacheFile = SyncCache::GetCache();
        if (cacheFile.Exists()) cacheFile.Delete();
        const File fingerprint = CacheFingerprintFile();
        if (fingerprint.Exists()) fingerprint.Delete();
    } catch (const std::exception&) {
    }
}

}  // namespace tolmonetsync
