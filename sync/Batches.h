#pragma once
// The batches of the prepare chain and of the pass. Each queue operation
// follows one protocol for its slot: a fresh identifier in the slot, the
// success handler and Errback bound to the batch (which keeps it alive while
// the request is out), the server call, and the identifier the server gave
// back — nil when nothing was sent and no handler will run.

#include <boost/shared_ptr.hpp>

#include "sync/DeferredList.h"
#include "sync/SyncCache.h"

namespace tolmonetsync {

class BatchDelete : public utility::DeferredList {
public:
    using DeferredList::DeferredList;
    // Deletes the group of that name under the cache's root.
    static Guid QueueDelete(const boost::shared_ptr<BatchDelete>& self, std::size_t index,
                            const boost::shared_ptr<SyncCache>& cache, const UTF16String& name, bool recursive);
};

class BatchAdd : public utility::DeferredList {
public:
    using DeferredList::DeferredList;
    // Creates the group under the cache's root; it goes out under an
    // identifier of the server's own, which CancelAll does not reach.
    static Guid QueueAdd(const boost::shared_ptr<BatchAdd>& self, std::size_t index,
                         const boost::shared_ptr<SyncCache>& cache, const UTF16String& name, CollectionType type);

private:
    static void _HandleQueueAdd(const boost::shared_ptr<BatchAdd>& self, std::size_t index,
                                const boost::shared_ptr<SyncCache>& cache, const Guid& requestID,
                                const boost::shared_ptr<Collection>& collection);
};

class BatchFetchChildren : public utility::DeferredList {
public:
    using DeferredList::DeferredList;
    // Appends the collection to the cache's mCollections, then lists it.
    static Guid QueueFetchChildren(const boost::shared_ptr<BatchFetchChildren>& self, std::size_t index,
                                   const boost::shared_ptr<SyncCache>& cache,
                                   const boost::shared_ptr<Collection>& collection);
};

class BatchSync : public utility::DeferredList {
public:
    using DeferredList::DeferredList;
    static Guid QueueUpload(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                            const boost::shared_ptr<Collection>& collection, const boost::shared_ptr<SyncCache>& cache,
                            CachedSyncFile& record);
    static Guid QueueDownload(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                              const boost::shared_ptr<Item>& item, const boost::shared_ptr<SyncCache>& cache,
                              CachedSyncFile& record);
    static Guid QueueDeleteItem(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                                const boost::shared_ptr<SyncCache>& cache, const boost::shared_ptr<Item>& item);
    // Downloads the server's `item` into the cache's backup directory as
    // NAME.server-copy, then uploads `record` under the same identifier. A
    // failed download fails the slot and nothing is uploaded.
    static Guid QueueKeepThenUpload(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                                    const boost::shared_ptr<Item>& item,
                                    const boost::shared_ptr<Collection>& collection,
                                    const boost::shared_ptr<SyncCache>& cache, CachedSyncFile& record);

private:
    static Guid SendUpload(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                           const boost::shared_ptr<Collection>& collection, const boost::shared_ptr<SyncCache>& cache,
                           CachedSyncFile& record, const Guid& guid);
    static void _HandleKeepServerCopy(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                                      const boost::shared_ptr<Collection>& collection,
                                      const boost::shared_ptr<SyncCache>& cache, CachedSyncFile& record,
                                      const File& copy, const Guid& requestID, const DownloadResult& result);
    static void _HandleQueueUpload(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                                   const boost::shared_ptr<SyncCache>& cache, CachedSyncFile& record,
                                   const Guid& requestID, const boost::shared_ptr<Item>& item);
    static void _HandleQueueDownload(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                                     const boost::shared_ptr<SyncCache>& cache, const boost::shared_ptr<Item>& item,
                                     CachedSyncFile& record, const Guid& requestID, const DownloadResult& result);
};

}  // namespace tolmonetsync
