#pragma once
// What a search asks for. The scopes travel beside the query's JSON, not in it.

#include <cstdint>
#include <vector>

#include <boost/any.hpp>
#include <boost/shared_ptr.hpp>

#include "assets/Asset.h"

namespace tolmonetsync {

enum SearchModifier : std::int32_t {
    kSearchModifier_None = 0,      // left out of the query
    kSearchModifier_Equal = 1,     // the bare boolean
    kSearchModifier_NotEqual = 2,  // {"$ne": value}
    kSearchModifier_Contains = 3,  // {"$contains": value}
};

// One condition on a boolean property of an asset.
struct SearchCriteria {
    SearchModifier mModifier = kSearchModifier_None;
    bool mValue = false;
};

class SearchQuery {
public:
    // No restriction on kind or name.
    SearchQuery();
    SearchQuery(CollectionType type, const UTF16String& name);
    // Searches the direct members of `collection` for `name`.
    SearchQuery(const boost::shared_ptr<Collection>& collection, const UTF16String& name);

    // Appends "/collections/<id>" to mScopes.
    void AddScope(const boost::shared_ptr<Collection>& collection);

    CollectionType mType;            // kCollectionType_None: any kind
    SearchCriteria mTrashed;         // by default trashed assets are left out
    UTF16String mName;               // empty: any name
    std::vector<UTF8String> mScopes; // empty: everywhere
};

}  // namespace tolmonetsync
