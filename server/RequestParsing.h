#pragma once
// Reading what a request carries: the search query and its scopes, the
// bodies of a create and an add, an upload's collections, the recursive
// flag. Anything of the wrong shape throws StoreFailure 400 with one line
// saying what was wrong.

#include <string>
#include <vector>

#include "server/AssetStore.h"

namespace tolmonetsync {
namespace server {

// {"type": media type, "trashed": bool | {"$ne": bool} | {"$contains": bool}, "name": text}, each key optional.
SearchFilter ParseSearchQuery(const std::string& text);
// A JSON array of "/collections/ID"; gives the ids.
std::vector<std::string> ParseScopes(const std::string& text);

struct CreateRequest {
    std::string mName;
    std::string mType;
};
// {"header": {"name": text, "type": media type}}
CreateRequest ParseCreateBody(const std::string& text);
// A JSON array of asset paths: "/assets/ID" or "/collections/ID", with or
// without a leading "/api"; gives the ids.
std::vector<std::string> ParseMemberPaths(const std::string& text);
// A JSON array of "/api/collections/ID" (or "/collections/ID"); gives the ids.
std::vector<std::string> ParseUploadCollections(const std::string& text);
// "true" or "false"; absent means false.
bool ParseRecursive(const std::string& text, bool present);

}  // namespace server
}  // namespace tolmonetsync
