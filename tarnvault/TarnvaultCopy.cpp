// Copying a collection's subtree on the service: collections are made anew,
// items go down to a temporary file and up again. One batch per level.

#include <cstdio>
#include <cstdlib>
#include <unistd.h>

#include <boost/bind/bind.hpp>
#include <boost/thread/lock_guard.hpp>

#include "assets/ChildrenMutex.h"
#include "sync/DeferredList.h"
#include "tarnvault/TarnvaultPrivate.h"

namespace tolmonetsync {
namespace tarnvault {

using tolmocore::filesupport::File;
using tolmocore::utility::ToUTF16;
using utility::DeferredList;
using boost::placeholders::_1;
using boost::placeholders::_2;

namespace {

using List = boost::shared_ptr<DeferredList>;
using WeakClient = boost::weak_ptr<Tarnvault>;

// One level of a copy. Holds the client only weakly, so that a long copy
// does not keep it alive; its temporary files go with it.
class BatchCopy : public DeferredList {
public:
    BatchCopy(unsigned long long count, const Completion& completion, const TextCallback& error,
              const Tarnvault::NameMap& nameMap)
        : DeferredList(count, completion, error, ProgressCallback(), TextCallback()), mNameMap(nameMap)
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
};

BatchCopy& Batch(const List& list) { return static_cast<BatchCopy&>(*list); }

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
    const Guid sent = strong->CopyAsync(boost::bind(&DeferredList::Callback, list, slot, _1),
                                        boost::bind(&DeferredList::Errback, list, slot, _1, _2), sourceCollection,
                                        newCollection, guid, Batch(list).mNameMap);
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
    const Guid sent = strong->UploadAsync(boost::bind(&DeferredList::Callback, list, slot, _1),
                                          boost::bind(&DeferredList::Errback, list, slot, _1, _2), destination, file,
                                          ImmutableString::CreateDynamic(result.mContentType),
                                          Batch(list).NameOf(item), guid);
    if (sent.IsNil()) DeferredList::Errback(list, slot, guid, MakeErrorResponse(ToUTF16("UploadAsync failed")));
}

void _CopyAsync_FetchFromSource_Result(const SuccessCallback& completion, const Guid& guid) { completion(guid); }

void _CopyAsync_FetchFromSource_Error(const ErrorCallback& error, const Guid& guid, const UTF16String& text)
{
    error(guid, MakeErrorResponse(text));
}

void _CopyAsync_FetchFromSource(const boost::weak_ptr<Tarnvault>& self, const boost::shared_ptr<Collection>& source,
                                const boost::shared_ptr<Collection>& destination, const Tarnvault::NameMap& nameMap,
                                const SuccessCallback& completion, const ErrorCallback& error, const Guid& guid)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    // Nothing else writes the children while this callback of their fetch runs.
    const std::vector<boost::shared_ptr<AssetBase> > children = source->mChildren;
    List list(new BatchCopy(children.size(), boost::bind(&_CopyAsync_FetchFromSource_Result, completion, guid),
                            boost::bind(&_CopyAsync_FetchFromSource_Error, error, guid, _1), nameMap));
    for (std::size_t index = 0; index < children.size(); ++index) {
        if (BatchCopy::QueueCopy(list, index, WeakClient(client), children[index], destination).IsNil()) {
            error(guid, MakeErrorResponse(ToUTF16("QueueAdd failed")));
            break;
        }
    }
}

}  // namespace

Guid Tarnvault::CopyAsync(const SuccessCallback& completion, const ErrorCallback& error,
                          const boost::shared_ptr<Collection>& source,
                          const boost::shared_ptr<Collection>& destination, const Guid& requestUID,
                          const NameMap& nameMap)
{
    return FetchChildrenAsync(boost::bind(&_CopyAsync_FetchFromSource, shared_from_this(), source, destination,
                                          nameMap, completion, error, _1),
                              error, source, requestUID);
}

}  // namespace tarnvault
}  // namespace tolmonetsync
