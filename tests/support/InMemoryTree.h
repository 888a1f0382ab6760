#pragma once
// The service side of the in-memory server: one user's tree of collections
// and items, answering the requests a real service answers, and letting a
// test stage it and read it directly.
//
// What it keeps, per asset: an opaque id, a name (any text, hostile ones
// included), created and modified dates (UTC, to the microsecond), a trashed
// flag; for a collection its kind and its members in member order; for an
// item its media type, bytes and entity tag. An asset may be a member of
// several collections. There is one user root, made with the tree, and one
// client root per client identifier, made on first request for it; client
// roots are members of nothing and no search without a scope finds them.
//
// Dates come from the tree's clock. Each change is stamped strictly later
// than the change before it, even while a test holds the clock still, so
// that "modified" changes on every upload and every new content.
//
// Every member function locks the tree's own mutex for its whole run and
// calls out to nothing, so any thread may call any of them. Assets handed
// out are fresh copies, as a client parsing the service's JSON would make
// them: no entity tag (only a finished upload sets one), no children.
//
// Staging functions throw std::invalid_argument for an id that names no
// asset (or no collection where one is needed).

#include <cstdint>
#include <map>
#include <mutex>
#include <string>
#include <vector>

#include <boost/date_time/posix_time/posix_time_types.hpp>
#include <boost/shared_ptr.hpp>

#include "assets/Asset.h"
#include "assets/SearchQuery.h"
#include "foundation/net/Response.h"

namespace testsupport {

// The service's answer to one request. Success statuses are 200, 201 for a
// create or an upload, 304 for a download of unchanged content.
struct InMemoryAnswer {
    tolmonet::StatusCode mStatus = 200;
    std::string mError;                                                // one line for people, the body of a failure
    std::vector<boost::shared_ptr<tolmonetsync::AssetBase> > mAssets;  // search, header, client root
    UTF8String mId;                                                    // create, upload: the new asset
    UTF8String mEtag;                                                  // upload, download
    UTF8String mContentType;                                           // download
    boost::shared_ptr<const std::string> mBytes;                       // download
    boost::posix_time::ptime mModified;                                // download
};

class InMemoryTree {
public:
    InMemoryTree();
    InMemoryTree(const InMemoryTree&) = delete;
    InMemoryTree& operator=(const InMemoryTree&) = delete;

    // --- Requests, as the service answers them ---

    // The client root of that name, made on first request: 200 with it.
    InMemoryAnswer GetClientRoot(const UTF8String& clientID);
    // 200 with the matches. Without scopes: every asset but the client roots,
    // in creation order. With scopes ("/collections/<id>"): the direct
    // members of those collections, in member order, scope after scope, each
    // asset once. A scope of another shape is 400, one naming no collection
    // 404. A type other than none finds only collections of that kind; a name
    // finds exactly that name; the trashed criterion as SearchCriteria says,
    // "contains" meaning "equal" on this one flag. A modifier out of range is 400.
    InMemoryAnswer Search(tolmonetsync::CollectionType type, const UTF16String& name,
                          const tolmonetsync::SearchCriteria& trashed, const std::vector<UTF8String>& scopes);
    // 200 with the asset, whatever its class; 404 if there is none.
    InMemoryAnswer Header(const UTF8String& id);
    // 201 with the new collection's id. It is a member of nothing. The kinds
    // none and root are 400: the service makes roots itself.
    InMemoryAnswer CreateCollection(const UTF16String& name, tolmonetsync::CollectionType type);
    // 200 once the asset is a member (at the end; an existing member stays
    // where it is). 404 for a missing collection or asset, 409 if it would
    // make a collection a member of itself or of something inside it.
    InMemoryAnswer Add(const UTF8String& collectionId, const UTF8String& assetId);
    // 200 once the asset is gone from the tree and from every collection. A
    // root is 403, a missing asset 404. A collection with members is 409
    // unless recursive; recursively, each member that is left in no other
    // collection goes too, and so on down.
    InMemoryAnswer Delete(const UTF8String& id, bool recursive);
    // 201 with the new item's id and entity tag; the item is the last member
    // of the collection. 404 for a missing collection, 400 for a collection's
    // media type as content type. An empty content type is stored as
    // application/octet-stream.
    InMemoryAnswer Upload(const UTF8String& collectionId, const UTF16String& name, const UTF8String& contentType,
                          const std::string& bytes);
    // 304 when etag is the item's present entity tag; otherwise 200 with the
    // bytes, entity tag, media type and modified date. 404 for a missing
    // asset or a collection.
    InMemoryAnswer Download(const UTF8String& id, const UTF8String& etag);

    // --- Staging ---

    UTF8String UserRootId() const;
    // Makes the client root if there is none yet.
    UTF8String ClientRootId(const UTF8String& clientID);
    // A new collection, appended to the members of parentId (none if empty).
    UTF8String MakeCollection(const UTF8String& parentId, const UTF16String& name,
                              tolmonetsync::CollectionType type = tolmonetsync::kCollectionType_Collection);
    // A new item, appended to the members of parentId (none if empty).
    UTF8String PutItem(const UTF8String& parentId, const UTF16String& name, const std::string& bytes,
                       const UTF8String& contentType = "application/octet-stream");
    // New bytes: a new entity tag and a new modified date, as an upload gives.
    void SetContent(const UTF8String& itemId, const std::string& bytes);
    // Replaces a date without touching anything else.
    void SetModified(const UTF8String& id, const boost::posix_time::ptime& modified);
    void SetCreated(const UTF8String& id, const boost::posix_time::ptime& created);
    void SetTrashed(const UTF8String& id, bool trashed);
    void Rename(const UTF8String& id, const UTF16String& name);
    void AddMember(const UTF8String& collectionId, const UTF8String& assetId);
    // Takes it out of that collection only; false if it was not a member.
    bool RemoveMember(const UTF8String& collectionId, const UTF8String& assetId);
    // Deletes as the request does (recursively), for a test's own use; throws
    // std::runtime_error where the request would fail.
    void Remove(const UTF8String& id);

    // --- Reading ---

    bool Exists(const UTF8String& id) const;
    std::size_t AssetCount() const;  // the roots included
    std::string Content(const UTF8String& itemId) const;
    UTF8String Etag(const UTF8String& itemId) const;
    UTF8String ContentType(const UTF8String& itemId) const;
    UTF16String Name(const UTF8String& id) const;
    boost::posix_time::ptime Created(const UTF8String& id) const;
    boost::posix_time::ptime Modified(const UTF8String& id) const;
    bool IsTrashed(const UTF8String& id) const;
    std::vector<UTF8String> ChildIds(const UTF8String& collectionId) const;
    std::vector<UTF16String> ChildNames(const UTF8String& collectionId) const;
    // The first member of that name; empty if there is none.
    UTF8String FindChild(const UTF8String& collectionId, const UTF16String& name) const;
    // Follows the names down from fromId, each the first member of its name;
    // empty if one is missing.
    UTF8String FindPath(const UTF8String& fromId, const std::vector<UTF16String>& names) const;
    // Fresh client copies, as a header request gives them.
    boost::shared_ptr<tolmonetsync::Collection> CollectionCopy(const UTF8String& collectionId) const;
    boost::shared_ptr<tolmonetsync::Item> ItemCopy(const UTF8String& itemId) const;

    // --- Clock ---

    // Holds the clock at this time (UTC) until it is set or advanced again.
    void SetClock(const boost::posix_time::ptime& now);
    void AdvanceClock(const boost::posix_time::time_duration& by);
    // Back to the system's clock, the default.
    void UseSystemClock();
    // The stamp the next change would get at the earliest.
    boost::posix_time::ptime Now() const;

private:
    struct Node {
        UTF8String mId;
        bool mCollection = false;
        tolmonetsync::CollectionType mType = tolmonetsync::kCollectionType_None;
        UTF16String mName;
        UTF8String mContentType;
        boost::shared_ptr<const std::string> mBytes;
        UTF8String mEtag;
        boost::posix_time::ptime mCreated;
        boost::posix_time::ptime mModified;
        bool mTrashed = false;
        bool mClientRoot = false;
        std::uint64_t mSequence = 0;  // creation order
        std::vector<UTF8String> mMembers;
    };

    // All of these expect mMutex held.
    Node& NewNode(bool collection, const UTF16String& name);
    Node& NodeOf(const UTF8String& id);
    const Node& NodeOf(const UTF8String& id) const;
    Node& CollectionOf(const UTF8String& id);
    const Node& CollectionOf(const UTF8String& id) const;
    const Node* Find(const UTF8String& id) const;
    Node* Find(const UTF8String& id);
    bool HasParent(const UTF8String& id) const;
    bool Contains(const Node& collection, const UTF8String& id) const;  // at any depth
    InMemoryAnswer DeleteLocked(const UTF8String& id, bool recursive);
    void NewContent(Node& item, const std::string& bytes);
    boost::shared_ptr<tolmonetsync::AssetBase> Copy(const Node& node) const;
    boost::posix_time::ptime Stamp();

    mutable std::mutex mMutex;  // guards everything below
    std::map<UTF8String, Node> mNodes;
    std::map<UTF8String, UTF8String> mClientRoots;  // client identifier to root id
    UTF8String mUserRoot;
    std::uint64_t mNextSequence = 1;
    std::uint64_t mNextEtag = 1;
    bool mClockHeld = false;
    boost::posix_time::ptime mClock;      // while held
    boost::posix_time::ptime mLastStamp;  // not-a-date-time before the first
};

}  // namespace testsupport
