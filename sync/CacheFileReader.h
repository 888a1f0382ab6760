#pragma once
// Reads the cache file's text straight into records, one entry at a time: the
// whole document's tree was the largest thing a scan of 10,000 files held.

#include <vector>

#include "sync/SyncRecords.h"

namespace tolmonetsync {

// When the text (up to its first NUL) is what SaveCache writes, an array of
// objects whose values are all strings, appends its records to `out` and
// returns true. Any other text, valid or not, returns false with `out` as it
// was: the general JSON reader then decides what that text means.
bool ReadCacheEntries(const UTF8String& text, std::vector<CachedSyncFile>& out);

}  // namespace tolmonetsync
