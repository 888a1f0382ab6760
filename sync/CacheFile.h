#pragma once
// The cache file's records as JSON: seven string keys per record. Reading
// fills only the name fields and the kept values; a parsed record is only
// ever a source to copy from.

#include "foundation/json/JSONConvert.h"
#include "sync/SyncRecords.h"

namespace tolmocore {
namespace serialization {

template <>
class JSONConvert<tolmonetsync::CachedSyncFile> {
public:
    static boost::any ToJSON(const tolmonetsync::CachedSyncFile& record);
    // A value that is not a string under any key throws.
    static tolmonetsync::CachedSyncFile FromJSON(const boost::any& value);
};

}  // namespace serialization
}  // namespace tolmocore
