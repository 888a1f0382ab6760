// The plumbing of the in-memory server, its roots, reads and membership.
// Uploads and downloads live in InMemoryServerTransfers.cpp.

#include "support/InMemoryServer.h"

#include <stdexcept>

#include <boost/thread/locks.hpp>

#include "assets/AssetJSON.h"
#include "assets/ChildrenMutex.h"
#include "assets/RestException.h"
#include "foundation/core/HostConfig.h"
#include "foundation/net/RequestProcessor.h"

namespace testsupport {

using namespace tolmonetsync;

namespace {

boost::shared_ptr<tolmonet::Response> ResponseOf(const InMemoryAnswer& answer)
{
    return boost::shared_ptr<tolmonet::Response>(new tolmonet::Response(
        answer.mStatus, tolmonet::HeaderList(), RecycledMemory::CopyOf(answer.mError.data(), answer.mError.size())));
}

void Post(const boost::function<void()>& job)
{
    tolmonet::http::GetGlobalRequestProcessor()->CallAsynchronously(job, 0);
}

// The real client turns the query into JSON before it sends anything, and
// that conversion throws for a modifier it does not know: the same one here.
void CheckQuery(const SearchQuery& query)
{
    tolmocore::serialization::JSONConvert<SearchQuery>::ToJSON(query);
}

}  // namespace

boost::shared_ptr<InMemoryServer> InMemoryServer::Create()
{
    return boost::shared_ptr<InMemoryServer>(new InMemoryServer);
}

InMemoryServer::InMemoryServer() = default;

InMemoryServer::~InMemoryServer() = default;

bool InMemoryServer::Send(InMemoryOperation operation, InMemoryRequest request, const Guid& requestUID,
                          const Service& service, const AnswerHandler& handler)
{
    const InMemoryFaultDecision decision = mFaults.OnSend(operation, request, requestUID);
    if (decision.mRefuse) return false;
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    Post([self, decision, service, handler, requestUID]() {
        InMemoryAnswer answer;
        if (decision.mFail) {
            answer.mStatus = decision.mStatus;
            answer.mError = decision.mBody;
        } else {
            answer = service();
        }
        handler(requestUID, answer);
    });
    return true;
}

// --- Connection ---

bool InMemoryServer::ReportState(const ConnectionStateCallback& stateCallback, SyncServer_ConnectionState state)
{
    mFaults.OnCall(InMemoryOperation_Connection);
    mConnectionState = state;
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    Post([self, stateCallback, state]() {
        if (stateCallback) stateCallback(state);
    });
    return true;
}

bool InMemoryServer::SetCredentials(const ConnectionStateCallback& stateCallback, const OvraCredentials& credentials)
{
    {
        std::lock_guard<std::mutex> lock(mCredentialsMutex);
        mLastCredentials = credentials;
    }
    mAccessToken = credentials.accessToken;
    mRefreshToken = credentials.refreshToken;
    mUserID = credentials.userID;
    return ReportState(stateCallback, mAccessToken.empty() ? SyncServer_NotLoggedIn : SyncServer_Connected);
}

bool InMemoryServer::CheckConnection(const ConnectionStateCallback& stateCallback)
{
    return ReportState(stateCallback, mAccessToken.empty() ? SyncServer_NotLoggedIn : SyncServer_Connected);
}

bool InMemoryServer::Logout(const ConnectionStateCallback& stateCallback)
{
    mAccessToken.clear();
    mRefreshToken.clear();
    return ReportState(stateCallback, SyncServer_NotLoggedIn);
}

OvraCredentials InMemoryServer::LastCredentials() const
{
    std::lock_guard<std::mutex> lock(mCredentialsMutex);
    return mLastCredentials;
}

// --- Roots ---

Guid InMemoryServer::GetRootAsync(const CollectionCallback& success, const ErrorCallback& error, const Guid& requestUID)
{
    mFaults.OnCall(InMemoryOperation_GetRoot);
    return GetRootFor(InMemoryOperation_GetRoot, success, error, requestUID);
}

Guid InMemoryServer::GetRootFor(InMemoryOperation operation, const CollectionCallback& success,
                                const ErrorCallback& error, const Guid& requestUID)
{
    if (mClientID.empty()) return UserRootFor(operation, success, error, requestUID);
    {
        boost::unique_lock<boost::recursive_mutex> lock(ChildrenMutex());
        if (mRootCollection) {
            success(requestUID, mRootCollection);
            return requestUID;
        }
    }
    const UTF8String clientID = mClientID;
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    const bool sent = Send(
        operation, InMemoryRequest_GetRoot, requestUID,
        [self, clientID]() { return self->mTree.GetClientRoot(clientID); },
        [self, success, error](const Guid& guid, const InMemoryAnswer& answer) {
            if (answer.mStatus != 200) return error(guid, ResponseOf(answer));
            for (const boost::shared_ptr<AssetBase>& asset : answer.mAssets) {
                if (!asset->is_collection() || !asset->is_root()) continue;
                const boost::shared_ptr<Collection> root = boost::static_pointer_cast<Collection>(asset);
                {
                    boost::unique_lock<boost::recursive_mutex> lock(ChildrenMutex());
                    self->mRootCollection = root;
                }
                return success(guid, root);
            }
            error(guid, MakeErrorResponse(u"Could not find root collection!"));
        });
    return sent ? requestUID : Guid();
}

boost::shared_ptr<Collection> InMemoryServer::CachedRoot() const
{
    boost::unique_lock<boost::recursive_mutex> lock(ChildrenMutex());
    return mRootCollection;
}

Guid InMemoryServer::GetUserFileRootAsync(const CollectionCallback& success, const ErrorCallback& error,
                                          const Guid& requestUID)
{
    mFaults.OnCall(InMemoryOperation_GetUserFileRoot);
    return UserRootFor(InMemoryOperation_GetUserFileRoot, success, error, requestUID);
}

Guid InMemoryServer::UserRootFor(InMemoryOperation operation, const CollectionCallback& success,
                                 const ErrorCallback& error, const Guid& requestUID)
{
    return SearchOneFor(
        operation,
        [success, error](const Guid& guid, const boost::shared_ptr<AssetBase>& asset) {
            if (asset && asset->is_collection() && asset->is_root()) {
                return success(guid, boost::static_pointer_cast<Collection>(asset));
            }
            error(guid, MakeErrorResponse(u"GetRoot missing or too many root"));
        },
        error, SearchQuery(kCollectionType_Root, UTF16String()), requestUID);
}

UTF16String InMemoryServer::GetPreferencesRootName() const
{
    using namespace tolmocore::config;
    return GetCompanyName() + u"_" + GetClientName() + u"_" + GetClientInternalVersion();
}

Guid InMemoryServer::GetPreferencesRootAsync(const CollectionCallback& success, const ErrorCallback& error, const Guid&)
{
    mFaults.OnCall(InMemoryOperation_GetPreferencesRoot);
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    return GetRootFor(
        InMemoryOperation_GetPreferencesRoot,
        [self, success, error](const Guid& guid, const boost::shared_ptr<Collection>& root) {
            self->_HandlePreferencesParent(success, error, guid, root);
        },
        error, Guid::CreateUnique());
}

void InMemoryServer::_HandlePreferencesParent(const CollectionCallback& success, const ErrorCallback& error,
                                              const Guid& requestUID, const boost::shared_ptr<Collection>& root)
{
    const UTF16String name = GetPreferencesRootName();
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    const Guid sent = SearchFor(
        InMemoryOperation_GetPreferencesRoot,
        [self, root, name, success, error](const Guid& guid, const std::vector<boost::shared_ptr<AssetBase> >& assets) {
            self->_HandlePreferencesSearch(root, name, success, error, guid, assets);
        },
        error, SearchQuery(root, name), requestUID);
    if (sent.IsNil()) error(requestUID, MakeErrorResponse(u"SearchAsync failed"));
}

void InMemoryServer::_HandlePreferencesSearch(const boost::shared_ptr<Collection>& root, const UTF16String& name,
                                              const CollectionCallback& success, const ErrorCallback& error,
                                              const Guid& requestUID,
                                              const std::vector<boost::shared_ptr<AssetBase> >& assets)
{
    if (!assets.empty()) {
        if (!assets.front()->is_collection() || assets.size() >= 2) {
            return error(requestUID, MakeErrorResponse(u"Too many PreferencesRoot, or bad type, try resetting!"));
        }
        return success(requestUID, boost::static_pointer_cast<Collection>(assets.front()));
    }
    // No earlier version's tree is copied in: that belongs to the real client.
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    const Guid sent = CreateFor(
        InMemoryOperation_GetPreferencesRoot,
        [self, root, success, error](const Guid& guid, const boost::shared_ptr<Collection>& collection) {
            if (!collection) return error(guid, MakeErrorResponse(u"CreateCollection: the answer is no collection"));
            const Guid added = self->AddFor(
                InMemoryOperation_GetPreferencesRoot,
                [collection, success](const Guid& addedGuid) { success(addedGuid, collection); }, error, root,
                collection, guid);
            if (added.IsNil()) error(guid, boost::shared_ptr<tolmonet::Response>());
        },
        error, name, kCollectionType_Preferences, requestUID);
    if (sent.IsNil()) error(requestUID, MakeErrorResponse(u"CreateCollection failed"));
}

// --- Search and header ---

Guid InMemoryServer::SearchAsync(const AssetsCallback& success, const ErrorCallback& error, const SearchQuery& query,
                                 const Guid& requestUID)
{
    mFaults.OnCall(InMemoryOperation_Search);
    return SearchFor(InMemoryOperation_Search, success, error, query, requestUID);
}

Guid InMemoryServer::SearchFor(InMemoryOperation operation, const AssetsCallback& success, const ErrorCallback& error,
                               const SearchQuery& query, const Guid& requestUID)
{
    CheckQuery(query);
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    const bool sent = Send(
        operation, InMemoryRequest_Search, requestUID,
        [self, query]() { return self->mTree.Search(query.mType, query.mName, query.mTrashed, query.mScopes); },
        [success, error](const Guid& guid, const InMemoryAnswer& answer) {
            if (answer.mStatus != 200) return error(guid, ResponseOf(answer));
            success(guid, answer.mAssets);
        });
    return sent ? requestUID : Guid();
}

Guid InMemoryServer::SearchOneAsync(const AssetCallback& success, const ErrorCallback& error, const SearchQuery& query,
                                    const Guid& requestUID)
{
    mFaults.OnCall(InMemoryOperation_SearchOne);
    return SearchOneFor(InMemoryOperation_SearchOne, success, error, query, requestUID);
}

Guid InMemoryServer::SearchOneFor(InMemoryOperation operation, const AssetCallback& success, const ErrorCallback& error,
                                  const SearchQuery& query, const Guid& requestUID)
{
    return SearchFor(
        operation,
        [success, error](const Guid& guid, const std::vector<boost::shared_ptr<AssetBase> >& assets) {
            if (assets.size() >= 2) return error(guid, MakeErrorResponse(u"SearchOne: too many results"));
            success(guid, assets.empty() ? boost::shared_ptr<AssetBase>() : assets.front());
        },
        error, query, requestUID);
}

Guid InMemoryServer::HeaderAsync(const AssetCallback& success, const ErrorCallback& error, const UTF8String& uid, bool,
                                 const Guid& requestUID)
{
    mFaults.OnCall(InMemoryOperation_Header);
    return HeaderFor(InMemoryOperation_Header, success, error, uid, requestUID);
}

Guid InMemoryServer::HeaderFor(InMemoryOperation operation, const AssetCallback& success, const ErrorCallback& error,
                               const UTF8String& uid, const Guid& requestUID)
{
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    const bool sent = Send(
        operation, InMemoryRequest_Header, requestUID, [self, uid]() { return self->mTree.Header(uid); },
        [uid, success, error](const Guid& guid, const InMemoryAnswer& answer) {
            if (answer.mStatus != 200) return error(guid, ResponseOf(answer));
            const boost::shared_ptr<AssetBase> asset = answer.mAssets.front();
            asset->mId = uid;
            success(guid, asset);
        });
    return sent ? requestUID : Guid();
}

// --- Collections and membership ---

Guid InMemoryServer::CreateCollectionAsync(const CollectionCallback& success, const ErrorCallback& error,
                                           const UTF16String& name, CollectionType type, const Guid& requestUID)
{
    mFaults.OnCall(InMemoryOperation_CreateCollection);
    return CreateFor(InMemoryOperation_CreateCollection, success, error, name, type, requestUID);
}

Guid InMemoryServer::CreateFor(InMemoryOperation operation, const CollectionCallback& success,
                               const ErrorCallback& error, const UTF16String& name, CollectionType type,
                               const Guid& requestUID)
{
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    const bool sent = Send(
        operation, InMemoryRequest_CreateCollection, requestUID,
        [self, name, type]() { return self->mTree.CreateCollection(name, type); },
        [self, operation, success, error](const Guid& guid, const InMemoryAnswer& answer) {
            if (answer.mStatus != 201) return error(guid, ResponseOf(answer));
            const Guid read = self->HeaderFor(
                operation,
                [success](const Guid& headerGuid, const boost::shared_ptr<AssetBase>& asset) {
                    success(headerGuid, boost::dynamic_pointer_cast<Collection>(asset));
                },
                error, answer.mId, guid);
            if (read.IsNil()) error(guid, MakeErrorResponse(u"CreateCollection Header failed"));
        });
    return sent ? requestUID : Guid();
}

Guid InMemoryServer::CreateCollectionAsync(const CollectionCallback& success, const ErrorCallback& error,
                                           const boost::shared_ptr<Collection>& parent, const UTF16String& name,
                                           CollectionType type, const Guid&)
{
    mFaults.OnCall(InMemoryOperation_CreateCollection);
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    // The whole operation runs, and reports, under a Guid of its own.
    return CreateFor(
        InMemoryOperation_CreateCollection,
        [self, parent, success, error](const Guid& guid, const boost::shared_ptr<Collection>& collection) {
            if (!collection) return error(guid, MakeErrorResponse(u"CreateCollection: the answer is no collection"));
            const Guid added = self->AddFor(
                InMemoryOperation_CreateCollection,
                [collection, success](const Guid& addedGuid) { success(addedGuid, collection); }, error, parent,
                collection, guid);
            if (added.IsNil()) error(guid, boost::shared_ptr<tolmonet::Response>());
        },
        error, name, type, Guid::CreateUnique());
}

Guid InMemoryServer::AddAsync(const SuccessCallback& success, const ErrorCallback& error,
                              const boost::shared_ptr<Collection>& collection,
                              const boost::shared_ptr<AssetBase>& asset, const Guid& requestUID)
{
    mFaults.OnCall(InMemoryOperation_Add);
    return AddFor(InMemoryOperation_Add, success, error, collection, asset, requestUID);
}

Guid InMemoryServer::AddFor(InMemoryOperation operation, const SuccessCallback& success, const ErrorCallback& error,
                            const boost::shared_ptr<Collection>& collection, const boost::shared_ptr<AssetBase>& asset,
                            const Guid& requestUID)
{
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    const UTF8String collectionId = collection->mId;
    const UTF8String assetId = asset->mId;
    const bool sent = Send(
        operation, InMemoryRequest_Add, requestUID,
        [self, collectionId, assetId]() { return self->mTree.Add(collectionId, assetId); },
        [collection, asset, success, error](const Guid& guid, const InMemoryAnswer& answer) {
            if (answer.mStatus != 200) return error(guid, ResponseOf(answer));
            {
                boost::unique_lock<boost::recursive_mutex> lock(ChildrenMutex());
                collection->mChildren.push_back(asset);
            }
            success(guid);
        });
    return sent ? requestUID : Guid();
}

Guid InMemoryServer::DeleteAsync(const SuccessCallback& success, const ErrorCallback& error,
                                 const boost::shared_ptr<AssetBase>& asset, bool recursive, const Guid& requestUID)
{
    mFaults.OnCall(InMemoryOperation_Delete);
    return DeleteFor(InMemoryOperation_Delete, success, error, asset, recursive, requestUID);
}

Guid InMemoryServer::DeleteFor(InMemoryOperation operation, const SuccessCallback& success, const ErrorCallback& error,
                               const boost::shared_ptr<AssetBase>& asset, bool recursive, const Guid& requestUID)
{
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    const UTF8String id = asset->mId;
    const bool sent = Send(
        operation, InMemoryRequest_Delete, requestUID,
        [self, id, recursive]() { return self->mTree.Delete(id, recursive); },
        [success, error](const Guid& guid, const InMemoryAnswer& answer) {
            if (answer.mStatus != 200) return error(guid, ResponseOf(answer));
            success(guid);
        });
    return sent ? requestUID : Guid();
}

Guid InMemoryServer::DeleteAsync(const SuccessCallback& success, const ErrorCallback& error,
                                 const boost::shared_ptr<Collection>& collection, const UTF16String& name,
                                 bool recursive, const Guid& requestUID)
{
    mFaults.OnCall(InMemoryOperation_DeleteByName);
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    return SearchOneFor(
        InMemoryOperation_DeleteByName,
        [self, recursive, success, error](const Guid& guid, const boost::shared_ptr<AssetBase>& asset) {
            // Nothing of that name: neither callback runs, both go with this
            // handler, and whoever counted on them sees them released.
            if (!asset) return;
            const Guid sent = self->DeleteFor(InMemoryOperation_DeleteByName, success, error, asset, recursive, guid);
            if (sent.IsNil()) error(guid, boost::shared_ptr<tolmonet::Response>());
        },
        error, SearchQuery(collection, name), requestUID);
}

Guid InMemoryServer::FetchChildrenAsync(const SuccessCallback& success, const ErrorCallback& error,
                                        const boost::shared_ptr<Collection>& collection, const Guid& requestUID)
{
    mFaults.OnCall(InMemoryOperation_FetchChildren);
    {
        // Emptied before the answer is there, and for good if it fails.
        boost::unique_lock<boost::recursive_mutex> lock(ChildrenMutex());
        collection->mChildren.clear();
    }
    return SearchFor(
        InMemoryOperation_FetchChildren,
        [collection, success](const Guid& guid, const std::vector<boost::shared_ptr<AssetBase> >& assets) {
            {
                boost::unique_lock<boost::recursive_mutex> lock(ChildrenMutex());
                collection->mChildren = assets;
            }
            success(guid);
        },
        error, SearchQuery(collection, UTF16String()), requestUID);
}

// --- Faults ---

InMemoryFaultTable::FaultId InMemoryServer::FailRequest(InMemoryRequest request, unsigned nth,
                                                        tolmonet::StatusCode status, const std::string& body)
{
    InMemoryFault fault;
    fault.mRequest = request;
    fault.mNth = nth;
    fault.mStatus = status;
    fault.mBody = body;
    return mFaults.Add(fault);
}

InMemoryFaultTable::FaultId InMemoryServer::RefuseRequest(InMemoryRequest request, unsigned nth)
{
    InMemoryFault fault;
    fault.mRequest = request;
    fault.mNth = nth;
    fault.mRefuse = true;
    return mFaults.Add(fault);
}

}  // namespace testsupport
