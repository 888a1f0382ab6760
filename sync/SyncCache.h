#pragma once
// The plan of one sync: the records to act on, the server's group
// collections that go with them, the batch now running and this run's backup
// directory. Made by SyncFilesService::PrepareSync, filled by the prepare
// chain, finished by PrepareSync() (the scan) and carried out by DoSync.

#include <atomic>
#include <cstdint>
#include <memory>
#include <mutex>
#include <set>
#include <unordered_map>
#include <vector>

#include <boost/function.hpp>
#include <boost/noncopyable.hpp>
#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>

#include "assets/SyncServer.h"
#include "sync/BackupIndex.h"
#include "sync/DeferredList.h"
#include "sync/SyncRecords.h"

namespace tolmonetsync {

using ProgressCallback = boost::function<void(float)>;
using ItemToFileCallback = boost::function<File(const Dir&, const boost::shared_ptr<Item>&)>;

// The status a service reports for its latest cache.
enum SyncStatus : std::int32_t {
    SyncStatus_None = 0,       // no live cache
    SyncStatus_Preparing = 1,  // the plan is not finished
    SyncStatus_Prepared = 2,   // the scan has finished
    SyncStatus_Syncing = 3,    // DoSync was called; stays after the pass
};

// Orders UTF-16 text by code unit, as the group sets require.
struct UTF16Less {
    bool operator()(const UTF16String& a, const UTF16String& b) const { return a.compare(b) < 0; }
};
using GroupNameSet = std::set<UTF16String, UTF16Less>;

class PrefDirLock;

class SyncCache : private boost::noncopyable {
public:
    // Copies the lists; makes this run's backup directory (exceptions pass
    // out), holding the preference directory's lock shared first so that no
    // restore runs during the sync. `makeBackupDir` false is for a read-only
    // preview, which takes neither.
    SyncCache(const std::vector<SyncFile>& files, const std::vector<SyncDir>& dirs, const ProgressCallback& progress,
              const ItemToFileCallback& itemToFile, bool makeBackupDir = true);
    virtual ~SyncCache();

    virtual const boost::shared_ptr<SyncServer>& GetApi() const = 0;
    // The scan: directory files, then server items without a local record,
    // then the cached state. Runs on the completion thread; throws on an
    // unreadable directory.
    virtual void PrepareSync();

    // The first group collection named like the argument's group; null if none.
    boost::shared_ptr<Collection> GetCollection(const SyncFile& file) const;
    boost::shared_ptr<Collection> GetCollection(const SyncDir& dir) const;
    // The first item (not collection) of the file's group named mName; null
    // if none. Reads the group's children under ChildrenMutex.
    boost::shared_ptr<Item> GetItem(const SyncFile& file) const;
    // Fills the three group sets from mServerGroupNames and the local names.
    void DiffGroupNames();
    void SetSyncMode(SyncMode mode) { mSyncMode = mode; }

    // The running batch's fraction done; 1.0 without one. Any thread.
    float Progress() const;
    // Cancels the running batch's requests. Any thread.
    void CancelAll();

    // The batch now running; replaced by each step of the chain and by DoSync.
    void SetBatch(const boost::shared_ptr<utility::DeferredList>& batch);
    boost::shared_ptr<utility::DeferredList> GetBatch() const;

    // The cache file, "tolmonetsynccache.json" in the preference directory.
    static File GetCache();
    // Reads present local state, the server's dates and the cache file's
    // kept values into mFiles. Never throws: a bad file is traced and ignored.
    void LoadCache();
    // Writes every record's kept values to the cache file (0600, replacing a
    // link planted at its name rather than writing through it), after syncing
    // every directory a noted swap renamed into; then the fingerprint beside
    // it (CacheFingerprint.h). Throws on failure, the cache file then as it was.
    void SaveCache();
    // Indices of mFiles that the cache file lists but whose local file is
    // gone: deleted here since the last sync. Never throws.
    std::set<std::size_t> RecordsDeletedLocally() const;
    // Notes a swap into `file`'s directory, for SaveCache to sync. Completion
    // thread.
    void NoteSwap(const File& file);

    // Makes this run's backup directory under the preference directory (the
    // preference directory, "SyncBackup" and the new one 0700 when made here)
    // and prunes old ones: only real directories named "Backup_...", never
    // through a link, whatever else lies there. A "SyncBackup" that is a
    // symbolic link is refused: throws FileSystemError naming it.
    static Dir NewBackupDir();
    // The same without pruning, for a restore: it never removes the run it
    // restores from.
    static Dir NewBackupDirWithoutPruning();
    // The clock backup directories are named by (local time); replaceable by tests.
    using Clock = boost::function<boost::posix_time::ptime()>;
    static Clock BackupClock();
    static void SetBackupClock(const Clock& clock);
    // Copies the file into mBackupDir and removes it; failures are traced.
    void SafeDelete(File& file);
    // SafeRenameSwap into mBackupDir, noting the copy for the backup index.
    // Completion thread; throws like SafeRenameSwap.
    void SwapDownloaded(CachedSyncFile& record);
    // Notes a copy made into mBackupDir for the backup index. Any thread.
    void NoteBackup(BackupEntry entry);
    // The end of a pass, whatever its outcome: writes the noted copies into
    // the backup index in one write and lets go of the lock. Never throws: a
    // failed write is traced and the copies stay noted for a later call.
    void FinishPass();

    // Directory files of `dir`'s extension, in name order.
    static void getAllLocalSyncFiles(const SyncDir& dir, std::vector<SyncFile>& out);

    std::uint32_t mSyncCount = 0;
    std::uint32_t mDownloadCount = 0;
    std::uint32_t mUploadCount = 0;
    std::vector<CachedSyncFile> mFiles;  // must not change size while a pass runs
    std::vector<SyncDir> mDirs;
    Dir mBackupDir;
    std::atomic<std::int32_t> mStatus{SyncStatus_Preparing};  // read by the host on any thread
    SyncMode mSyncMode = SyncMode_TwoWay;
    boost::shared_ptr<Collection> mRoot;
    std::vector<boost::shared_ptr<Collection> > mCollections;
    ProgressCallback mProgress;
    GroupNameSet mServerGroupNames;
    GroupNameSet mGroupsToAdd;
    GroupNameSet mGroupsToDelete;
    GroupNameSet mGroupsToFetch;
    ItemToFileCallback mItemToFile;

private:
    struct UTF16Hash {
        std::size_t operator()(const UTF16String& text) const;
    };
    // First item of each name among a collection's children, extended as
    // children are appended (first match keeps winning).
    struct ChildIndex {
        std::size_t mIndexed = 0;
        const AssetBase* mFirstChild = nullptr;
        std::unordered_map<UTF16String, boost::shared_ptr<Item>, UTF16Hash> mItems;
    };

    void AddServerItems();
    File FileForItem(const SyncDir& dir, const boost::shared_ptr<Item>& item) const;

    std::set<UTF16String, UTF16Less> mSwappedDirs;  // not yet synced; completion thread

    std::mutex mBackupsMutex;  // guards mNotedBackups and mPrefDirLock
    std::vector<BackupEntry> mNotedBackups;
    std::unique_ptr<PrefDirLock> mPrefDirLock;

    mutable std::mutex mBatchMutex;  // guards mBatch only, for the copy of the pointer
    boost::weak_ptr<utility::DeferredList> mBatch;

    mutable std::mutex mIndexMutex;  // guards mCollectionIndex and mIndexedCollections
    mutable std::unordered_map<UTF16String, boost::shared_ptr<Collection>, UTF16Hash> mCollectionIndex;
    mutable std::size_t mIndexedCollections = 0;
    // Guarded by ChildrenMutex, like the children it mirrors.
    mutable std::unordered_map<const Collection*, ChildIndex> mChildIndexes;
};

}  // namespace tolmonetsync
