#pragma once
// A SyncServer that keeps one user's tree in memory: the engine's tests run
// against it, and it is the model that a real service must agree with.
//
// Behaviour. Each operation does what the real client does with a real
// service, step by step: it makes the same requests in the same order under
// the same Guid (an upload is a search, a delete per asset of that name, the
// post and a header; a create with a parent is a create, a header and an
// add), and it treats their answers, failures and refusals the same way.
// What the service does with each request is InMemoryTree's. So:
//  - Callbacks run on the process-wide request processor's completion thread,
//    exactly once, with the operation's Guid, never inside the call. The
//    exceptions are the real client's: GetRootAsync with a cached client root
//    calls success before it returns (ChildrenMutex held), and so
//    GetPreferencesRootAsync on a cached root runs its first step inside the
//    call; DeleteAsync by name of a name that is not there releases both
//    callbacks without calling either.
//  - CreateCollectionAsync with a parent and GetPreferencesRootAsync run under
//    a Guid of their own, which they return and their callbacks receive.
//  - Assets handed to callbacks are fresh copies, as parsed JSON would be. Only
//    the item of an upload carries mEtag. AddAsync and UploadAsync append to the
//    caller's mChildren, FetchChildrenAsync empties it at the call and fills it
//    from the answer, a delete never touches it; all under ChildrenMutex.
//  - A SearchQuery whose trashed modifier is out of range throws
//    std::runtime_error("SearchCriteria Modifier error") on the caller's
//    thread before anything is sent.
//  - GetPreferencesRootAsync finds the preferences root below the client root
//    (the user root without a client identifier) or makes it. It never
//    migrates an earlier version's tree: migration is the real client's.
//  - SetCredentials, CheckConnection and Logout only record the tokens and
//    report SyncServer_Connected with an access token, SyncServer_NotLoggedIn
//    without one, through the callback on the completion thread. Proving
//    tokens and refreshing them is the real client's business.
//
// For tests: Tree() stages and reads the service's side; Faults() fails or
// refuses chosen requests, counts requests and tells whether a fault fired.
// Both may be used from any thread at any time.
//
// Threads. The tree and the fault table each guard themselves with a mutex of
// their own, which is never held while a callback runs. ChildrenMutex may be
// held while they are locked, never the other way round. The server lives as
// long as a request of it is in flight: each holds it by a shared pointer.

#include <boost/enable_shared_from_this.hpp>
#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

#include "assets/SyncServer.h"
#include "support/InMemoryFaults.h"
#include "support/InMemoryTree.h"

namespace testsupport {

class InMemoryServer final : public tolmonetsync::SyncServer, public boost::enable_shared_from_this<InMemoryServer> {
public:
    // A server with an empty user root and no client root yet; mClientID empty.
    static boost::shared_ptr<InMemoryServer> Create();
    ~InMemoryServer();

    bool SetCredentials(const tolmonetsync::ConnectionStateCallback& stateCallback,
                        const tolmonetsync::OvraCredentials& credentials) override;
    bool CheckConnection(const tolmonetsync::ConnectionStateCallback& stateCallback) override;
    bool Logout(const tolmonetsync::ConnectionStateCallback& stateCallback) override;

    Guid GetRootAsync(const tolmonetsync::CollectionCallback& success, const tolmonetsync::ErrorCallback& error,
                      const Guid& requestUID) override;
    Guid GetPreferencesRootAsync(const tolmonetsync::CollectionCallback& success,
                                 const tolmonetsync::ErrorCallback& error, const Guid& requestUID) override;
    // Company, "_", client name, "_", version, from the host's configuration.
    UTF16String GetPreferencesRootName() const override;
    Guid GetUserFileRootAsync(const tolmonetsync::CollectionCallback& success, const tolmonetsync::ErrorCallback& error,
                              const Guid& requestUID) override;

    Guid CreateCollectionAsync(const tolmonetsync::CollectionCallback& success,
                               const tolmonetsync::ErrorCallback& error,
                               const boost::shared_ptr<tolmonetsync::Collection>& parent, const UTF16String& name,
                               tolmonetsync::CollectionType type, const Guid& requestUID) override;
    Guid CreateCollectionAsync(const tolmonetsync::CollectionCallback& success,
                               const tolmonetsync::ErrorCallback& error, const UTF16String& name,
                               tolmonetsync::CollectionType type, const Guid& requestUID) override;
    Guid DeleteAsync(const tolmonetsync::SuccessCallback& success, const tolmonetsync::ErrorCallback& error,
                     const boost::shared_ptr<tolmonetsync::AssetBase>& asset, bool recursive,
                     const Guid& requestUID) override;
    Guid DeleteAsync(const tolmonetsync::SuccessCallback& success, const tolmonetsync::ErrorCallback& error,
                     const boost::shared_ptr<tolmonetsync::Collection>& collection, const UTF16String& name,
                     bool recursive, const Guid& requestUID) override;
    Guid AddAsync(const tolmonetsync::SuccessCallback& success, const tolmonetsync::ErrorCallback& error,
                  const boost::shared_ptr<tolmonetsync::Collection>& collection,
                  const boost::shared_ptr<tolmonetsync::AssetBase>& asset, const Guid& requestUID) override;
    Guid UploadAsync(const tolmonetsync::ItemCallback& success, const tolmonetsync::ErrorCallback& error,
                     const boost::shared_ptr<tolmonetsync::Collection>& collection,
                     const tolmocore::filesupport::File& file, const ImmutableString& contentType,
                     const UTF16String& name, const Guid& requestUID) override;
    Guid DownloadAsync(const tolmonetsync::DownloadCallback& success, const tolmonetsync::ErrorCallback& error,
                       const boost::shared_ptr<tolmonetsync::Item>& item, const tolmocore::filesupport::File& file,
                       const UTF8String& etag, const Guid& requestUID) override;
    Guid SearchAsync(const tolmonetsync::AssetsCallback& success, const tolmonetsync::ErrorCallback& error,
                     const tolmonetsync::SearchQuery& query, const Guid& requestUID) override;
    Guid SearchOneAsync(const tolmonetsync::AssetCallback& success, const tolmonetsync::ErrorCallback& error,
                        const tolmonetsync::SearchQuery& query, const Guid& requestUID) override;
    Guid HeaderAsync(const tolmonetsync::AssetCallback& success, const tolmonetsync::ErrorCallback& error,
                     const UTF8String& uid, bool isCollection, const Guid& requestUID) override;
    Guid FetchChildrenAsync(const tolmonetsync::SuccessCallback& success, const tolmonetsync::ErrorCallback& error,
                            const boost::shared_ptr<tolmonetsync::Collection>& collection,
                            const Guid& requestUID) override;

    // --- For tests ---

    InMemoryTree& Tree() { return mTree; }
    InMemoryFaultTable& Faults() { return mFaults; }

    // The service answers the Nth request of that kind (counted from now; 0:
    // every one) with status and body, and changes nothing.
    InMemoryFaultTable::FaultId FailRequest(InMemoryRequest request, unsigned nth, tolmonet::StatusCode status,
                                            const std::string& body);
    // The layer below does not take the Nth request of that kind (0: every one).
    InMemoryFaultTable::FaultId RefuseRequest(InMemoryRequest request, unsigned nth);
    unsigned RequestCount(InMemoryRequest request = InMemoryRequest_Any) const { return mFaults.RequestCount(request); }

    // What SetCredentials was last given.
    tolmonetsync::OvraCredentials LastCredentials() const;
    // The cached client root, or null (under ChildrenMutex).
    boost::shared_ptr<tolmonetsync::Collection> CachedRoot() const;

private:
    using AnswerHandler = boost::function<void(const Guid&, const InMemoryAnswer&)>;
    using Service = boost::function<InMemoryAnswer()>;

    InMemoryServer();

    // One request: counted and checked against the faults on the calling
    // thread; then, on the completion thread, the service answers it (unless
    // a fault answers instead) and the handler gets the answer. False if it
    // was refused, and then nothing runs.
    bool Send(InMemoryOperation operation, InMemoryRequest request, const Guid& requestUID, const Service& service,
              const AnswerHandler& handler);
    bool ReportState(const tolmonetsync::ConnectionStateCallback& stateCallback,
                     tolmonetsync::SyncServer_ConnectionState state);

    // The steps, tagged with the operation that a caller called.
    Guid SearchFor(InMemoryOperation operation, const tolmonetsync::AssetsCallback& success,
                   const tolmonetsync::ErrorCallback& error, const tolmonetsync::SearchQuery& query,
                   const Guid& requestUID);
    Guid SearchOneFor(InMemoryOperation operation, const tolmonetsync::AssetCallback& success,
                      const tolmonetsync::ErrorCallback& error, const tolmonetsync::SearchQuery& query,
                      const Guid& requestUID);
    Guid HeaderFor(InMemoryOperation operation, const tolmonetsync::AssetCallback& success,
                   const tolmonetsync::ErrorCallback& error, const UTF8String& uid, const Guid& requestUID);
    Guid CreateFor(InMemoryOperation operation, const tolmonetsync::CollectionCallback& success,
                   const tolmonetsync::ErrorCallback& error, const UTF16String& name, tolmonetsync::CollectionType type,
                   const Guid& requestUID);
    Guid AddFor(InMemoryOperation operation, const tolmonetsync::SuccessCallback& success,
                const tolmonetsync::ErrorCallback& error, const boost::shared_ptr<tolmonetsync::Collection>& collection,
                const boost::shared_ptr<tolmonetsync::AssetBase>& asset, const Guid& requestUID);
    Guid DeleteFor(InMemoryOperation operation, const tolmonetsync::SuccessCallback& success,
                   const tolmonetsync::ErrorCallback& error, const boost::shared_ptr<tolmonetsync::AssetBase>& asset,
                   bool recursive, const Guid& requestUID);
    Guid GetRootFor(InMemoryOperation operation, const tolmonetsync::CollectionCallback& success,
                    const tolmonetsync::ErrorCallback& error, const Guid& requestUID);
    Guid UserRootFor(InMemoryOperation operation, const tolmonetsync::CollectionCallback& success,
                     const tolmonetsync::ErrorCallback& error, const Guid& requestUID);

    void _HandlePreferencesParent(const tolmonetsync::CollectionCallback& success,
                                  const tolmonetsync::ErrorCallback& error, const Guid& requestUID,
                                  const boost::shared_ptr<tolmonetsync::Collection>& root);
    void _HandlePreferencesSearch(const boost::shared_ptr<tolmonetsync::Collection>& root, const UTF16String& name,
                                  const tolmonetsync::CollectionCallback& success,
                                  const tolmonetsync::ErrorCallback& error, const Guid& requestUID,
                                  const std::vector<boost::shared_ptr<tolmonetsync::AssetBase> >& assets);
    void _HandleUploadSearch(const boost::shared_ptr<tolmonetsync::Collection>& collection,
                             const tolmocore::filesupport::File& file, const UTF8String& contentType,
                             const UTF16String& name, const tolmonetsync::ItemCallback& success,
                             const tolmonetsync::ErrorCallback& error, const Guid& requestUID,
                             const std::vector<boost::shared_ptr<tolmonetsync::AssetBase> >& assets);
    void _HandleUploadPost(const boost::shared_ptr<tolmonetsync::Collection>& collection,
                           const tolmonetsync::ItemCallback& success, const tolmonetsync::ErrorCallback& error,
                           const Guid& requestUID, const InMemoryAnswer& answer);

    InMemoryTree mTree;
    InMemoryFaultTable mFaults;
    boost::shared_ptr<tolmonetsync::Collection> mRootCollection;  // guarded by ChildrenMutex
    mutable std::mutex mCredentialsMutex;
    tolmonetsync::OvraCredentials mLastCredentials;  // guarded by mCredentialsMutex
};

}  // namespace testsupport
