#pragma once
// Internal to File and Dir: modification times as UTC ptimes, at microsecond
// resolution so that a time written to the cache file reads back equal.

#include <boost/date_time/posix_time/posix_time_types.hpp>

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace filesupport {
namespace detail {

// The modification time of what `path` names (symbolic links followed),
// nanoseconds truncated to microseconds. Throws FileSystemError.
boost::posix_time::ptime ModifiedTime(const UTF16String& path);

// Sets the modification time, leaving the access time alone. A special
// value (not-a-date-time, infinities) throws std::invalid_argument; a failure
// of the system throws FileSystemError.
void SetModifiedTime(const UTF16String& path, const boost::posix_time::ptime& time);

}  // namespace detail
}  // namespace filesupport
}  // namespace tolmocore
