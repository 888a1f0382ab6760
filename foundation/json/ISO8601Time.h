#pragma once
// Reading the asset service's times. We never write this form: our own files
// use the simple form of JSONConvert<ptime>.

#include <boost/date_time/posix_time/ptime.hpp>

#include "foundation/json/JSONTree.h"

namespace tolmocore {
namespace serialization {

// The ISO 8601 time under the key, taken as UTC. "2014-03-05T09:41:07.123+00:00"
// reads as 2014-03-05 09:41:07: the fraction of a second is dropped, and
// "+00:00" is the one offset understood (it is simply removed); the service
// sends no other, and another would be misread, not refused. A missing key
// or an empty string gives not-a-date-time. A value that is not a string
// raises boost::bad_any_cast; text Boost cannot read raises Boost's exception.
boost::posix_time::ptime parse_iso8601_time(const JSONObject& object, const char* key);

}  // namespace serialization
}  // namespace tolmocore
