#pragma once
// Each user's tree of collections and items: metadata in the database,
// content through ContentFiles. Every operation takes the user's number and
// sees only that user's assets, so another user's id reads as missing (404).
//
// What it answers, as the in-memory model does:
//  - one user root per user, named "root", made on the user's first request;
//    one client root per client identifier, made on first request for it,
//    member of nothing, never found by a search without a scope;
//  - search: without scopes every asset but client roots in creation order;
//    with scopes the direct members of those collections in member order,
//    each asset once;
//  - create: kinds other than collection and preferences are 400;
//  - add: missing 404, a cycle 409, an existing member stays where it is;
//  - delete: missing 404, a root 403, a non-empty collection 409 unless
//    recursive; recursively, members left in no other collection go too;
//  - upload: the bytes are durable before the metadata commits, so a crash
//    leaves either nothing or the whole item; a collection media type 400;
//    an empty content type becomes application/octet-stream.
// Failures throw StoreFailure; storage trouble DatabaseError or
// std::runtime_error. Threads: any; writes are serialised.

#include <cstdint>
#include <mutex>
#include <set>
#include <string>
#include <vector>

#include "server/AssetRecord.h"
#include "server/ContentFiles.h"
#include "server/Database.h"

namespace tolmonetsync {
namespace server {

// The condition on "trashed": 0 none, 1 equal, 2 not equal, 3 contains
// (equal on this one flag).
struct TrashedCriterion {
    int mModifier = 2;
    bool mValue = true;
};

struct SearchFilter {
    std::string mType;  // a collection media type, or empty for any asset
    std::string mName;  // exact, or empty for any
    TrashedCriterion mTrashed;
};

class AssetStore {
public:
    AssetStore(Database& database, ContentFiles& content);

    AssetRecord ClientRoot(std::int64_t owner, const std::string& clientId);
    AssetRecord UserRoot(std::int64_t owner);
    // Scopes are collection ids.
    std::vector<AssetRecord> Search(std::int64_t owner, const SearchFilter& filter,
                                    const std::vector<std::string>& scopes);
    AssetRecord Get(std::int64_t owner, const std::string& id);
    std::vector<AssetRecord> Members(std::int64_t owner, const std::string& collectionId);
    // An item's record; 404 for a collection or an unknown id.
    AssetRecord Item(std::int64_t owner, const std::string& itemId);
    // The item's bytes, opened (404 if they are gone), or read whole.
    std::shared_ptr<const ContentFiles::Opened> OpenContent(const std::string& itemId);
    std::string Content(std::int64_t owner, const std::string& itemId, AssetRecord& record);

    AssetRecord CreateCollection(std::int64_t owner, const std::string& name, const std::string& mediaType);
    // All or none: every id is checked before anything changes.
    void Add(std::int64_t owner, const std::string& collectionId, const std::vector<std::string>& assetIds);
    void Delete(std::int64_t owner, const std::string& id, bool recursive);
    AssetRecord Upload(std::int64_t owner, const std::vector<std::string>& collectionIds, const std::string& name,
                       const std::string& contentType, const std::string& bytes);
    // The same with bytes already received; they are kept under the new id.
    AssetRecord Upload(std::int64_t owner, const std::vector<std::string>& collectionIds, const std::string& name,
                       const std::string& contentType, ContentFiles::Incoming& content);
    // Removes content files that no item names: what a crash between the
    // write of the bytes and the commit of their metadata leaves. At start only.
    std::size_t RemoveUnreferencedContent();
    // For tests and tools: the service has no request that trashes.
    void SetTrashed(std::int64_t owner, const std::string& id, bool trashed);
    // For tests and tools: dates an item as another computer's clock would
    // (microseconds since 1970), where the service's own stamps are unique.
    void SetModified(std::int64_t owner, const std::string& id, std::int64_t microsecondsSince1970);

private:
    void EnsureUserRoot(std::int64_t owner);
    std::int64_t Stamp();  // with the write lock held

    Database& mDatabase;
    ContentFiles& mContent;
    std::mutex mRootsMutex;  // guards mUsersWithRoot
    std::set<std::int64_t> mUsersWithRoot;
    std::int64_t mLastStamp = 0;  // guarded by the database's write lock
};

}  // namespace server
}  // namespace tolmonetsync
