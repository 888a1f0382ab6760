#include "server/AssetRows.h"

namespace tolmonetsync {
namespace server {

const char kMediaRoot[] = "application/vnd.halvane.tarnvault.collection.root";
const char kMediaCollection[] = "application/vnd.halvane.tarnvault.collection";
const char kMediaPreferences[] = "application/vnd.halvane.tarnvault.collection.preferences";
const char kMediaDefaultContent[] = "application/octet-stream";

bool IsCollectionMediaType(const std::string& mediaType)
{
    return mediaType == kMediaRoot || mediaType == kMediaCollection || mediaType == kMediaPreferences;
}

namespace rows {

AssetRecord ReadAsset(const Statement& row)
{
    AssetRecord record;
    record.mId = row.Text(0);
    record.mCollection = row.Int(1) != 0;
    record.mMediaType = row.Text(2);
    record.mName = row.Text(3);
    record.mSize = row.Int(4);
    record.mEtag = row.Text(5);
    record.mCreated = row.Int(6);
    record.mModified = row.Int(7);
    record.mTrashed = row.Int(8) != 0;
    record.mClientRoot = !row.IsNull(9);
    return record;
}

boost::optional<AssetRecord> Find(Connection& db, std::int64_t owner, const std::string& id)
{
    Statement find(db, "SELECT " TOLMONETSYNC_ASSET_COLUMNS " FROM assets a WHERE a.id = ?1 AND a.owner = ?2");
    if (!find.Bind(1, id).Bind(2, owner).Step()) return boost::none;
    return ReadAsset(find);
}

AssetRecord Require(Connection& db, std::int64_t owner, const std::string& id)
{
    boost::optional<AssetRecord> found = Find(db, owner, id);
    if (!found) throw StoreFailure(404, "no asset '" + id + "'");
    return *found;
}

AssetRecord RequireCollection(Connection& db, std::int64_t owner, const std::string& id)
{
    boost::optional<AssetRecord> found = Find(db, owner, id);
    if (!found || !found->mCollection) throw StoreFailure(404, "no collection '" + id + "'");
    return *found;
}

namespace {

std::vector<AssetRecord> ReadAll(Statement& list)
{
    std::vector<AssetRecord> found;
    while (list.Step()) found.push_back(ReadAsset(list));
    return found;
}

}  // namespace

std::vector<AssetRecord> MembersOf(Connection& db, const std::string& collectionId)
{
    Statement list(db, "SELECT " TOLMONETSYNC_ASSET_COLUMNS
                       " FROM members m JOIN assets a ON a.id = m.asset WHERE m.collection = ?1 ORDER BY m.ord");
    list.Bind(1, collectionId);
    return ReadAll(list);
}

std::vector<AssetRecord> MembersNamed(Connection& db, std::int64_t owner, const std::string& collectionId,
                                      const std::string& name, std::int64_t trashed, std::int64_t orTrashed)
{
    // Assets by name first, CROSS JOIN fixing that order: walking the members
    // in order instead, as the planner would to save the sort, reads them all.
    Statement list(db,
                   "SELECT " TOLMONETSYNC_ASSET_COLUMNS
                   " FROM assets a INDEXED BY assets_name CROSS JOIN members m ON m.collection = ?2 AND m.asset = a.id"
                   " WHERE a.owner = ?1 AND a.name = ?3 AND a.trashed IN (?4, ?5) ORDER BY m.ord");
    list.Bind(1, owner).Bind(2, collectionId).Bind(3, name).Bind(4, trashed).Bind(5, orTrashed);
    return ReadAll(list);
}

std::vector<AssetRecord> AssetsNamed(Connection& db, std::int64_t owner, const std::string& name, std::int64_t trashed,
                                     std::int64_t orTrashed)
{
    // The index by owner would give creation order with no sort, and read
    // every asset of the owner.
    Statement list(db,
                   "SELECT " TOLMONETSYNC_ASSET_COLUMNS
                   " FROM assets a INDEXED BY assets_name WHERE a.owner = ?1 AND a.name = ?2 AND a.trashed IN (?3, ?4)"
                   " AND a.client_id IS NULL ORDER BY a.seq");
    list.Bind(1, owner).Bind(2, name).Bind(3, trashed).Bind(4, orTrashed);
    return ReadAll(list);
}

void Insert(Connection& db, std::int64_t owner, const AssetRecord& record, const std::string& clientId)
{
    Statement insert(db,
                     "INSERT INTO assets(id, owner, collection, media_type, name, size, etag, created, modified,"
                     " trashed, client_id) VALUES(?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9, ?10, NULLIF(?11, ''))");
    insert.Bind(1, record.mId)
        .Bind(2, owner)
        .Bind(3, std::int64_t(record.mCollection ? 1 : 0))
        .Bind(4, record.mMediaType)
        .Bind(5, record.mName)
        .Bind(6, record.mSize)
        .Bind(7, record.mEtag)
        .Bind(8, record.mCreated)
        .Bind(9, record.mModified)
        .Bind(10, std::int64_t(record.mTrashed ? 1 : 0))
        .Bind(11, clientId)
        .Run();
}

void AppendMember(Connection& db, const std::string& collectionId, const std::string& assetId)
{
    Statement(db,
              "INSERT OR IGNORE INTO members(collection, asset, ord)"
              " SELECT ?1, ?2, COALESCE(MAX(ord), 0) + 1 FROM members WHERE collection = ?1")
        .Bind(1, collectionId)
        .Bind(2, assetId)
        .Run();
}

bool Contains(Connection& db, const std::string& collectionId, const std::string& target)
{
    // UNION drops repeats, so the walk ends even on a shared subtree.
    Statement walk(db,
                   "WITH RECURSIVE below(id) AS (SELECT asset FROM members WHERE collection = ?1"
                   " UNION SELECT m.asset FROM members m JOIN below b ON m.collection = b.id)"
                   " SELECT 1 FROM below WHERE id = ?2 LIMIT 1");
    return walk.Bind(1, collectionId).Bind(2, target).Step();
}

}  // namespace rows
}  // namespace server
}  // namespace tolmonetsync
