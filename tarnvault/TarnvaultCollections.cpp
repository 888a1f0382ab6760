// Calls that change the tree: create a collection, add to one, delete, and
// bring a collection's members up to date in memory.

#include <boost/bind/bind.hpp>
#include <boost/thread/lock_guard.hpp>

#include "assets/ChildrenMutex.h"
#include "foundation/net/HeaderConstants.h"
#include "foundation/net/QuoteURL.h"
#include "tarnvault/TarnvaultPrivate.h"

namespace tolmonetsync {
namespace tarnvault {

namespace json = tolmocore::serialization;
using boost::placeholders::_1;
using boost::placeholders::_2;

namespace {

tolmonet::HeaderList JSONContent()
{
    tolmonet::HeaderList headers;
    headers.insert(std::make_pair(tolmonet::kHEADER_CONTENT_TYPE, tolmonet::kHEADER_CONTENT_TYPE_APPLICATION_JSON));
    return headers;
}

void _HandleHeaderCreateCollection(const CollectionCallback& success, const ErrorCallback& error,
                                   const Guid& requestUID, const boost::shared_ptr<AssetBase>& asset)
{
    // The parent's add needs a real collection: an item here ends the chain.
    const boost::shared_ptr<Collection> collection = boost::dynamic_pointer_cast<Collection>(asset);
    if (!collection) {
        TOLMO_TRACE("Tarnvault", 1, "Warning: _HandleHeaderCreateCollection: " << requestUID << ": not a collection");
        error(requestUID, MakeErrorResponse(tolmocore::utility::ToUTF16(
                              "CreateCollection: the new asset's header is not a collection")));
        return;
    }
    success(requestUID, collection);
}

void _HandleCreateCollection(const boost::weak_ptr<Tarnvault>& self, const CollectionCallback& success,
                             const ErrorCallback& error, const Guid& requestUID,
                             const boost::shared_ptr<tolmonet::Response>& response)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    _HandleBody("CreateCollection", requestUID, response);
    if (response->status != 201) {
        error(requestUID, response);
        return;
    }
    const UTF8String uid = Tarnvault::GetUIDFromLocation(response);
    const Guid sent = client->HeaderAsync(boost::bind(&_HandleHeaderCreateCollection, success, error, _1, _2), error,
                                          uid, true, requestUID);
    if (sent.IsNil())
        error(requestUID, MakeErrorResponse(tolmocore::utility::ToUTF16("CreateCollection Header failed")));
}

void _HandleAddNewCollectionAsync(const boost::shared_ptr<Collection>& collection, const CollectionCallback& success,
                                  const Guid& requestUID)
{
    success(requestUID, collection);
}

void _HandleNewCollectionAsync(const boost::weak_ptr<Tarnvault>& self, const boost::shared_ptr<Collection>& parent,
                               const CollectionCallback& success, const ErrorCallback& error, const Guid& requestUID,
                               const boost::shared_ptr<Collection>& collection)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    const Guid sent = client->AddAsync(boost::bind(&_HandleAddNewCollectionAsync, collection, success, _1), error,
                                       parent, collection, requestUID);
    if (sent.IsNil()) error(requestUID, boost::shared_ptr<tolmonet::Response>());
}

void _HandleAdd(const boost::shared_ptr<Collection>& collection, const boost::shared_ptr<AssetBase>& asset,
                const SuccessCallback& success, const ErrorCallback& error, const Guid& requestUID,
                const boost::shared_ptr<tolmonet::Response>& response)
{
    _HandleBody("Add", requestUID, response);
    if (response->status != 200) {
        error(requestUID, response);
        return;
    }
    {
        boost::lock_guard<boost::recursive_mutex> lock(ChildrenMutex());
        collection->mChildren.push_back(asset);
    }
    success(requestUID);
}

void _HandleDelete(const SuccessCallback& success, const ErrorCallback& error, const Guid& requestUID,
                   const boost::shared_ptr<tolmonet::Response>& response)
{
    _HandleBody("Delete", requestUID, response);
    if (response->status == 200)
        success(requestUID);
    else
        error(requestUID, response);
}

void _HandleDeleteByNameAsync(const boost::weak_ptr<Tarnvault>& self, bool recursive, const SuccessCallback& success,
                              const ErrorCallback& error, const Guid& requestUID,
                              const boost::shared_ptr<AssetBase>& asset)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    // Nothing of that name: both callbacks go with this binding, and a batch
    // behind them counts the name as deleted.
    if (!asset) return;
    const Guid sent = client->DeleteAsync(success, error, asset, recursive, requestUID);
    if (sent.IsNil()) error(requestUID, boost::shared_ptr<tolmonet::Response>());
}

void _FetchChildrenAsync(const boost::shared_ptr<Collection>& collection, const SuccessCallback& success,
                         const Guid& requestUID, const std::vector<boost::shared_ptr<AssetBase> >& assets)
{
    {
        boost::lock_guard<boost::recursive_mutex> lock(ChildrenMutex());
        collection->mChildren = assets;
    }
    success(requestUID);
}

}  // namespace

Guid Tarnvault::CreateCollectionAsync(const CollectionCallback& success, const ErrorCallback& error,
                                      const UTF16String& name, CollectionType type, const Guid& requestUID)
{
    boost::any header = json::JSONObject();
    json::AddToObject(header, "name", boost::any(tolmocore::utility::UTF16to8(name)));
    json::AddToObject(header, "type", boost::any(CollectionTypeToString(type)));
    boost::any request = json::JSONObject();
    json::AddToObject(request, "header", header);
    const UTF8String body = json::GetJSONUTF8String(request, false);
    const UTF8String url = mServerURL + "/collections";
    TOLMO_TRACE("Tarnvault", 8,
                "CreateCollection" << ", name: " << name << ", url: " << RedactedForTrace(url) << ", body: " << body
                                   << ", requestUID: " << requestUID);
    const boost::shared_ptr<Tarnvault> self = shared_from_this();
    const bool taken = mProcessor->POST(
        requestUID,
        boost::bind(&_HandleCreateCollection, self, success, error, _1, _2),
        ImmutableString::CreateDynamic(url), BodyOf(body), JSONContent(), tolmonet::Configuration());
    return Sent(taken, requestUID);
}

Guid Tarnvault::CreateCollectionAsync(const CollectionCallback& success, const ErrorCallback& error,
                                      const boost::shared_ptr<Collection>& parent, const UTF16String& name,
                                      CollectionType type, const Guid&)
{
    // The whole chain runs, and reports, under an identifier of its own.
    const boost::shared_ptr<Tarnvault> self = shared_from_this();
    const Guid chain = Guid::CreateUnique();
    return CreateCollectionAsync(
        boost::bind(&_HandleNewCollectionAsync, self, parent, success, error, _1, _2),
        error, name, type, chain);
}

Guid Tarnvault::AddAsync(const SuccessCallback& success, const ErrorCallback& error,
                         const boost::shared_ptr<Collection>& collection, const boost::shared_ptr<AssetBase>& asset,
                         const Guid& requestUID)
{
    const UTF8String body = UTF8String("[") + json::GetJSONUTF8String(boost::any(asset->GetURI()), false) + "]";
    const UTF8String url = mServerURL + "/collections/" + collection->mId + "/members";
    TOLMO_TRACE("Tarnvault", 8,
                "Add" << ", collection: " << collection << ", asset: " << asset << ", url: " << RedactedForTrace(url)
                      << ", body: " << body << ", requestUID: " << requestUID);
    const bool taken = mProcessor->PUT(requestUID, boost::bind(&_HandleAdd, collection, asset, success, error, _1, _2),
                                       ImmutableString::CreateDynamic(url), BodyOf(body), JSONContent(),
                                       tolmonet::Configuration());
    return Sent(taken, requestUID);
}

Guid Tarnvault::DeleteAsync(const SuccessCallback& success, const ErrorCallback& error,
                            const boost::shared_ptr<AssetBase>& asset, bool recursive, const Guid& requestUID)
{
    tolmonet::FormList pairs;
    pairs.push_back(std::make_pair(kRecursive, UTF8String(recursive ? "true" : "false")));
    const UTF8String url = mServerURL + asset->GetURI() + "?" + tolmonet::QuoteURL(pairs);
    TOLMO_TRACE("Tarnvault", 8,
                "Delete" << ", asset: " << asset << ", inRecursive: " << (recursive ? 1 : 0)
                         << ", url: " << RedactedForTrace(url) << ", requestUID: " << requestUID);
    const bool taken = mProcessor->DEL(requestUID, boost::bind(&_HandleDelete, success, error, _1, _2),
                                       ImmutableString::CreateDynamic(url), tolmonet::HeaderList(),
                                       tolmonet::Configuration());
    return Sent(taken, requestUID);
}

Guid Tarnvault::DeleteAsync(const SuccessCallback& success, const ErrorCallback& error,
                            const boost::shared_ptr<Collection>& collection, const UTF16String& name, bool recursive,
                            const Guid& requestUID)
{
    const SearchQuery query(collection, name);
    const boost::shared_ptr<Tarnvault> self = shared_from_this();
    return SearchOneAsync(
        boost::bind(&_HandleDeleteByNameAsync, self, recursive, success, error, _1, _2),
        error, query, requestUID);
}

Guid Tarnvault::FetchChildrenAsync(const SuccessCallback& success, const ErrorCallback& error,
                                   const boost::shared_ptr<Collection>& collection, const Guid& requestUID)
{
    {
        boost::lock_guard<boost::recursive_mutex> lock(ChildrenMutex());
        collection->mChildren.clear();
    }
    const SearchQuery query(collection, UTF16String());
    return SearchAsync(boost::bind(&_FetchChildrenAsync, collection, success, _1, _2), error, query, requestUID);
}

}  // namespace tarnvault
}  // namespace tolmonetsync
