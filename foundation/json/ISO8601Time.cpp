#include "foundation/json/ISO8601Time.h"

#include <boost/algorithm/string/erase.hpp>
#include <boost/date_time/posix_time/posix_time.hpp>

#include "foundation/json/JSONConvert.h"

namespace tolmocore {
namespace serialization {

boost::posix_time::ptime parse_iso8601_time(const JSONObject& object, const char* key)
{
    UTF16String text;
    ExtractOptionalPropertyFromObjectGeneric(object, key, text);
    if (text.empty()) return boost::posix_time::ptime(boost::posix_time::not_a_date_time);

    // Down to the compact form Boost reads, 20140305T094107.
    boost::algorithm::erase_all(text, UTF16String(u"+00:00"));
    boost::algorithm::erase_all(text, UTF16String(u":"));
    boost::algorithm::erase_all(text, UTF16String(u"-"));
    const UTF16String::size_type fraction = text.rfind(u'.');
    if (fraction != UTF16String::npos) text.erase(fraction);

    return boost::date_time::parse_iso_time<boost::posix_time::ptime>(
        utility::UTF16to8(text).ToStdString(), 'T');
}

}  // namespace serialization
}  // namespace tolmocore
