#pragma once
// Reads an answer that is a JSON array of assets one asset at a time: the
// whole answer's tree is many times its text, and a group of 10,000 files
// answers a search with megabytes.

#include <vector>

#include <boost/shared_ptr.hpp>

#include "assets/Asset.h"
#include "foundation/core/Strings.h"

namespace tolmonetsync {
namespace tarnvault {

// The same assets, and the same exceptions, as ParseAssetList.
std::vector<boost::shared_ptr<AssetBase> > ReadAssetList(const UTF8String& body);

}  // namespace tarnvault
}  // namespace tolmonetsync
