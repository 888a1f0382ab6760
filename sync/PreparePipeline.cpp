// The prepare chain: preferences root, its children, delete stale groups,
// create missing ones, list the groups on both sides, then the scan. Each step
// runs in the completion of the one before and starts the next.

#include <boost/thread/lock_guard.hpp>

#include "assets/RestException.h"
#include "foundation/core/Trace.h"
#include "sync/Batches.h"
#include "sync/SyncFilesService.h"

namespace tolmonetsync {

using tolmocore::utility::AsciiToUTF16;
using utility::DeferredList;

namespace {

void _PrepareSync_Error(const SyncErrorCallback& error, const Guid& requestID,
                        const boost::shared_ptr<tolmonet::Response>& response)
{
    try {
        ThrowResponse(requestID, response);
    } catch (const std::exception& e) {
        error(AsciiToUTF16(e.what()));
    }
}

ErrorCallback BindPrepareError(const SyncErrorCallback& error)
{
    return [error](const Guid& requestID, const boost::shared_ptr<tolmonet::Response>& response) {
        _PrepareSync_Error(error, requestID, response);
    };
}

template <class Batch>
ErrorCallback BindErrback(const boost::shared_ptr<Batch>& self, std::size_t index)
{
    return [self, index](const Guid& requestID, const boost::shared_ptr<tolmonet::Response>& response) {
        DeferredList::Errback(self, index, requestID, response);
    };
}

template <class Batch>
SuccessCallback BindCallback(const boost::shared_ptr<Batch>& self, std::size_t index)
{
    return [self, index](const Guid& requestID) { DeferredList::Callback(self, index, requestID); };
}

// The first child of the root with that name, collection or not.
boost::shared_ptr<AssetBase> FindRootChild(const boost::shared_ptr<SyncCache>& cache, const UTF16String& name)
{
    for (const boost::shared_ptr<AssetBase>& child : cache->mRoot->mChildren)
        if (child->mName == name) return child;
    return boost::shared_ptr<AssetBase>();
}

}  // namespace

Guid BatchDelete::QueueDelete(const boost::shared_ptr<BatchDelete>& self, std::size_t index,
                              const boost::shared_ptr<SyncCache>& cache, const UTF16String& name, bool recursive)
{
    const Guid guid = self->BeginSlot(index);
    return cache->GetApi()->DeleteAsync(BindCallback(self, index), BindErrback(self, index), cache->mRoot, name,
                                        recursive, guid);
}

Guid BatchAdd::QueueAdd(const boost::shared_ptr<BatchAdd>& self, std::size_t index,
                        const boost::shared_ptr<SyncCache>& cache, const UTF16String& name, CollectionType type)
{
    const Guid guid = self->BeginSlot(index);
    const CollectionCallback added = [self, index, cache](const Guid& requestID,
                                                          const boost::shared_ptr<Collection>& collection) {
        _HandleQueueAdd(self, index, cache, requestID, collection);
    };
    return cache->GetApi()->CreateCollectionAsync(added, BindErrback(self, index), cache->mRoot, name, type, guid);
}

void BatchAdd::_HandleQueueAdd(const boost::shared_ptr<BatchAdd>& self, std::size_t index,
                               const boost::shared_ptr<SyncCache>& cache, const Guid& requestID,
                               const boost::shared_ptr<Collection>& collection)
{
    cache->mCollections.push_back(collection);
    Callback(self, index, requestID);
}

Guid BatchFetchChildren::QueueFetchChildren(const boost::shared_ptr<BatchFetchChildren>& self, std::size_t index,
                                            const boost::shared_ptr<SyncCache>& cache,
                                            const boost::shared_ptr<Collection>& collection)
{
    cache->mCollections.push_back(collection);
    const Guid guid = self->BeginSlot(index);
    return cache->GetApi()->FetchChildrenAsync(BindCallback(self, index), BindErrback(self, index), collection, guid);
}

bool SyncFilesService::PrepareSync(const PrepareSuccessCallback& success, const SyncErrorCallback& error,
                                   const ProgressCallback& progress, const ItemToFileCallback& itemToFile)
{
    boost::lock_guard<boost::recursive_mutex> lock(SyncMutex());
    Dir::CheckPrefDir();
    SetCache(boost::shared_ptr<SyncCache>());
    const boost::shared_ptr<SyncCache> cache = CreateCache(mSyncFiles, mSyncDirs, progress, itemToFile);
    SetCache(cache);
    const CollectionCallback gotRoot = [this, cache, success, error](const Guid& requestID,
                                                                     const boost::shared_ptr<Collection>& root) {
        _HandleGetPreferencesRoot(cache, success, error, requestID, root);
    };
    return !cache->GetApi()->GetPreferencesRootAsync(gotRoot, BindPrepareError(error), Guid::CreateUnique()).IsNil();
}

void SyncFilesService::_HandleGetPreferencesRoot(const boost::shared_ptr<SyncCache>& cache,
                                                 const PrepareSuccessCallback& success,
                                                 const SyncErrorCallback& error, const Guid&,
                                                 const boost::shared_ptr<Collection>& root)
{
    cache->mRoot = root;
    const SuccessCallback fetched = [this, cache, success, error](const Guid& requestID) {
        _HandleFetchChildren(cache, success, error, requestID);
    };
    if (cache->GetApi()->FetchChildrenAsync(fetched, BindPrepareError(error), cache->mRoot, Guid::CreateUnique()).IsNil())
        error(u"FetchChildren failed");
}

void SyncFilesService::_HandleFetchChildren(const boost::shared_ptr<SyncCache>& cache,
                                            const PrepareSuccessCallback& success, const SyncErrorCallback& error,
                                            const Guid&)
{
    for (const boost::shared_ptr<AssetBase>& child : cache->mRoot->mChildren) {
        if (child->is_collection())
            cache->mServerGroupNames.insert(child->mName);
        else
            TOLMO_TRACE("tolmonetsync", 1, "Warning: unexpected item in collection (ignoring)" << child);
    }
    cache->DiffGroupNames();

    const boost::shared_ptr<BatchDelete> batch(new BatchDelete(
        cache->mGroupsToDelete.size(), [this, cache, success, error] { _HandleBatchDelete(cache, success, error); },
        error, cache->mProgress, SyncErrorCallback()));
    cache->SetBatch(batch);
    std::size_t index = 0;
    // A group nobody registers goes, with everything in it.
    for (const UTF16String& name : cache->mGroupsToDelete) {
        if (BatchDelete::QueueDelete(batch, index++, cache, name, true).IsNil()) {
            error(u"QueueDelete error");
            break;
        }
    }
}

void SyncFilesService::_HandleBatchDelete(const boost::shared_ptr<SyncCache>& cache,
                                          const PrepareSuccessCallback& success, const SyncErrorCallback& error)
{
    const boost::shared_ptr<BatchAdd> batch(new BatchAdd(
        cache->mGroupsToAdd.size(), [this, cache, success, error] { _HandleBatchAdd(cache, success, error); },
        error, cache->mProgress, SyncErrorCallback()));
    cache->SetBatch(batch);
    std::size_t index = 0;
    for (const UTF16String& name : cache->mGroupsToAdd) {
        if (BatchAdd::QueueAdd(batch, index++, cache, name, kCollectionType_Collection).IsNil()) {
            error(u"QueueAdd error");
            break;
        }
    }
}

void SyncFilesService::_HandleBatchAdd(const boost::shared_ptr<SyncCache>& cache,
                                       const PrepareSuccessCallback& success, const SyncErrorCallback& error)
{
    const boost::shared_ptr<BatchFetchChildren> batch(new BatchFetchChildren(
        cache->mGroupsToFetch.size(),
        [this, cache, success, error] { _HandleBatchFetchChildren(cache, success, error); }, error,
        cache->mProgress, SyncErrorCallback()));
    cache->SetBatch(batch);
    std::size_t index = 0;
    for (const UTF16String& name : cache->mGroupsToFetch) {
        const std::size_t slot = index++;
        const boost::shared_ptr<AssetBase> child = FindRootChild(cache, name);
        if (!child || !child->is_collection()) {
            batch->Skip(slot);
            continue;
        }
        if (BatchFetchChildren::QueueFetchChildren(batch, slot, cache, boost::static_pointer_cast<Collection>(child))
                .IsNil()) {
            error(u"QueueFetchChildren error");
            break;
        }
    }
}

void SyncFilesService::_HandleBatchFetchChildren(const boost::shared_ptr<SyncCache>& cache,
                                                 const PrepareSuccessCallback& success,
                                                 const SyncErrorCallback& error)
{
    try {
        cache->PrepareSync();
        success(cache);
    } catch (const std::exception& e) {
        error(AsciiToUTF16(e.what()));
    }
}

}  // namespace tolmonetsync
