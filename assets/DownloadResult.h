#pragma once

#include <cstdint>

#include "foundation/core/Strings.h"

namespace tolmonetsync {

// What a finished download reports. When the server answered that the
// content is unchanged, every field keeps its blank value.
struct DownloadResult {
    bool mDownloaded = false;        // new content was written to the file
    UTF8String mEtag;                // the response's entity tag
    UTF8String mContentType;         // the response's media type
    std::uint64_t mContentSize = 0;  // bytes written
    UTF16String mLastModified;       // the response's LAST-MODIFIED, uninterpreted
};

}  // namespace tolmonetsync
