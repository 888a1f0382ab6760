#pragma once
// Builds a user's tree in the local service directly, for tests and tools
// that need a service holding something already: an earlier host version's
// preferences root with nested collections and items, or a root under
// another client identifier.
//
//   TreeSeeder seed(service, "ann");
//   const std::string old = seed.Collection(seed.ClientRoot("desk"), "Co_App_9.1", kMediaPreferences);
//   seed.Item(seed.Collection(old, "Settings"), "view.json", "{}", "application/json");
//
// Members keep the order they were added in. The store refuses a collection
// inside itself, as the service does. Describe gives a subtree as text, for
// comparing trees before and after.

#include <cstdint>
#include <map>
#include <string>

#include "server/AssetRecord.h"

namespace tolmonetsync {
namespace server {

class LocalService;

class TreeSeeder {
public:
    TreeSeeder(LocalService& service, const std::string& user);

    // The id of the client root of that identifier, made if missing.
    std::string ClientRoot(const std::string& clientId);
    // A new collection inside `parentId`; its id.
    std::string Collection(const std::string& parentId, const std::string& name,
                           const char* mediaType = kMediaCollection);
    // A new item inside `parentId`; its id.
    std::string Item(const std::string& parentId, const std::string& name, const std::string& bytes,
                     const std::string& contentType = kMediaDefaultContent);
    // The first member of that name, or empty text.
    std::string Find(const std::string& collectionId, const std::string& name);
    // The items directly inside the collection, name -> bytes; of several of
    // one name the first, as a client reading them by name finds it.
    std::map<std::string, std::string> Contents(const std::string& collectionId);
    // One line per asset below the collection, depth-first, siblings in name
    // order (so that trees copied in any order compare equal), indented two
    // spaces a level: "name/" for a collection, "name (type): bytes" for an item.
    std::string Describe(const std::string& collectionId);

private:
    void DescribeInto(const std::string& collectionId, int depth, std::string& out);

    LocalService& mService;
    std::int64_t mOwner;
};

}  // namespace server
}  // namespace tolmonetsync
