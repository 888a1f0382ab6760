// The well-known collections: this client's root (cached), the user's root,
// and the preferences root of this host version (made on first need).

#include <boost/bind/bind.hpp>
#include <boost/thread/lock_guard.hpp>

#include "assets/AssetJSON.h"
#include "assets/ChildrenMutex.h"
#include "foundation/core/HostConfig.h"
#include "foundation/net/QuoteURL.h"
#include "tarnvault/TarnvaultPrivate.h"

namespace tolmonetsync {
namespace tarnvault {

namespace json = tolmocore::serialization;
using boost::placeholders::_1;
using boost::placeholders::_2;
using tolmocore::utility::ToUTF16;

namespace {

void _HandleGetRootNoClientID(const CollectionCallback& success, const ErrorCallback& error, const Guid& requestUID,
                              const boost::shared_ptr<AssetBase>& asset)
{
    if (asset && asset->is_collection() && asset->is_root())
        success(requestUID, boost::static_pointer_cast<Collection>(asset));
    else
        error(requestUID, MakeErrorResponse(ToUTF16("GetRoot missing or too many root")));
}

void _HandleAddedPrefCollectionAsync(const boost::shared_ptr<Collection>& collection, const CollectionCallback& next,
                                     const Guid& requestUID)
{
    next(requestUID, collection);
}

void _HandleGetPreferencesRootCreateCollection(const boost::weak_ptr<Tarnvault>& self,
                                               const boost::shared_ptr<Collection>& root,
                                               const CollectionCallback& next, const ErrorCallback& error,
                                               const Guid& requestUID,
                                               const boost::shared_ptr<Collection>& collection)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    // Created on its own; only this add makes it a child of the root.
    const Guid sent = client->AddAsync(boost::bind(&_HandleAddedPrefCollectionAsync, collection, next, _1), error,
                                       root, collection, requestUID);
    if (sent.IsNil()) error(requestUID, boost::shared_ptr<tolmonet::Response>());
}

void _HandleGetPreferencesRoot(const boost::weak_ptr<Tarnvault>& self, const boost::shared_ptr<Collection>& root,
                               const UTF16String& name, const CollectionCallback& success, const ErrorCallback& error,
                               const Guid& requestUID, const std::vector<boost::shared_ptr<AssetBase> >& assets)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    if (!assets.empty()) {
        if (!assets.front()->is_collection() || assets.size() >= 2) {
            error(requestUID, MakeErrorResponse(ToUTF16("Too many PreferencesRoot, or bad type, try resetting!")));
            return;
        }
        success(requestUID, boost::static_pointer_cast<Collection>(assets.front()));
        return;
    }
    CollectionCallback next = success;
    if (!DecideMigration(client, root, success, error, requestUID, next)) return;
    const Guid sent = client->CreateCollectionAsync(
        boost::bind(&_HandleGetPreferencesRootCreateCollection, client, root, next, error, _1, _2), error, name,
        kCollectionType_Preferences, requestUID);
    if (sent.IsNil()) error(requestUID, MakeErrorResponse(ToUTF16("CreateCollection failed")));
}

void _HandleGetRootForPref(const boost::weak_ptr<Tarnvault>& self, const CollectionCallback& success,
                           const ErrorCallback& error, const Guid& requestUID, const boost::shared_ptr<Collection>& root)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    const UTF16String name = client->GetPreferencesRootName();
    const SearchQuery query(root, name);
    const Guid sent = client->SearchAsync(
        boost::bind(&_HandleGetPreferencesRoot, client, root, name, success, error, _1, _2), error, query,
        requestUID);
    if (sent.IsNil()) error(requestUID, MakeErrorResponse(ToUTF16("SearchAsync failed")));
}

}  // namespace

void Tarnvault::_HandleGetRoot(const boost::weak_ptr<Tarnvault>& self, const CollectionCallback& success,
                               const ErrorCallback& error, bool cache, const Guid& requestUID,
                               const boost::shared_ptr<tolmonet::Response>& response)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    const UTF8String body = _HandleBody("GetRoot", requestUID, response);
    if (ReportStoppedAnswer("_HandleGetRoot", error, requestUID, response)) return;
    if (response->status != 200) {
        error(requestUID, response);
        return;
    }
    try {
        const std::vector<boost::shared_ptr<AssetBase> > assets =
            ParseAssetList(body);
        boost::shared_ptr<Collection> root;
        for (const auto& asset : assets) {
            if (asset->is_collection() && asset->is_root()) {
                root = boost::static_pointer_cast<Collection>(asset);
                break;
            }
        }
        if (!root) {
            error(requestUID, MakeErrorResponse(ToUTF16("Could not find root collection!")));
            return;
        }
        if (cache) {
            boost::lock_guard<boost::recursive_mutex> lock(ChildrenMutex());
            client->mRootCollection = root;
        }
        success(requestUID, root);
    } catch (const std::exception& e) {
        ReportParseFailure("_HandleGetRoot", error, requestUID, e);
    }
}

Guid Tarnvault::GetRootAsync(const CollectionCallback& success, const ErrorCallback& error, const Guid& requestUID)
{
    if (mClientID.empty()) return GetUserFileRootAsync(success, error, requestUID);
    {
        // Delivered with the lock held; the mutex is recursive, so the
        // callback may call back into the client.
        boost::lock_guard<boost::recursive_mutex> lock(ChildrenMutex());
        if (mRootCollection) {
            success(requestUID, mRootCollection);
            return requestUID;
        }
    }
    tolmonet::FormList pairs;
    pairs.push_back(std::make_pair(kName, mClientID));
    const UTF8String url = mServerURL + "/collections?" + tolmonet::QuoteURL(pairs);
    TOLMO_TRACE("Tarnvault", 8,
                "GetRoot" << ", name: <obfuscated>"
                          << ", url: " << RedactedForTrace(url) << ", requestUID: " << requestUID);
    const tolmonet::http::ResponseHandler handler =
        boost::bind(&Tarnvault::_HandleGetRoot, shared_from_this(), success, error, true, _1, _2);
    const bool taken = mProcessor->GET(requestUID, handler, ImmutableString::CreateDynamic(url),
                                       tolmonet::HeaderList(), tolmonet::Configuration());
    return Sent(taken, requestUID);
}

Guid Tarnvault::GetUserFileRootAsync(const CollectionCallback& success, const ErrorCallback& error,
                                     const Guid& requestUID)
{
    const SearchQuery query(kCollectionType_Root, UTF16String());
    return SearchOneAsync(boost::bind(&_HandleGetRootNoClientID, success, error, _1, _2), error, query, requestUID);
}

Guid Tarnvault::GetPreferencesRootAsync(const CollectionCallback& success, const ErrorCallback& error, const Guid&)
{
    // The chain runs, and reports, under an identifier of its own.
    const CollectionCallback bound = boost::bind(&_HandleGetRootForPref, shared_from_this(), success, error, _1, _2);
    return GetRootAsync(bound, error, Guid::CreateUnique());
}

UTF16String Tarnvault::GetPreferencesRootName() const
{
    using namespace tolmocore::config;
    return GetCompanyName() + u"_" + GetClientName() + u"_" + GetClientInternalVersion();
}

}  // namespace tarnvault
}  // namespace tolmonetsync
