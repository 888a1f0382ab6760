#pragma once
// The interface through which the sync engine talks to an asset service.
//
// Every ...Async operation returns at once: the request identifier under
// which the request went out, or a nil Guid when it could not be sent, and
// then neither callback runs. After a non-nil result exactly one callback runs
// once, on the request processor's completion thread, with that identifier,
// except that:
//  - CreateCollectionAsync with a parent returns an identifier of its own;
//  - DeleteAsync by name releases both callbacks without a call when the
//    name is not there;
//  - GetRootAsync with a cached root calls success before it returns.
// The error callback gets the server's response as it came, a made-up one
// (status -100, see MakeErrorResponse), or null where a follow-up request
// could not be sent.

#include <cstdint>
#include <vector>

#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

#include "assets/Asset.h"
#include "assets/Credentials.h"
#include "assets/DownloadResult.h"
#include "assets/SearchQuery.h"
#include "foundation/core/File.h"
#include "foundation/core/Guid.h"
#include "foundation/core/ImmutableString.h"
#include "foundation/net/Response.h"

namespace tolmonetsync {

enum SyncServer_ConnectionState : std::uint64_t {
    SyncServer_Unknown = 0,           // before any check; never reported
    SyncServer_Checking = 1,          // a check or logout is under way; never reported
    SyncServer_Connected = 2,
    SyncServer_NotLoggedIn = 3,
    SyncServer_ConnectionFailed = 4,
};

using ErrorCallback = boost::function<void(const Guid&, const boost::shared_ptr<tolmonet::Response>&)>;
using SuccessCallback = boost::function<void(const Guid&)>;
using CollectionCallback = boost::function<void(const Guid&, const boost::shared_ptr<Collection>&)>;
using AssetCallback = boost::function<void(const Guid&, const boost::shared_ptr<AssetBase>&)>;
using AssetsCallback = boost::function<void(const Guid&, const std::vector<boost::shared_ptr<AssetBase> >&)>;
using ItemCallback = boost::function<void(const Guid&, const boost::shared_ptr<Item>&)>;
using DownloadCallback = boost::function<void(const Guid&, const DownloadResult&)>;
using ConnectionStateCallback = boost::function<void(SyncServer_ConnectionState)>;

class SyncServer {
public:
    virtual bool SetCredentials(const ConnectionStateCallback& stateCallback, const OvraCredentials& credentials) = 0;
    virtual bool CheckConnection(const ConnectionStateCallback& stateCallback) = 0;
    virtual bool Logout(const ConnectionStateCallback& stateCallback) = 0;

    virtual Guid GetRootAsync(const CollectionCallback& success, const ErrorCallback& error,
                              const Guid& requestUID) = 0;
    virtual Guid GetPreferencesRootAsync(const CollectionCallback& success, const ErrorCallback& error,
                                         const Guid& requestUID) = 0;
    virtual UTF16String GetPreferencesRootName() const = 0;
    virtual Guid GetUserFileRootAsync(const CollectionCallback& success, const ErrorCallback& error,
                                      const Guid& requestUID) = 0;

    virtual Guid CreateCollectionAsync(const CollectionCallback& success, const ErrorCallback& error,
                                       const boost::shared_ptr<Collection>& parent, const UTF16String& name,
                                       CollectionType type, const Guid& requestUID) = 0;
    virtual Guid CreateCollectionAsync(const CollectionCallback& success, const ErrorCallback& error,
                                       const UTF16String& name, CollectionType type, const Guid& requestUID) = 0;
    virtual Guid DeleteAsync(const SuccessCallback& success, const ErrorCallback& error,
                             const boost::shared_ptr<AssetBase>& asset, bool recursive, const Guid& requestUID) = 0;
    virtual Guid DeleteAsync(const SuccessCallback& success, const ErrorCallback& error,
                             const boost::shared_ptr<Collection>& collection, const UTF16String& name,
                             bool recursive, const Guid& requestUID) = 0;
    virtual Guid AddAsync(const SuccessCallback& success, const ErrorCallback& error,
                          const boost::shared_ptr<Collection>& collection, const boost::shared_ptr<AssetBase>& asset,
                          const Guid& requestUID) = 0;
    virtual Guid UploadAsync(const ItemCallback& success, const ErrorCallback& error,
                             const boost::shared_ptr<Collection>& collection, const tolmocore::filesupport::File& file,
                             const ImmutableString& contentType, const UTF16String& name,
                             const Guid& requestUID) = 0;
    virtual Guid DownloadAsync(const DownloadCallback& success, const ErrorCallback& error,
                               const boost::shared_ptr<Item>& item, const tolmocore::filesupport::File& file,
                               const UTF8String& etag, const Guid& requestUID) = 0;
    virtual Guid SearchAsync(const AssetsCallback& success, const ErrorCallback& error, const SearchQuery& query,
                             const Guid& requestUID) = 0;
    virtual Guid SearchOneAsync(const AssetCallback& success, const ErrorCallback& error, const SearchQuery& query,
                                const Guid& requestUID) = 0;
    virtual Guid HeaderAsync(const AssetCallback& success, const ErrorCallback& error, const UTF8String& uid,
                             bool isCollection, const Guid& requestUID) = 0;
    virtual Guid FetchChildrenAsync(const SuccessCallback& success, const ErrorCallback& error,
                                    const boost::shared_ptr<Collection>& collection, const Guid& requestUID) = 0;

    // The client's address, tokens and connection state.
    UTF8String mServerURL;
    UTF8String mClientID;
    UTF8String mAccessToken;
    bool mMigrateMajor = false;
    bool mMigratePreviousMajor = false;
    UTF8String mRefreshToken;
    UTF8String mUserID;
    std::uint64_t mConnectionState = SyncServer_Unknown;

protected:
    // Servers are owned and deleted through shared pointers of their own class.
    ~SyncServer() = default;
};

}  // namespace tolmonetsync
