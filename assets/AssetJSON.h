#pragma once
// Assets and search queries as the service's JSON.
//
// Reading an asset: "type" decides — a collection media type makes a
// Collection, anything else (or none) an Item with that content type. Ids
// come from "id", else "url", with their path prefixes removed. Malformed
// JSON raises boost::bad_any_cast or Boost's time exception; no asset is
// returned in part.

#include <vector>

#include <boost/shared_ptr.hpp>

#include "assets/Asset.h"
#include "assets/SearchQuery.h"
#include "foundation/json/JSONConvert.h"

namespace tolmocore {
namespace serialization {

template <>
class JSONConvert<boost::shared_ptr<tolmonetsync::AssetBase> > {
public:
    static boost::shared_ptr<tolmonetsync::AssetBase> FromJSON(const boost::any& value);
};

template <>
class JSONConvert<std::vector<boost::shared_ptr<tolmonetsync::AssetBase> > > {
public:
    // The value must be an array.
    static std::vector<boost::shared_ptr<tolmonetsync::AssetBase> > FromJSON(const boost::any& value);
};

template <>
class JSONConvert<tolmonetsync::SearchCriteria> {
public:
    // Throws std::runtime_error("SearchCriteria Modifier error") for a
    // modifier other than Equal, NotEqual and Contains.
    static boost::any ToJSON(const tolmonetsync::SearchCriteria& criteria);
};

template <>
class JSONConvert<tolmonetsync::SearchQuery> {
public:
    // "type", "trashed" and "name", each only when set; scopes travel apart.
    static boost::any ToJSON(const tolmonetsync::SearchQuery& query);
};

}  // namespace serialization
}  // namespace tolmocore
