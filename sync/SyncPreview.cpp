// The preview chain: the client root, a search for the preferences root, its
// children, the children of the groups on both sides, then the same scan and
// decisions as a real sync. Only requests that read are sent.

#include "sync/SyncPreview.h"

#include <boost/enable_shared_from_this.hpp>
#include <boost/thread/lock_guard.hpp>

#include "assets/ChildrenMutex.h"
#include "assets/RestException.h"
#include "sync/Batches.h"
#include "sync/CacheFingerprint.h"
#include "sync/SyncFilesService.h"

namespace tolmonetsync {

using tolmocore::utility::AsciiToUTF16;

namespace {

// A plan that belongs to no service: it holds the server it reads from and
// makes no backup directory.
class PreviewCache final : public SyncCache {
public:
    PreviewCache(const boost::shared_ptr<SyncServer>& api, const std::vector<SyncFile>& files,
                 const std::vector<SyncDir>& dirs, const ItemToFileCallback& itemToFile)
        : SyncCache(files, dirs, ProgressCallback(), itemToFile, false), mApi(api)
    {
    }
    const boost::shared_ptr<SyncServer>& GetApi() const override { return mApi; }

private:
    boost::shared_ptr<SyncServer> mApi;
};

// One object per preview, kept alive by its own bound handlers.
class PreviewChain : public boost::enable_shared_from_this<PreviewChain> {
public:
    PreviewChain(const boost::shared_ptr<SyncCache>& cache, const std::vector<SyncDir>& liveDirs, SyncMode mode,
                 const SyncLimits& limits, const PreviewSuccessCallback& success, const SyncErrorCallback& error)
        : mCache(cache),
          mDoomed(new PreviewCache(cache->GetApi(), {}, {}, ItemToFileCallback())),
          mLiveDirs(liveDirs),
          mMode(mode),
          mLimits(limits),
          mSuccess(success),
          mError(error)
    {
    }

    bool Start()
    {
        auto self = shared_from_this();
        return !mCache->GetApi()
                    ->GetRootAsync([self](const Guid& id, const boost::shared_ptr<Collection>& root) {
                        self->_HandleRoot(id, root);
                    },
                                   BindError(), Guid::CreateUnique())
                    .IsNil();
    }

private:
    ErrorCallback BindError()
    {
        auto self = shared_from_this();
        return [self](const Guid& id, const boost::shared_ptr<tolmonet::Response>& response) {
            try {
                ThrowResponse(id, response);
            } catch (const std::exception& e) {
                self->mError(AsciiToUTF16(e.what()));
            }
        };
    }

    void _HandleRoot(const Guid& id, const boost::shared_ptr<Collection>& root)
    {
        auto self = shared_from_this();
        const SearchQuery query(root, mCache->GetApi()->GetPreferencesRootName());
        const AssetsCallback found = [self](const Guid& searchID,
                                            const std::vector<boost::shared_ptr<AssetBase> >& assets) {
            self->_HandleSearch(searchID, assets);
        };
        if (mCache->GetApi()->SearchAsync(found, BindError(), query, id).IsNil()) mError(u"SearchAsync failed");
    }

    void _HandleSearch(const Guid& id, const std::vector<boost::shared_ptr<AssetBase> >& assets)
    {
        if (assets.empty()) {
            // No preferences root yet: every group is new and the server has nothing.
            mRootMissing = true;
            mCache->DiffGroupNames();
            Finish();
            return;
        }
        if (assets.size() > 1 || !assets.front()->is_collection()) {
            mError(u"Too many PreferencesRoot, or bad type, try resetting!");
            return;
        }
        mCache->mRoot = boost::static_pointer_cast<Collection>(assets.front());
        auto self = shared_from_this();
        const SuccessCallback fetched = [self](const Guid& fetchID) { self->_HandleRootChildren(fetchID); };
        if (mCache->GetApi()->FetchChildrenAsync(fetched, BindError(), mCache->mRoot, id).IsNil())
            mError(u"FetchChildren failed");
    }

    void _HandleRootChildren(const Guid&)
    {
        for (const boost::shared_ptr<AssetBase>& child : mCache->mRoot->mChildren)
            if (child->is_collection()) mCache->mServerGroupNames.insert(child->mName);
        mCache->DiffGroupNames();
        // The groups a prepare would delete are listed first, for their item
        // counts, into a plan of their own so that the scan never sees them.
        auto self = shared_from_this();
        FetchGroups(mDoomed, mCache->mGroupsToDelete, [self] { self->FetchGroupsOnBothSides(); });
    }

    void FetchGroupsOnBothSides()
    {
        // Groups to create count as empty; groups on both sides are listed.
        auto self = shared_from_this();
        FetchGroups(mCache, mCache->mGroupsToFetch, [self] { self->Finish(); });
    }

    void FetchGroups(const boost::shared_ptr<SyncCache>& into, const GroupNameSet& names,
                     const boost::function<void()>& then)
    {
        const boost::shared_ptr<BatchFetchChildren> batch(
            new BatchFetchChildren(names.size(), then, mError, ProgressCallback(), SyncErrorCallback()));
        std::size_t index = 0;
        for (const UTF16String& name : names) {
            const std::size_t slot = index++;
            boost::shared_ptr<AssetBase> group;
            for (const boost::shared_ptr<AssetBase>& child : mCache->mRoot->mChildren) {
                if (child->mName == name) {
                    group = child;
                    break;
                }
            }
            if (!group || !group->is_collection()) {
                batch->Skip(slot);
                continue;
            }
            if (BatchFetchChildren::QueueFetchChildren(batch, slot, into, boost::static_pointer_cast<Collection>(group))
                    .IsNil()) {
                mError(u"QueueFetchChildren error");
                break;
            }
        }
    }

    void Finish()
    {
        try {
            mCache->PrepareSync();
            boost::shared_ptr<SyncPreview> preview(new SyncPreview);
            preview->mMode = mMode;
            preview->mCache = mCache;
            preview->mGroupsToDelete = mCache->mGroupsToDelete;
            preview->mGroupsToAdd = mCache->mGroupsToAdd;
            preview->mRootMissing = mRootMissing;
            preview->mGroupsToDeleteItems = CountItems(mDoomed->mCollections);
            preview->mDeletedLocally = mCache->RecordsDeletedLocally();
            preview->mForeignCache = ForeignCacheReason(FingerprintOf(*mCache->GetApi()));
            preview->mLimits = mLimits;
            if (mMode == SyncMode_ServerWins) preview->mLocalRemovals = ServerWinsRemovals(*mCache, mLiveDirs);
            preview->mDecisions.reserve(mCache->mFiles.size());
            for (const CachedSyncFile& record : mCache->mFiles) {
                // A file the server-wins pre-pass removes has no item, so the
                // pass skips its record either way.
                preview->mDecisions.push_back(DecideRecord(*mCache, record, mMode));
            }
            mSuccess(preview);
        } catch (const std::exception& e) {
            mError(AsciiToUTF16(e.what()));
        }
    }

    static std::map<UTF16String, std::size_t, UTF16Less> CountItems(
        const std::vector<boost::shared_ptr<Collection> >& groups)
    {
        std::map<UTF16String, std::size_t, UTF16Less> counts;
        boost::lock_guard<boost::recursive_mutex> lock(ChildrenMutex());
        for (const boost::shared_ptr<Collection>& group : groups) {
            std::size_t& count = counts[group->mName];
            for (const boost::shared_ptr<AssetBase>& child : group->mChildren)
                if (!child->is_collection()) ++count;
        }
        return counts;
    }

    boost::shared_ptr<SyncCache> mCache;
    boost::shared_ptr<SyncCache> mDoomed;  // holds the groups a prepare would delete
    std::vector<SyncDir> mLiveDirs;
    SyncMode mMode;
    SyncLimits mLimits;
    PreviewSuccessCallback mSuccess;
    SyncErrorCallback mError;
    bool mRootMissing = false;
};

}  // namespace

bool SyncFilesService::PreviewSync(const PreviewSuccessCallback& success, const SyncErrorCallback& error,
                                   SyncMode mode, const ItemToFileCallback& itemToFile)
{
    try {
        Dir::CheckPrefDir();
    } catch (const std::exception& e) {
        error(AsciiToUTF16(e.what()));
        return true;  // the error callback has run
    }
    const boost::shared_ptr<SyncCache> cache(new PreviewCache(GetApi(), mSyncFiles, mSyncDirs, itemToFile));
    const boost::shared_ptr<PreviewChain> chain(new PreviewChain(cache, mSyncDirs, mode, mLimits, success, error));
    return chain->Start();
}

}  // namespace tolmonetsync
