#pragma once
// The object a host holds to keep its registered files and directories in
// step with one server.
//
// Life cycle: register files and directories (from one thread, never during
// a prepare or a sync); PrepareSync makes a plan (a SyncCache) and hands it
// to the success callback; DoSync carries it out. The service never owns a
// cache: the host keeps the one it got, and requests in flight keep theirs.
// Handlers hold a plain pointer to the service: it must outlive its requests.
//
// Callbacks run on the request processor's completion thread, except that a
// batch with nothing to send finishes on the thread that lets go of it, and a
// pass whose last slot is a skip finishes inside DoSync, on the caller's
// thread, with SyncMutex held.

#include <cstdint>
#include <mutex>
#include <utility>
#include <vector>

#include <boost/function.hpp>
#include <boost/noncopyable.hpp>
#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>

#include "assets/SyncServer.h"
#include "sync/SyncCache.h"
#include "sync/SyncMutex.h"
#include "sync/SyncRecords.h"
#include "sync/SyncRisks.h"

namespace tolmonetsync {

enum SyncServiceType : std::int32_t {
    SyncServiceType_Tarnvault = 0,
};

using ParameterList = SmallBlockAllocator::vector<std::pair<ImmutableString, UTF8String> >;
using PrepareSuccessCallback = boost::function<void(const boost::shared_ptr<SyncCache>&)>;
using SyncSuccessCallback = boost::function<void(int)>;
using SyncErrorCallback = boost::function<void(const UTF16String&)>;

class SyncPreview;
using PreviewSuccessCallback = boost::function<void(const boost::shared_ptr<SyncPreview>&)>;

class SyncFilesService : private boost::noncopyable {
public:
    explicit SyncFilesService(const ParameterList& parameters);
    virtual ~SyncFilesService();

    virtual const boost::shared_ptr<SyncServer>& GetApi() const = 0;
    virtual SyncServiceType GetType() const = 0;
    virtual boost::shared_ptr<SyncCache> CreateCache(const std::vector<SyncFile>& files,
                                                     const std::vector<SyncDir>& dirs, const ProgressCallback& progress,
                                                     const ItemToFileCallback& itemToFile) = 0;

    // True if added; false (and nothing changes) if that File is registered.
    bool RegisterSyncFile(const SyncFile& file);
    bool UnregisterSyncFile(const File& file);
    // True if added; a second registration of a Dir gives false and the first
    // entry stays as it was.
    bool RegisterSyncDirectory(const SyncDir& dir);
    bool UnregisterSyncDirectory(const Dir& dir);

    // Starts the prepare chain. False, and no callback, if the first request
    // could not be sent. Exceptions from making the cache (the backup
    // directory) pass out, and so does the refusal of a preference directory
    // that others could change (Dir::CheckPrefDir), before anything is
    // touched. `success` and `error` must be set.
    bool PrepareSync(const PrepareSuccessCallback& success, const SyncErrorCallback& error,
                     const ProgressCallback& progress, const ItemToFileCallback& itemToFile);
    // Runs the pass over `cache`. Always true. `error` may come more than once
    // (requests that could not be queued) and success may follow an error.
    bool DoSync(const boost::shared_ptr<SyncCache>& cache, const SyncSuccessCallback& success,
                const SyncErrorCallback& error, SyncMode mode);

    // A read-only plan: the same scan, merge and decisions as PrepareSync and
    // DoSync in `mode`, from requests that only read (a missing preferences
    // root or group counts as empty). Nothing is created, deleted or migrated
    // on the server and nothing is written locally. False if the first
    // request could not be sent. A preference directory that others could
    // change (Dir::CheckPrefDir) goes to `error` at once, before anything is
    // read or sent.
    bool PreviewSync(const PreviewSuccessCallback& success, const SyncErrorCallback& error, SyncMode mode,
                     const ItemToFileCallback& itemToFile);

    // Before an upload replaces a server item that changed since the last
    // sync (or has no history), download that version into the pass's backup
    // directory as NAME.server-copy. Off by default: it adds requests. Set it
    // from the thread that calls DoSync.
    void SetKeepServerCopies(bool keep) { mKeepServerCopies = keep; }
    // Opt-in limits, off by default (SyncRisks.h counts them). DoSync over a
    // plan beyond one calls `error` once with a line naming it and queues
    // nothing; a preview carries them (SyncPreview::ExceededLimit) so that a
    // host can refuse before PrepareSync, which already changes the server.
    void SetMaxDelete(std::size_t count) { mLimits.mMaxDelete = count; }
    void SetMaxOverwrite(std::size_t count) { mLimits.mMaxOverwrite = count; }
    const SyncLimits& Limits() const { return mLimits; }

    void CancelAll();
    float Progress() const;
    std::int32_t GetStatus() const;
    // The cache file's modification date; not-a-date-time without one.
    boost::posix_time::ptime GetLatestSyncDate() const;
    // Forgets what was last synchronised: the cache file and its
    // fingerprint. Never throws.
    void DeleteCaches();

    const std::vector<SyncFile>& SyncFiles() const { return mSyncFiles; }
    const std::vector<SyncDir>& SyncDirs() const { return mSyncDirs; }

protected:
    ParameterList mParameters;
    std::vector<SyncFile> mSyncFiles;
    std::vector<SyncDir> mSyncDirs;

private:
    boost::shared_ptr<SyncCache> LiveCache() const;
    void SetCache(const boost::shared_ptr<SyncCache>& cache);

    // The prepare chain, one step in the completion of the one before.
    void _HandleGetPreferencesRoot(const boost::shared_ptr<SyncCache>& cache, const PrepareSuccessCallback& success,
                                   const SyncErrorCallback& error, const Guid& requestID,
                                   const boost::shared_ptr<Collection>& root);
    void _HandleFetchChildren(const boost::shared_ptr<SyncCache>& cache, const PrepareSuccessCallback& success,
                              const SyncErrorCallback& error, const Guid& requestID);
    void _HandleBatchDelete(const boost::shared_ptr<SyncCache>& cache, const PrepareSuccessCallback& success,
                            const SyncErrorCallback& error);
    void _HandleBatchAdd(const boost::shared_ptr<SyncCache>& cache, const PrepareSuccessCallback& success,
                         const SyncErrorCallback& error);
    void _HandleBatchFetchChildren(const boost::shared_ptr<SyncCache>& cache, const PrepareSuccessCallback& success,
                                   const SyncErrorCallback& error);
    // The end of the pass.
    void _HandleSync(const boost::shared_ptr<SyncCache>& cache, const SyncSuccessCallback& success,
                     const SyncErrorCallback& error);

    bool mKeepServerCopies = false;
    SyncLimits mLimits;
    mutable std::mutex mCacheMutex;  // guards mCache only, for the copy of the pointer
    boost::weak_ptr<SyncCache> mCache;
};

// Makes the service of a type: 0 is the asset service client. Any other type
// throws std::runtime_error("Unimplemented").
boost::shared_ptr<SyncFilesService> CreateSyncFilesService(SyncServiceType type, const ParameterList& parameters);

}  // namespace tolmonetsync
