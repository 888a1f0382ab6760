// A cache file record on arbitrary JSON: reading never crashes, and a record
// that reads writes back to JSON that reads to the same kept values.

#include <cstddef>
#include <cstdint>
#include <cstdlib>

#include <boost/any.hpp>

#include "foundation/json/JSONText.h"
#include "sync/CacheFile.h"

using namespace tolmocore::serialization;
using tolmonetsync::CachedSyncFile;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    CachedSyncFile record;
    try {
        record =
            JSONConvert<CachedSyncFile>::FromJSON(JSONParse(UTF8String(reinterpret_cast<const char*>(data), size)));
    } catch (const std::exception&) {
        return 0;
    }
    const CachedSyncFile again = JSONConvert<CachedSyncFile>::FromJSON(JSONConvert<CachedSyncFile>::ToJSON(record));
    if (again.mName != record.mName || again.mCollectionName != record.mCollectionName ||
        again.mMimeType != record.mMimeType || again.mCachedServerEtag != record.mCachedServerEtag ||
        again.mCachedLocalChecksum != record.mCachedLocalChecksum)
        std::abort();
    if (again.mCachedServerModDate != record.mCachedServerModDate &&
        !(again.mCachedServerModDate.is_special() && record.mCachedServerModDate.is_special()))
        std::abort();
    if (again.mCachedLocalModDate != record.mCachedLocalModDate &&
        !(again.mCachedLocalModDate.is_special() && record.mCachedLocalModDate.is_special()))
        std::abort();
    return 0;
}
