#include "foundation/json/JSONConvert.h"

#include <algorithm>
#include <stdexcept>
#include <string>

#include <boost/date_time/posix_time/posix_time.hpp>

namespace tolmocore {
namespace serialization {

using boost::posix_time::ptime;

template <>
boost::any JSONConvert<UTF8String>::ToJSON(const UTF8String& value)
{
    return boost::any(value);
}

template <>
UTF8String JSONConvert<UTF8String>::FromJSON(const boost::any& value)
{
    return boost::any_cast<const UTF8String&>(value);
}

template <>
boost::any JSONConvert<UTF16String>::ToJSON(const UTF16String& value)
{
    return boost::any(utility::UTF16to8(value));
}

template <>
UTF16String JSONConvert<UTF16String>::FromJSON(const boost::any& value)
{
    return utility::UTF8to16(boost::any_cast<const UTF8String&>(value));
}

template <>
boost::any JSONConvert<ImmutableString>::ToJSON(const ImmutableString& value)
{
    return boost::any(value.ToUTF8String());
}

template <>
ImmutableString JSONConvert<ImmutableString>::FromJSON(const boost::any& value)
{
    return ImmutableString::CreateDynamic(boost::any_cast<const UTF8String&>(value));
}

template <>
boost::any JSONConvert<std::string>::ToJSON(const std::string& value)
{
    return boost::any(UTF8String(value));
}

template <>
std::string JSONConvert<std::string>::FromJSON(const boost::any& value)
{
    return boost::any_cast<const UTF8String&>(value).ToStdString();
}

template <>
boost::any JSONConvert<bool>::ToJSON(const bool& value)
{
    return boost::any(value);
}

template <>
bool JSONConvert<bool>::FromJSON(const boost::any& value)
{
    return boost::any_cast<bool>(value);
}

template <>
boost::any JSONConvert<long long>::ToJSON(const long long& value)
{
    return boost::any(value);
}

template <>
long long JSONConvert<long long>::FromJSON(const boost::any& value)
{
    if (const unsigned long long* large = boost::any_cast<unsigned long long>(&value)) {
        return static_cast<long long>(*large);
    }
    return boost::any_cast<long long>(value);
}

template <>
boost::any JSONConvert<double>::ToJSON(const double& value)
{
    return boost::any(value);
}

template <>
double JSONConvert<double>::FromJSON(const boost::any& value)
{
    if (const long long* integer = boost::any_cast<long long>(&value)) {
        return static_cast<double>(*integer);
    }
    if (const unsigned long long* large = boost::any_cast<unsigned long long>(&value)) {
        return static_cast<double>(*large);
    }
    return boost::any_cast<double>(value);
}

template <>
boost::any JSONConvert<Guid>::ToJSON(const Guid& value)
{
    return boost::any(value.AsUTF8String());
}

template <>
Guid JSONConvert<Guid>::FromJSON(const boost::any& value)
{
    // The text's own length, not 36: a short string must be refused, not overrun.
    const UTF8String& text = boost::any_cast<const UTF8String&>(value);
    return StringToGUID(text.data(), text.size());
}

namespace {

// The form of to_simple_string: "dddd-Mon-dd hh:mm:ss" and up to nine digits
// of a second after a point. Checked by hand: a cache file holds a date per
// record, and a regular expression cost more than the rest of its reading.
bool HasSimpleTimeForm(const std::string& text)
{
    static const char kShape[] = "dddd-Ull-dd dd:dd:dd";  // d digit, U upper, l lower
    const std::size_t length = sizeof(kShape) - 1;
    if (text.size() < length) return false;
    for (std::size_t i = 0; i < length; ++i) {
        const char c = text[i];
        const bool fits = kShape[i] == 'd'   ? c >= '0' && c <= '9'
                          : kShape[i] == 'U' ? c >= 'A' && c <= 'Z'
                          : kShape[i] == 'l' ? c >= 'a' && c <= 'z'
                                             : c == kShape[i];
        if (!fits) return false;
    }
    if (text.size() == length) return true;
    const std::size_t digits = text.size() - length - 1;
    if (text[length] != '.' || digits < 1 || digits > 9) return false;
    return std::all_of(text.begin() + length + 1, text.end(), [](char c) { return c >= '0' && c <= '9'; });
}

}  // namespace

template <>
boost::any JSONConvert<ptime>::ToJSON(const ptime& value)
{
    return boost::any(value.is_not_a_date_time() ? UTF8String()
                                                 : UTF8String(boost::posix_time::to_simple_string(value)));
}

template <>
ptime JSONConvert<ptime>::FromJSON(const boost::any& value)
{
    const UTF8String& text = boost::any_cast<const UTF8String&>(value);
    if (text.empty()) return ptime(boost::posix_time::not_a_date_time);
    // Only the form this conversion writes reaches the date library's parser,
    // which overflows inside on some malformed times.
    if (!HasSimpleTimeForm(text.ToStdString()))
        throw std::out_of_range("not a date and time: " + text.ToStdString());
    const ptime parsed = boost::date_time::parse_delimited_time<ptime>(text.ToStdString(), ' ');
    // A time of day of many hours pushes the value out of the range of dates:
    // it then throws when printed, or prints as another value. Only a value
    // that reads back the same from its own print is taken.
    if (parsed.is_special() ||
        boost::date_time::parse_delimited_time<ptime>(boost::posix_time::to_simple_string(parsed), ' ') != parsed)
        throw std::out_of_range("not a date and time: " + text.ToStdString());
    return parsed;
}

}  // namespace serialization
}  // namespace tolmocore
