// Roots and the read requests. The changes are in AssetStoreChanges.cpp.

#include "server/AssetStore.h"

#include <chrono>
#include <set>
#include <utility>

#include "server/AssetRows.h"
#include "server/Random.h"

namespace tolmonetsync {
namespace server {

namespace {

bool MatchesTrashed(const TrashedCriterion& criterion, bool trashed)
{
    switch (criterion.mModifier) {
        case 0:
            return true;
        case 1:
        case 3:
            return trashed == criterion.mValue;
        case 2:
            return trashed != criterion.mValue;
        default:
            return false;
    }
}

bool Matches(const SearchFilter& filter, const AssetRecord& record)
{
    if (!filter.mType.empty() && (!record.mCollection || record.mMediaType != filter.mType)) return false;
    if (!filter.mName.empty() && record.mName != filter.mName) return false;
    return MatchesTrashed(filter.mTrashed, record.mTrashed);
}

// The flag values a database lookup may narrow to; Matches still decides.
std::pair<std::int64_t, std::int64_t> TrashedValues(const TrashedCriterion& criterion)
{
    if (!MatchesTrashed(criterion, false)) return {1, 1};
    if (!MatchesTrashed(criterion, true)) return {0, 0};
    return {0, 1};
}

}  // namespace

AssetStore::AssetStore(Database& database, ContentFiles& content) : mDatabase(database), mContent(content) {}

std::int64_t AssetStore::Stamp()
{
    // Strictly later than the change before, so "modified" always moves.
    std::int64_t now =
        std::chrono::duration_cast<std::chrono::microseconds>(std::chrono::system_clock::now().time_since_epoch())
            .count();
    if (now <= mLastStamp) now = mLastStamp + 1;
    mLastStamp = now;
    return now;
}

void AssetStore::EnsureUserRoot(std::int64_t owner)
{
    {
        std::lock_guard<std::mutex> lock(mRootsMutex);
        if (mUsersWithRoot.count(owner)) return;
    }
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    Statement find(*db,
                   "SELECT 1 FROM assets WHERE owner = ?1 AND collection = 1 AND media_type = ?2"
                   " AND client_id IS NULL LIMIT 1");
    if (!find.Bind(1, owner).Bind(2, std::string(kMediaRoot)).Step()) {
        AssetRecord root;
        root.mId = RandomHex(16);
        root.mCollection = true;
        root.mMediaType = kMediaRoot;
        root.mName = "root";
        root.mCreated = root.mModified = Stamp();
        Transaction transaction(*db, true);
        rows::Insert(*db, owner, root, std::string());
        transaction.Commit();
    }
    std::lock_guard<std::mutex> lock(mRootsMutex);
    mUsersWithRoot.insert(owner);
}

AssetRecord AssetStore::UserRoot(std::int64_t owner)
{
    EnsureUserRoot(owner);
    Database::Lease db = mDatabase.Acquire();
    Statement find(*db, "SELECT " TOLMONETSYNC_ASSET_COLUMNS
                        " FROM assets a WHERE a.owner = ?1 AND a.collection = 1 AND a.media_type = ?2"
                        " AND a.client_id IS NULL ORDER BY a.seq LIMIT 1");
    find.Bind(1, owner).Bind(2, std::string(kMediaRoot)).Step();
    return rows::ReadAsset(find);
}

AssetRecord AssetStore::ClientRoot(std::int64_t owner, const std::string& clientId)
{
    EnsureUserRoot(owner);
    const char* const kFind =
        "SELECT " TOLMONETSYNC_ASSET_COLUMNS " FROM assets a WHERE a.owner = ?1 AND a.client_id = ?2";
    {
        Database::Lease db = mDatabase.Acquire();
        Statement find(*db, kFind);
        if (find.Bind(1, owner).Bind(2, clientId).Step()) return rows::ReadAsset(find);
    }
    // Under the write lock, look again: two first requests make one root.
    std::lock_guard<std::mutex> writer(mDatabase.WriteLock());
    Database::Lease db = mDatabase.Acquire();
    {
        Statement find(*db, kFind);
        if (find.Bind(1, owner).Bind(2, clientId).Step()) return rows::ReadAsset(find);
    }
    AssetRecord root;
    root.mId = RandomHex(16);
    root.mCollection = true;
    root.mMediaType = kMediaRoot;
    root.mName = clientId;
    root.mCreated = root.mModified = Stamp();
    root.mClientRoot = true;
    Transaction transaction(*db, true);
    rows::Insert(*db, owner, root, clientId);
    transaction.Commit();
    return root;
}

std::vector<AssetRecord> AssetStore::Search(std::int64_t owner, const SearchFilter& filter,
                                            const std::vector<std::string>& scopes)
{
    EnsureUserRoot(owner);
    Database::Lease db = mDatabase.Acquire();
    Transaction snapshot(*db, false);
    // A name narrows in the database, before any row is read; Matches stays
    // the one definition of what is found.
    const bool byName = !filter.mName.empty();
    const std::pair<std::int64_t, std::int64_t> trashed = TrashedValues(filter.mTrashed);
    std::vector<AssetRecord> candidates;
    if (scopes.empty()) {
        if (byName) {
            candidates = rows::AssetsNamed(*db, owner, filter.mName, trashed.first, trashed.second);
        } else {
            Statement all(*db, "SELECT " TOLMONETSYNC_ASSET_COLUMNS
                               " FROM assets a WHERE a.owner = ?1 AND a.client_id IS NULL ORDER BY a.seq");
            all.Bind(1, owner);
            while (all.Step()) candidates.push_back(rows::ReadAsset(all));
        }
    } else {
        std::set<std::string> seen;
        for (const std::string& scope : scopes) {
            rows::RequireCollection(*db, owner, scope);
            std::vector<AssetRecord> members =
                byName ? rows::MembersNamed(*db, owner, scope, filter.mName, trashed.first, trashed.second)
                       : rows::MembersOf(*db, scope);
            for (AssetRecord& member : members) {
                if (seen.insert(member.mId).second) candidates.push_back(std::move(member));
            }
        }
    }
    std::vector<AssetRecord> found;
    for (AssetRecord& record : candidates) {
        if (Matches(filter, record)) found.push_back(std::move(record));
    }
    return found;
}

AssetRecord AssetStore::Get(std::int64_t owner, const std::string& id)
{
    Database::Lease db = mDatabase.Acquire();
    return rows::Require(*db, owner, id);
}

std::vector<AssetRecord> AssetStore::Members(std::int64_t owner, const std::string& collectionId)
{
    Database::Lease db = mDatabase.Acquire();
    Transaction snapshot(*db, false);
    rows::RequireCollection(*db, owner, collectionId);
    return rows::MembersOf(*db, collectionId);
}

AssetRecord AssetStore::Item(std::int64_t owner, const std::string& itemId)
{
    Database::Lease db = mDatabase.Acquire();
    boost::optional<AssetRecord> found = rows::Find(*db, owner, itemId);
    if (!found || found->mCollection) throw StoreFailure(404, "no item '" + itemId + "'");
    return *found;
}

std::shared_ptr<const ContentFiles::Opened> AssetStore::OpenContent(const std::string& itemId)
{
    try {
        return mContent.Open(itemId);
    } catch (const std::runtime_error&) {
        // Deleted between the lookup and the read.
        throw StoreFailure(404, "no item '" + itemId + "'");
    }
}

std::string AssetStore::Content(std::int64_t owner, const std::string& itemId, AssetRecord& record)
{
    record = Item(owner, itemId);
    try {
        return mContent.Read(itemId);
    } catch (const std::runtime_error&) {
        throw StoreFailure(404, "no item '" + itemId + "'");
    }
}

}  // namespace server
}  // namespace tolmonetsync
