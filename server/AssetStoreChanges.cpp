// The requests that change a tree. Each runs under the database's write
// lock in one transaction, so a check and the change it allows are one step.

#include <algorithm>

#include "server/AssetRows.h"
#include "server/AssetStore.h"
#include "server/Random.h"

namespace tolmonetsync {
namespace server {

namespace {

bool IsRoot(const AssetRecord& record)
{
    return record.mCollection && record.mMediaType == kMediaRoot;
}

std::string NewEtag()
{
    return "\"" + RandomHex(12) + "\"";
}

}  // namespace

AssetRecord AssetStore::CreateCollection(std::int64_t owner, const std::string& name, const std::string& mediaType)
{
    if (mediaType != kMediaCollection && mediaType != kMediaPreferences) {
        throw StoreFailure(400, "cannot create a collection of type '" + mediaType + "'");
    }
    EnsureUserRoot(owner);
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    AssetRecord record;
    record.mId = RandomHex(16);
    record.mCollection = true;
    record.mMediaType = mediaType;
    record.mName = name;
    record.mCreated = record.mModified = Stamp();
    Transaction transaction(*db, true);
    rows::Insert(*db, owner, record, std::string());
    transaction.Commit();
    return record;
}

void AssetStore::Add(std::int64_t owner, const std::string& collectionId, const std::vector<std::string>& assetIds)
{
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    Transaction transaction(*db, true);
    rows::RequireCollection(*db, owner, collectionId);
    for (const std::string& assetId : assetIds) {
        const AssetRecord asset = rows::Require(*db, owner, assetId);
        if (assetId == collectionId || (asset.mCollection && rows::Contains(*db, assetId, collectionId))) {
            throw StoreFailure(409, "a collection cannot be inside itself");
        }
        rows::AppendMember(*db, collectionId, assetId);
    }
    transaction.Commit();
}

void AssetStore::Delete(std::int64_t owner, const std::string& id, bool recursive)
{
    std::vector<std::string> removedItems;
    {
        std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
        Database::Lease db = mDatabase.Acquire();
        Transaction transaction(*db, true);
        const AssetRecord target = rows::Require(*db, owner, id);
        if (IsRoot(target)) throw StoreFailure(403, "a root cannot be deleted");
        if (!recursive && target.mCollection && !rows::MembersOf(*db, id).empty()) {
            throw StoreFailure(409, "collection '" + id + "' is not empty");
        }
        std::vector<AssetRecord> doomed(1, target);
        while (!doomed.empty()) {
            const AssetRecord next = doomed.back();
            doomed.pop_back();
            const std::vector<AssetRecord> members =
                next.mCollection ? rows::MembersOf(*db, next.mId) : std::vector<AssetRecord>();
            Statement(*db, "DELETE FROM members WHERE collection = ?1 OR asset = ?1").Bind(1, next.mId).Run();
            Statement(*db, "DELETE FROM assets WHERE id = ?1").Bind(1, next.mId).Run();
            if (!next.mCollection) removedItems.push_back(next.mId);
            // A member still held by another collection stays; roots never go.
            for (const AssetRecord& member : members) {
                Statement parent(*db, "SELECT 1 FROM members WHERE asset = ?1 LIMIT 1");
                const bool held = parent.Bind(1, member.mId).Step();
                if (!held && !IsRoot(member)) doomed.push_back(member);
            }
        }
        transaction.Commit();
    }
    // After the commit: a crash before this leaves unreferenced bytes, never
    // an item without its bytes.
    for (const std::string& item : removedItems) mContent.Remove(item);
}

AssetRecord AssetStore::Upload(std::int64_t owner, const std::vector<std::string>& collectionIds,
                               const std::string& name, const std::string& contentType, const std::string& bytes)
{
    ContentFiles::Incoming content(mContent);
    content.Append(bytes.data(), bytes.size());
    return Upload(owner, collectionIds, name, contentType, content);
}

AssetRecord AssetStore::Upload(std::int64_t owner, const std::vector<std::string>& collectionIds,
                               const std::string& name, const std::string& contentType, ContentFiles::Incoming& content)
{
    if (IsCollectionMediaType(contentType)) throw StoreFailure(400, "a collection's media type is no content type");
    if (collectionIds.empty()) throw StoreFailure(400, "an upload needs a collection");
    {
        Database::Lease db = mDatabase.Acquire();
        for (const std::string& collection : collectionIds) rows::RequireCollection(*db, owner, collection);
    }
    AssetRecord record;
    record.mId = RandomHex(16);
    record.mMediaType = contentType.empty() ? std::string(kMediaDefaultContent) : contentType;
    record.mName = name;
    record.mSize = static_cast<std::int64_t>(content.Size());
    record.mEtag = NewEtag();
    // Bytes first, durable: the metadata that names them commits only after.
    content.Keep(record.mId);
    try {
        std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
        Database::Lease db = mDatabase.Acquire();
        Transaction transaction(*db, true);
        // Looked at again: a collection may have gone while the bytes were written.
        for (const std::string& collection : collectionIds) rows::RequireCollection(*db, owner, collection);
        record.mCreated = record.mModified = Stamp();
        rows::Insert(*db, owner, record, std::string());
        for (const std::string& collection : collectionIds) rows::AppendMember(*db, collection, record.mId);
        transaction.Commit();
    } catch (...) {
        mContent.Remove(record.mId);
        throw;
    }
    return record;
}

std::size_t AssetStore::RemoveUnreferencedContent()
{
    std::size_t removed = 0;
    Database::Lease db = mDatabase.Acquire();
    for (const std::string& id : mContent.Ids()) {
        Statement find(*db, "SELECT 1 FROM assets WHERE id = ?1 AND collection = 0");
        if (find.Bind(1, id).Step()) continue;
        mContent.Remove(id);
        ++removed;
    }
    return removed;
}

void AssetStore::SetTrashed(std::int64_t owner, const std::string& id, bool trashed)
{
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    Transaction transaction(*db, true);
    rows::Require(*db, owner, id);
    Statement(*db, "UPDATE assets SET trashed = ?1, modified = ?2 WHERE id = ?3")
        .Bind(1, std::int64_t(trashed ? 1 : 0))
        .Bind(2, Stamp())
        .Bind(3, id)
        .Run();
    transaction.Commit();
}

void AssetStore::SetModified(std::int64_t owner, const std::string& id, std::int64_t microsecondsSince1970)
{
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    rows::Require(*db, owner, id);
    Statement(*db, "UPDATE assets SET modified = ?1 WHERE id = ?2").Bind(1, microsecondsSince1970).Bind(2, id).Run();
}

}  // namespace server
}  // namespace tolmonetsync
