#pragma once
// The client of the asset service: the one real SyncServer, the processor
// that authorises its requests, and the service and cache types that tie it
// to the sync engine.
//
// A Tarnvault must be owned by a boost::shared_ptr before any ...Async call:
// each request keeps the client alive through shared_from_this() until its
// callback has run, and the handlers look at it through a weak pointer.

#include <atomic>
#include <cstdint>
#include <mutex>
#include <vector>

#include <boost/enable_shared_from_this.hpp>
#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>

#include "assets/SyncServer.h"
#include "foundation/core/ImmutableString.h"
#include "foundation/net/ForwardingProcessor.h"
#include "sync/SyncCache.h"
#include "sync/SyncFilesService.h"

namespace tolmonetsync {
namespace tarnvault {

// Query keys, request and response headers of the service's protocol.
extern const ImmutableString kQ;
extern const ImmutableString kMetadata;
extern const ImmutableString kScope;
extern const ImmutableString kName;
extern const ImmutableString kCollections;
extern const ImmutableString kRecursive;
extern const ImmutableString kAuthorization;
extern const ImmutableString kRequestID;
extern const ImmutableString kPersistencePolicy;
extern const ImmutableString kEthereal;
extern const ImmutableString kLastModified;
// Base URLs of the two hosted services; the parameter list may name another.
extern const ImmutableString kProduction;
extern const ImmutableString kStaging;

// Stamps every request with the owner's bearer token, the request's
// identifier and the authorised flag. The token is read at each request,
// through a pointer into the owner, so a new token takes effect with the next
// request; the processor must therefore not outlive its owner.
class TarnvaultProcessor : public tolmonet::http::ForwardingProcessor {
public:
    TarnvaultProcessor(const boost::shared_ptr<tolmonet::http::RequestProcessor>& target,
                       const UTF8String* accessToken);
    ~TarnvaultProcessor() override;

    // A copy of `headers` with "Authorization: Bearer <token>" and, for a
    // non-nil identifier, "X-REQUEST-ID".
    tolmonet::HeaderList AddAuthorization(const Guid& requestUID, const tolmonet::HeaderList& headers) const;

    void TryToCancelRequest(const Guid& requestUID) override;
    bool GET(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override;
    bool HEAD(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
              const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override;
    bool PUT(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const Body& body, const tolmonet::HeaderList& headers,
             const tolmonet::Configuration& configuration) override;
    bool PUTForm(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
                 const tolmonet::FormList& form, const tolmonet::HeaderList& headers,
                 const tolmonet::Configuration& configuration) override;
    bool POST(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
              const Body& body, const tolmonet::HeaderList& headers,
              const tolmonet::Configuration& configuration) override;
    bool POSTForm(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
                  const tolmonet::FormList& form, const tolmonet::HeaderList& headers,
                  const tolmonet::Configuration& configuration) override;
    bool DEL(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override;

private:
    const UTF8String* mAccessToken;  // the owner's; never null
};

class Tarnvault : public SyncServer, public boost::enable_shared_from_this<Tarnvault> {
public:
    // Reads the parameter list: kHEADER_LOCATION the base URL (empty or
    // absent: kProduction), kHEADER_USER_AGENT the client identifier,
    // kHEADER_COOKIE the access token, kHEADER_SET_COOKIE "auto",
    // kHEADER_CACHECONTROL a migration form. Keys compare by identity.
    explicit Tarnvault(const ParameterList& parameters);
    ~Tarnvault();

    // Both refuse a preference directory that others could change
    // (Dir::CheckPrefDir) before they touch a file there: SetCredentials
    // stores nothing ("OvraLogin error: " and the reason, traced), and
    // CheckConnection reports SyncServer_ConnectionFailed with the reason
    // traced after "CheckConnectionError: ", leaving the stored sign-in alone.
    bool SetCredentials(const ConnectionStateCallback& stateCallback, const OvraCredentials& credentials) override;
    bool CheckConnection(const ConnectionStateCallback& stateCallback) override;
    bool Logout(const ConnectionStateCallback& stateCallback) override;

    Guid GetRootAsync(const CollectionCallback& success, const ErrorCallback& error, const Guid& requestUID) override;
    Guid GetPreferencesRootAsync(const CollectionCallback& success, const ErrorCallback& error,
                                 const Guid& requestUID) override;
    UTF16String GetPreferencesRootName() const override;
    Guid GetUserFileRootAsync(const CollectionCallback& success, const ErrorCallback& error,
                              const Guid& requestUID) override;

    Guid CreateCollectionAsync(const CollectionCallback& success, const ErrorCallback& error,
                               const boost::shared_ptr<Collection>& parent, const UTF16String& name,
                               CollectionType type, const Guid& requestUID) override;
    Guid CreateCollectionAsync(const CollectionCallback& success, const ErrorCallback& error, const UTF16String& name,
                               CollectionType type, const Guid& requestUID) override;
    Guid DeleteAsync(const SuccessCallback& success, const ErrorCallback& error,
                     const boost::shared_ptr<AssetBase>& asset, bool recursive, const Guid& requestUID) override;
    Guid DeleteAsync(const SuccessCallback& success, const ErrorCallback& error,
                     const boost::shared_ptr<Collection>& collection, const UTF16String& name, bool recursive,
                     const Guid& requestUID) override;
    Guid AddAsync(const SuccessCallback& success, const ErrorCallback& error,
                  const boost::shared_ptr<Collection>& collection, const boost::shared_ptr<AssetBase>& asset,
                  const Guid& requestUID) override;
    Guid UploadAsync(const ItemCallback& success, const ErrorCallback& error,
                     const boost::shared_ptr<Collection>& collection, const tolmocore::filesupport::File& file,
                     const ImmutableString& contentType, const UTF16String& name, const Guid& requestUID) override;
    Guid DownloadAsync(const DownloadCallback& success, const ErrorCallback& error, const boost::shared_ptr<Item>& item,
                       const tolmocore::filesupport::File& file, const UTF8String& etag,
                       const Guid& requestUID) override;
    Guid SearchAsync(const AssetsCallback& success, const ErrorCallback& error, const SearchQuery& query,
                     const Guid& requestUID) override;
    Guid SearchOneAsync(const AssetCallback& success, const ErrorCallback& error, const SearchQuery& query,
                        const Guid& requestUID) override;
    Guid HeaderAsync(const AssetCallback& success, const ErrorCallback& error, const UTF8String& uid, bool isCollection,
                     const Guid& requestUID) override;
    Guid FetchChildrenAsync(const SuccessCallback& success, const ErrorCallback& error,
                            const boost::shared_ptr<Collection>& collection, const Guid& requestUID) override;

    // Renames a source asset for its copy; empty: names stay.
    using NameMap = boost::function<UTF16String(const boost::shared_ptr<AssetBase>&)>;
    // The root of the client identifier that host versions up to 8.0 used;
    // never cached.
    virtual Guid GetRootForCinderalOldClientIDAsync(const CollectionCallback& success, const ErrorCallback& error,
                                                    const Guid& requestUID);
    // Copies everything below `source` into `destination`, at any depth.
    // `completion` once when all has arrived; else `error` once, with the
    // first failure's text, after the rest has run. What arrived stays.
    virtual Guid CopyAsync(const SuccessCallback& completion, const ErrorCallback& error,
                           const boost::shared_ptr<Collection>& source,
                           const boost::shared_ptr<Collection>& destination, const Guid& requestUID,
                           const NameMap& nameMap);

    // The last path segment of the response's Location; empty when there is
    // no Location or it has fewer than three segments.
    static UTF8String GetUIDFromLocation(const boost::shared_ptr<tolmonet::Response>& response);

    // The cached client root, null until a GetRootAsync found it.
    boost::shared_ptr<Collection> CachedRoot() const;
    // Whether the parameter list asked for the environment login.
    bool AutoLoginRequested() const { return mAutoLogin; }

    // A download whose body reaches the limit fails with "Data size beyond
    // the limitation!", and the file it was given is removed. The limit
    // travels with each download's request (Configuration::mMaxResponseBody),
    // so the processor stops the transfer there; the body streams into the
    // file as it arrives (DownloadSinkPrivate.h) and is never held whole. The
    // default, and the most, is kMaxDownloadSize, the range of one block
    // write; a host may set a lower one, at least 1 (only empty bodies).
    // Any thread; counts from the next download.
    static constexpr std::uint64_t kMaxDownloadSize = std::uint64_t(1) << 32;
    void SetDownloadSizeLimit(std::uint64_t bytes);
    std::uint64_t DownloadSizeLimit() const { return mDownloadSizeLimit.load(); }

    // Told when PrepareSync's migration finds the earlier version's
    // preferences root and starts copying it into the new one: with that
    // version ("8.0") and the old root's name. Called once per migration, on
    // the completion thread, before the first copy request; not called when
    // there is nothing to copy. An empty function (the default) tells no one.
    // A setter rather than a trace line, so that a host can rely on it; any
    // thread, counts from the next migration.
    using MigrationStartedCallback =
        boost::function<void(const UTF16String& fromVersion, const UTF16String& fromRootName)>;
    void SetMigrationStartedCallback(const MigrationStartedCallback& callback);
    MigrationStartedCallback GetMigrationStartedCallback() const;

private:
    // Signs in from TOLMONETSYNC_USERNAME and TOLMONETSYNC_PASSWORD, or reuses
    // the process's earlier environment sign-in once the service accepts it.
    // Blocks the calling thread; never call it on the completion thread.
    void EnvironmentLogin();

    // The probe of CheckConnection: a client of its own, with our address,
    // client identifier and the candidate token.
    boost::shared_ptr<Tarnvault> MakeProbe(const OvraCredentials& credentials) const;
    void ReportState(const ConnectionStateCallback& stateCallback, SyncServer_ConnectionState state);
    static void _HandleCheckConnection(const boost::weak_ptr<Tarnvault>& self,
                                       const boost::shared_ptr<Tarnvault>& probe,
                                       const ConnectionStateCallback& stateCallback, const Guid& requestUID,
                                       const boost::shared_ptr<Collection>& root);
    static void _HandleCheckConnectionError(const boost::weak_ptr<Tarnvault>& self,
                                            const boost::shared_ptr<Tarnvault>& probe,
                                            const ConnectionStateCallback& stateCallback, const Guid& requestUID,
                                            const boost::shared_ptr<tolmonet::Response>& response);
    static void _HandleUploadAsyncSearch(const boost::weak_ptr<Tarnvault>& self,
                                         const boost::shared_ptr<Collection>& collection,
                                         const tolmocore::filesupport::File& file, const ImmutableString& contentType,
                                         const UTF16String& name, const ItemCallback& success,
                                         const ErrorCallback& error, const Guid& requestUID,
                                         const std::vector<boost::shared_ptr<AssetBase> >& assets);
    static void _HandleGetRoot(const boost::weak_ptr<Tarnvault>& self, const CollectionCallback& success,
                               const ErrorCallback& error, bool cache, const Guid& requestUID,
                               const boost::shared_ptr<tolmonet::Response>& response);

    boost::shared_ptr<tolmonet::http::RequestProcessor> mProcessor;
    boost::shared_ptr<Collection> mRootCollection;  // guarded by ChildrenMutex
    bool mAutoLogin = false;
    std::atomic<std::uint64_t> mDownloadSizeLimit{kMaxDownloadSize};
    mutable std::mutex mMigrationStartedMutex;  // guards mMigrationStarted
    MigrationStartedCallback mMigrationStarted;
};

// The sync service of the asset service: owns one client for its life.
class SyncTarnvault : public SyncFilesService {
public:
    explicit SyncTarnvault(const ParameterList& parameters);
    ~SyncTarnvault() override;

    static boost::shared_ptr<SyncFilesService> CreateTarnvaultHelper(const ParameterList& parameters);

    const boost::shared_ptr<SyncServer>& GetApi() const override;
    SyncServiceType GetType() const override;
    boost::shared_ptr<SyncCache> CreateCache(const std::vector<SyncFile>& files, const std::vector<SyncDir>& dirs,
                                             const ProgressCallback& progress,
                                             const ItemToFileCallback& itemToFile) override;

private:
    boost::shared_ptr<SyncServer> mApi;
};

// A plan of the asset service: keeps the client alive while it lives.
class TarnvaultCache : public SyncCache {
public:
    TarnvaultCache(const std::vector<SyncFile>& files, const std::vector<SyncDir>& dirs,
                   const ProgressCallback& progress, const ItemToFileCallback& itemToFile,
                   const boost::shared_ptr<SyncServer>& api);
    ~TarnvaultCache() override;

    const boost::shared_ptr<SyncServer>& GetApi() const override;

private:
    boost::shared_ptr<SyncServer> mApi;
};

}  // namespace tarnvault
}  // namespace tolmonetsync
