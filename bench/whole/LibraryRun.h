#pragma once
// One whole sync through the library (prepare and pass) in a child process of
// its own, so that the peak memory measured is the client's alone.

#include <cstdint>
#include <filesystem>
#include <string>

#include <boost/json/object.hpp>

#include "foundation/core/Strings.h"

namespace wholebench {

struct Setup {
    std::string mApi;
    std::filesystem::path mFolder;
    std::filesystem::path mPrefDir;
    std::string mGroup;
    std::uint64_t mMaxSize = 0;
    std::filesystem::path mItemsFile;  // when set, the group's id and each item's id and tag are written here
    // The host's name: each name has a preferences root of its own, so the
    // large files' runs leave the small files' group alone.
    UTF16String mApp = u"WholeSync";
};

// The sync's figures: seconds, requests, counts (by kind: conditional,
// download, upload, small), uploaded, downloaded, peakMiB. Throws if it failed.
boost::json::object SyncInChild(const Setup& setup);

}  // namespace wholebench
