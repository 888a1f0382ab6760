#include "sync/SyncCache.h"

#include <string_view>
#include <unordered_set>

#include <boost/date_time/posix_time/posix_time.hpp>
#include <boost/thread/lock_guard.hpp>

#include "assets/ChildrenMutex.h"
#include "foundation/core/Trace.h"
#include "sync/PrefDirLock.h"
#include "sync/SyncMutex.h"

namespace tolmonetsync {

namespace {

std::mutex& ClockMutex()
{
    static std::mutex* mutex = new std::mutex;
    return *mutex;
}

SyncCache::Clock& ClockSlot()
{
    static SyncCache::Clock* clock = new SyncCache::Clock;
    return *clock;
}

}  // namespace

std::size_t SyncCache::UTF16Hash::operator()(const UTF16String& text) const
{
    return std::hash<std::u16string_view>()(std::u16string_view(text.data(), text.size()));
}

SyncCache::SyncCache(const std::vector<SyncFile>& files, const std::vector<SyncDir>& dirs,
                     const ProgressCallback& progress, const ItemToFileCallback& itemToFile, bool makeBackupDir)
    : mDirs(dirs), mProgress(progress), mItemToFile(itemToFile)
{
    // Registered files always have a record, whatever their size or extension.
    mFiles.reserve(files.size());
    for (const SyncFile& file : files) mFiles.emplace_back(file);
    if (makeBackupDir) {
        // Before the backup directory, whose pruning a restore must not meet.
        try {
            Dir::PrefDir().CreatePrivate();
            mPrefDirLock.reset(new PrefDirLock(PrefDirLock::Shared));
        } catch (const std::exception& e) {
            // Only restores rely on it; the sync goes on without.
            TOLMO_TRACE("tolmonetsync", 1, "Warning: sync lock not taken: " << e.what());
        }
        mBackupDir = NewBackupDir();
    }
}

SyncCache::~SyncCache()
{
    FinishPass();  // copies of a pass that never reached its end
}

SyncCache::Clock SyncCache::BackupClock()
{
    std::lock_guard<std::mutex> lock(ClockMutex());
    if (ClockSlot()) return ClockSlot();
    return [] { return boost::posix_time::microsec_clock::local_time(); };
}

void SyncCache::SetBackupClock(const Clock& clock)
{
    std::lock_guard<std::mutex> lock(ClockMutex());
    ClockSlot() = clock;
}

void SyncCache::getAllLocalSyncFiles(const SyncDir& dir, std::vector<SyncFile>& out)
{
    out.clear();
    for (auto it = dir.mDir.BeginFiles(false, nullptr, false); it != dir.mDir.EndFiles(); ++it) {
        const File file = *it;
        if (file.GetExtension(true) != dir.mExtension) continue;
        out.emplace_back(file, file.GetName(), dir.mCollectionName, dir.mMimeType, dir.mOptions, dir.mMaxSize);
    }
}

void SyncCache::PrepareSync()
{
    std::vector<SyncFile> found;
    for (const SyncDir& dir : mDirs) {
        getAllLocalSyncFiles(dir, found);
        for (const SyncFile& file : found) {
            if (file.mFile.GetExtension(true) != dir.mExtension) {
                TOLMO_TRACE("tolmonetsync", 8, "Skipping (wrong extension): " << file.mFile.FullPath());
                continue;
            }
            if (file.mFile.Size(FileSizeSelector_Data) >= dir.mMaxSize) {
                TOLMO_TRACE("tolmonetsync", 1, "Skipping (too big): " << file.mFile.FullPath());
                continue;
            }
            // A file both registered and found in a directory has two records.
            mFiles.emplace_back(file);
        }
    }
    AddServerItems();
    LoadCache();
    mStatus = SyncStatus_Prepared;
}

File SyncCache::FileForItem(const SyncDir& dir, const boost::shared_ptr<Item>& item) const
{
    if (mItemToFile) return mItemToFile(dir.mDir, item);
    return File(dir.mDir, item->mName);  // throws on a name that would leave the directory
}

void SyncCache::AddServerItems()
{
    std::unordered_set<UTF16String, UTF16Hash> recorded;
    for (const CachedSyncFile& record : mFiles) recorded.insert(record.mFile.FullPath());

    for (const boost::shared_ptr<Collection>& collection : mCollections) {
        // Server items take their directory from the first SyncDir of the group;
        // a group of single files only gets no records from the server.
        const SyncDir* dir = nullptr;
        for (const SyncDir& candidate : mDirs) {
            if (candidate.mCollectionName == collection->mName) {
                dir = &candidate;
                break;
            }
        }
        if (!dir) continue;
        for (const boost::shared_ptr<AssetBase>& child : collection->mChildren) {
            if (child->is_collection()) {
                TOLMO_TRACE("tolmonetsync", 1, "Unexpected collection: " << child << " inside " << collection);
                continue;
            }
            const boost::shared_ptr<Item> item = boost::static_pointer_cast<Item>(child);
            File file;
            try {
                file = FileForItem(*dir, item);
            } catch (const std::invalid_argument& e) {
                // One hostile name never blocks a sync, and never places a file
                // outside its directory: the item counts as absent.
                TOLMO_TRACE("tolmonetsync", 1, "Skipping server item with a bad name: " << child << ": " << e.what());
                continue;
            }
            if (!recorded.insert(file.FullPath()).second) continue;
            mFiles.emplace_back(SyncFile(file, item->mName, collection->mName,
                                         ImmutableString::CreateDynamic(item->mContentType), SyncMetadata_ModDate,
                                         kServerRecordMaxSize));
        }
    }
}

boost::shared_ptr<Collection> SyncCache::GetCollection(const SyncFile& file) const
{
    std::lock_guard<std::mutex> lock(mIndexMutex);
    // Collections are only ever appended: index the new ones, first name wins.
    for (; mIndexedCollections < mCollections.size(); ++mIndexedCollections) {
        const boost::shared_ptr<Collection>& collection = mCollections[mIndexedCollections];
        mCollectionIndex.emplace(collection->mName, collection);
    }
    auto found = mCollectionIndex.find(file.mCollectionName);
    return found == mCollectionIndex.end() ? boost::shared_ptr<Collection>() : found->second;
}

boost::shared_ptr<Collection> SyncCache::GetCollection(const SyncDir& dir) const
{
    SyncFile probe;
    probe.mCollectionName = dir.mCollectionName;
    return GetCollection(probe);
}

boost::shared_ptr<Item> SyncCache::GetItem(const SyncFile& file) const
{
    const boost::shared_ptr<Collection> collection = GetCollection(file);
    if (!collection) return boost::shared_ptr<Item>();

    boost::lock_guard<boost::recursive_mutex> lock(ChildrenMutex());
    ChildIndex& index = mChildIndexes[collection.get()];
    const std::vector<boost::shared_ptr<AssetBase> >& children = collection->mChildren;
    // Children are appended by uploads and adds; a fetch replaces them all,
    // which shows as fewer children or another first one: then start over.
    const AssetBase* first = children.empty() ? nullptr : children.front().get();
    if (children.size() < index.mIndexed || (index.mIndexed > 0 && first != index.mFirstChild)) index = ChildIndex();
    index.mFirstChild = first;
    for (; index.mIndexed < children.size(); ++index.mIndexed) {
        const boost::shared_ptr<AssetBase>& child = children[index.mIndexed];
        if (!child->is_collection()) index.mItems.emplace(child->mName, boost::static_pointer_cast<Item>(child));
    }
    auto found = index.mItems.find(file.mName);
    return found == index.mItems.end() ? boost::shared_ptr<Item>() : found->second;
}

void SyncCache::DiffGroupNames()
{
    GroupNameSet local;
    for (const CachedSyncFile& record : mFiles) local.insert(record.mCollectionName);
    for (const SyncDir& dir : mDirs) local.insert(dir.mCollectionName);

    mGroupsToDelete.clear();
    mGroupsToAdd.clear();
    mGroupsToFetch.clear();
    for (const UTF16String& name : mServerGroupNames) {
        if (local.count(name))
            mGroupsToFetch.insert(name);
        else
            mGroupsToDelete.insert(name);
    }
    for (const UTF16String& name : local) {
        if (!mServerGroupNames.count(name)) mGroupsToAdd.insert(name);
    }
}

void SyncCache::SetBatch(const boost::shared_ptr<utility::DeferredList>& batch)
{
    std::lock_guard<std::mutex> lock(mBatchMutex);
    mBatch = batch;
}

boost::shared_ptr<utility::DeferredList> SyncCache::GetBatch() const
{
    std::lock_guard<std::mutex> lock(mBatchMutex);
    return mBatch.lock();
}

float SyncCache::Progress() const
{
    const boost::shared_ptr<utility::DeferredList> batch = GetBatch();
    if (!batch) return 1.0f;
    boost::lock_guard<boost::recursive_mutex> lock(SyncMutex());
    if (batch->Count() == 0) return 1.0f;
    return static_cast<float>(batch->Completed()) / batch->Count();
}

void SyncCache::CancelAll()
{
    const boost::shared_ptr<utility::DeferredList> batch = GetBatch();
    if (!batch) return;
    boost::lock_guard<boost::recursive_mutex> lock(SyncMutex());
    batch->CancelAll();
}

}  // namespace tolmonetsync
