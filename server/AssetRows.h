#pragma once
// Reading and writing asset rows: the SQL that AssetStore's read and change
// paths share. Every function expects a leased connection.

#include <cstdint>
#include <string>
#include <vector>

#include <boost/optional.hpp>

#include "server/AssetRecord.h"
#include "server/Database.h"

namespace tolmonetsync {
namespace server {
namespace rows {

// The columns every SELECT of an asset gives, in ReadAsset's order.
#define TOLMONETSYNC_ASSET_COLUMNS \
    "a.id, a.collection, a.media_type, a.name, a.size, a.etag, a.created, a.modified, a.trashed, a.client_id"

AssetRecord ReadAsset(const Statement& row);
boost::optional<AssetRecord> Find(Connection& db, std::int64_t owner, const std::string& id);
// Find, or StoreFailure 404 naming the id.
AssetRecord Require(Connection& db, std::int64_t owner, const std::string& id);
// Require, and 404 unless it is a collection.
AssetRecord RequireCollection(Connection& db, std::int64_t owner, const std::string& id);
std::vector<AssetRecord> MembersOf(Connection& db, const std::string& collectionId);
// Lookups by exact name, through the name index, so their cost follows the
// matches, not the size of the collection or of the tree. Only assets whose
// trashed flag is `trashed` or `orTrashed` (pass 0 and 1 for either).
// The direct members of the collection so named, in member order:
std::vector<AssetRecord> MembersNamed(Connection& db, std::int64_t owner, const std::string& collectionId,
                                      const std::string& name, std::int64_t trashed, std::int64_t orTrashed);
// Every asset so named but client roots, in creation order:
std::vector<AssetRecord> AssetsNamed(Connection& db, std::int64_t owner, const std::string& name, std::int64_t trashed,
                                     std::int64_t orTrashed);
void Insert(Connection& db, std::int64_t owner, const AssetRecord& record, const std::string& clientId);
// Appends to the end of the collection's members unless already a member.
void AppendMember(Connection& db, const std::string& collectionId, const std::string& assetId);
// True if target is inside collection at any depth.
bool Contains(Connection& db, const std::string& collectionId, const std::string& target);

}  // namespace rows
}  // namespace server
}  // namespace tolmonetsync
