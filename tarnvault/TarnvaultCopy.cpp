// Copying a collection's subtree on the service: collections are made anew,
// items go down to a temporary file and up again. One batch per level.

#include <unistd.h>
#include <cstdio>
#include <cstdlib>
#include <set>

#include <boost/bind/bind.hpp>
#include <boost/thread/lock_guard.hpp>

#include "assets/ChildrenMutex.h"
#include "sync/DeferredList.h"
#include "tarnvault/TarnvaultPrivate.h"

namespace tolmonetsync {
namespace tarnvault {

using boost::placeholders::_1;
using boost::placeholders::_2;
using tolmocore::filesupport::File;
using tolmocore::utility::ToUTF16;
using utility::DeferredList;

namespace {

using List = boost::shared_ptr<DeferredList>;
using WeakClient = boost::weak_ptr<Tarnvault>;
// The source collections on the path from the copy's root down to a level.
// A collection may be a member of itself, directly or deeper: one that is
// already on the path is skipped, so such a cycle is copied once round and
// the copy ends.
using Ancestors = boost::shared_ptr<const std::set<UTF8String> >;

Guid CopySubtree(const boost::shared_ptr<Tarnvault>& client, const SuccessCallback& completion,
                 const ErrorCallback& error, const boost::shared_ptr<Collection>& source,
                 const boost::shared_ptr<Collection>& destination, const Guid& requestUID,
                 const Tarnvault::NameMap& nameMap, const Ancestors& ancestors);

// One level of a copy. Holds the client only weakly, so that a long copy
// does not keep it alive; its temporary files go with it.
class BatchCopy : public DeferredList {
public:
    BatchCopy(unsigned long long count, const Completion& completion, const TextCallback& error,
              const Tarnvault::NameMap& nameMap, const Ancestors& ancestors)
        : DeferredList(count, completion, error, ProgressCallback(), TextCallback()),
          mNameMap(nameMap),
          mAncestors(ancestors)
    {
    }
    ~BatchCopy() override
    {
        for (const File& file : mTempFiles) {
            try {
                if (file.Exists()) file.Delete();
            } catch (const std::exception&) {
            }
        }
    }

    UTF16String NameOf(const boost::shared_ptr<AssetBase>& asset) const
    {
        return mNameMap ? mNameMap(asset) : asset->mName;
    }

    static Guid QueueCopy(const List& list, unsigned long long index, const WeakClient& client,
                          const boost::shared_ptr<AssetBase>& asset, const boost::shared_ptr<Collection>& destination);
    static void OnCreateCollection(const List& list, unsigned long long index, const WeakClient& client,
                                   const boost::shared_ptr<Collection>& sourceCollection, const Guid& guid,
                                   const boost::shared_ptr<Collection>& newCollection);
    static void OnDownloadItem(const List& list, unsigned long long index, const WeakClient& client,
                               const boost::shared_ptr<Item>& item, const File& file,
                               const boost::shared_ptr<Collection>& destination, const Guid& guid,
                               const DownloadResult& result);

    std::vector<File> mTempFiles;
    Tarnvault::NameMap mNameMap;
    Ancestors mAncestors;  // this level's source and the collections above it
};

BatchCopy& Batch(const List& list)
{
    return static_cast<BatchCopy&>(*list);
}

File MakeTempFile()
{
    boost::lock_guard<boost::recursive_mutex> lock(ChildrenMutex());
    const char* directory = std::getenv("TMPDIR");
    char path[1024];
    std::snprintf(path, sizeof path, "%s/vl.XXXXXX", directory ? directory : "/tmp");
    // A failure shows when the download cannot write the file.
    const int descriptor = mkstemp(path);
    if (descriptor >= 0) close(descriptor);
    return File(ToUTF16(path));
}

Guid BatchCopy::QueueCopy(const List& list, unsigned long long index, const WeakClient& client,
                          const boost::shared_ptr<AssetBase>& asset, const boost::shared_ptr<Collection>& destination)
{
    const Guid guid = list->BeginSlot(static_cast<std::size_t>(index));
    const boost::shared_ptr<Tarnvault> strong = client.lock();
    if (!strong) return Guid();
    const std::size_t slot = static_cast<std::size_t>(index);
    const ErrorCallback errback = boost::bind(&DeferredList::Errback, list, slot, _1, _2);
    if (!asset->is_collection()) {
        const boost::shared_ptr<Item> item = boost::static_pointer_cast<Item>(asset);
        const File file = MakeTempFile();
        Batch(list).mTempFiles.push_back(file);
        return strong->DownloadAsync(
            boost::bind(&BatchCopy::OnDownloadItem, list, index, client, item, file, destination, _1, _2), errback,
            item, file, UTF8String(), guid);
    }
    const boost::shared_ptr<Collection> collection = boost::static_pointer_cast<Collection>(asset);
    return strong->CreateCollectionAsync(
        boost::bind(&BatchCopy::OnCreateCollection, list, index, client, collection, _1, _2), errback, destination,
        Batch(list).NameOf(asset), kCollectionType_Collection, guid);
}

void BatchCopy::OnCreateCollection(const List& list, unsigned long long index, const WeakClient& client,
                                   const boost::shared_ptr<Collection>& sourceCollection, const Guid& guid,
                                   const boost::shared_ptr<Collection>& newCollection)
{
    const std::size_t slot = static_cast<std::size_t>(index);
    const boost::shared_ptr<Tarnvault> strong = client.lock();
    if (!strong) {
        DeferredList::Errback(list, slot, guid, MakeErrorResponse(ToUTF16("Tarnvault closed prematurely")));
        return;
    }
    const Guid sent = CopySubtree(strong, boost::bind(&DeferredList::Callback, list, slot, _1),
                                  boost::bind(&DeferredList::Errback, list, slot, _1, _2), sourceCollection,
                                  newCollection, guid, Batch(list).mNameMap, Batch(list).mAncestors);
    if (sent.IsNil()) DeferredList::Errback(list, slot, guid, MakeErrorResponse(ToUTF16("CopyAsync failed")));
}

void BatchCopy::OnDownloadItem(const List& list, unsigned long long index, const WeakClient& client,
                               const boost::shared_ptr<Item>& item, const File& file,
                               const boost::shared_ptr<Collection>& destination, const Guid& guid,
                               const DownloadResult& result)
{
    const std::size_t slot = static_cast<std::size_t>(index);
    const boost::shared_ptr<Tarnvault> strong = client.lock();
    if (!strong) {
        DeferredList::Errback(list, slot, guid, MakeErrorResponse(ToUTF16("Tarnvault closed prematurely")));
        return;
    }
    const Guid sent = strong->UploadAsync(
        boost::bind(&DeferredList::Callback, list, slot, _1), boost::bind(&DeferredList::Errback, list, slot, _1, _2),
        destination, file, ImmutableString::CreateDynamic(result.mContentType), Batch(list).NameOf(item), guid);
    if (sent.IsNil()) DeferredList::Errback(list, slot, guid, MakeErrorResponse(ToUTF16("UploadAsync failed")));
}

void _CopyAsync_FetchFromSource_Result(const SuccessCallback& completion, const Guid& guid)
{
    completion(guid);
}

void _CopyAsync_FetchFromSource_Error(const ErrorCallback& error, const Guid& guid, const UTF16String& text)
{
    error(guid, MakeErrorResponse(text));
}

void _CopyAsync_FetchFromSource(const boost::weak_ptr<Tarnvault>& self, const boost::shared_ptr<Collection>& source,
                                const boost::shared_ptr<Collection>& destination, const Tarnvault::NameMap& nameMap,
                                const Ancestors& ancestors, const SuccessCallback& completion,
                                const ErrorCallback& error, const Guid& guid)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    // Nothing else writes the children while this callback of their fetch runs.
    const std::vector<boost::shared_ptr<AssetBase> > children = source->mChildren;
    List list(new BatchCopy(children.size(), boost::bind(&_CopyAsync_FetchFromSource_Result, completion, guid),
                            boost::bind(&_CopyAsync_FetchFromSource_Error, error, guid, _1), nameMap, ancestors));
    for (std::size_t index = 0; index < children.size(); ++index) {
        if (children[index]->is_collection() && ancestors->count(children[index]->mId) != 0) {
            TOLMO_TRACE("Tarnvault", 1,
                        "CopyAsync: skipping " << children[index] << ", which contains the collection it is in");
            list->Skip(index);
            continue;
        }
        if (BatchCopy::QueueCopy(list, index, WeakClient(client), children[index], destination).IsNil()) {
            error(guid, MakeErrorResponse(ToUTF16("QueueAdd failed")));
            break;
        }
    }
}

Guid CopySubtree(const boost::shared_ptr<Tarnvault>& client, const SuccessCallback& completion,
                 const ErrorCallback& error, const boost::shared_ptr<Collection>& source,
                 const boost::shared_ptr<Collection>& destination, const Guid& requestUID,
                 const Tarnvault::NameMap& nameMap, const Ancestors& ancestors)
{
    boost::shared_ptr<std::set<UTF8String> > path(new std::set<UTF8String>(*ancestors));
    path->insert(source->mId);
    return client->FetchChildrenAsync(boost::bind(&_CopyAsync_FetchFromSource, client, source, destination, nameMap,
                                                  Ancestors(path), completion, error, _1),
                                      error, source, requestUID);
}

}  // namespace

Guid Tarnvault::CopyAsync(const SuccessCallback& completion, const ErrorCallback& error,
                          const boost::shared_ptr<Collection>& source, const boost::shared_ptr<Collection>& destination,
                          const Guid& requestUID, const NameMap& nameMap)
{
    return CopySubtree(shared_from_this(), completion, error, source, destination, requestUID, nameMap,
                       Ancestors(new std::set<UTF8String>()));
}

}  // namespace tarnvault
}  // namespace tolmonetsync
