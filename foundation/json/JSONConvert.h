#pragma once
// Conversions between values and JSON trees, and the property readers and
// writers built on them.
//
// JSONConvert<T> declares ToJSON and FromJSON for every T; the plain types
// below are defined by the foundation. A type of the library gets its
// conversion either by defining these two members for itself
//     template <> boost::any JSONConvert<Record>::ToJSON(const Record&);
//     template <> Record JSONConvert<Record>::FromJSON(const boost::any&);
// or by a full definition of JSONConvert<Record> of its own. A T with
// neither fails at link time.
//
// Every FromJSON raises boost::bad_any_cast when the value holds another
// type than it reads (JSON null included).

#include <iterator>
#include <string>
#include <vector>

#include <boost/any.hpp>
#include <boost/date_time/posix_time/ptime.hpp>
#include <boost/make_shared.hpp>

#include "foundation/core/Guid.h"
#include "foundation/core/ImmutableString.h"
#include "foundation/core/Strings.h"
#include "foundation/json/JSONTree.h"

namespace tolmocore {
namespace serialization {

template <class T>
class JSONConvert {
public:
    static boost::any ToJSON(const T& value);
    static T FromJSON(const boost::any& value);
};

// Strings are held as UTF8String. UTF16String goes through UTF-8; ImmutableString
// and std::string keep their bytes.
template <> boost::any JSONConvert<UTF8String>::ToJSON(const UTF8String& value);
template <> UTF8String JSONConvert<UTF8String>::FromJSON(const boost::any& value);
template <> boost::any JSONConvert<UTF16String>::ToJSON(const UTF16String& value);
template <> UTF16String JSONConvert<UTF16String>::FromJSON(const boost::any& value);
template <> boost::any JSONConvert<ImmutableString>::ToJSON(const ImmutableString& value);
template <> ImmutableString JSONConvert<ImmutableString>::FromJSON(const boost::any& value);
template <> boost::any JSONConvert<std::string>::ToJSON(const std::string& value);
template <> std::string JSONConvert<std::string>::FromJSON(const boost::any& value);

template <> boost::any JSONConvert<bool>::ToJSON(const bool& value);
template <> bool JSONConvert<bool>::FromJSON(const boost::any& value);
// Reads either integer kind as a 64-bit pattern: an unsigned value above
// INT64_MAX comes back negative. A double is refused.
template <> boost::any JSONConvert<long long>::ToJSON(const long long& value);
template <> long long JSONConvert<long long>::FromJSON(const boost::any& value);
// Reads both integer kinds and doubles.
template <> boost::any JSONConvert<double>::ToJSON(const double& value);
template <> double JSONConvert<double>::FromJSON(const boost::any& value);

// The 36-character text form. Text that is no Guid raises std::invalid_argument.
template <> boost::any JSONConvert<Guid>::ToJSON(const Guid& value);
template <> Guid JSONConvert<Guid>::FromJSON(const boost::any& value);

// The simple form of our own files, "2014-Mar-05 09:41:07.123456"; the empty
// string stands for not-a-date-time both ways. Text that is no time raises
// Boost's exception. The service's ISO form is read by parse_iso8601_time.
template <> boost::any JSONConvert<boost::posix_time::ptime>::ToJSON(
    const boost::posix_time::ptime& value);
template <> boost::posix_time::ptime JSONConvert<boost::posix_time::ptime>::FromJSON(
    const boost::any& value);

// What a missing key reads as: the type's default value.
template <class T>
struct JSONMissingValue {
    static T Get() { return T(); }
};
template <>
struct JSONMissingValue<ImmutableString> {
    static ImmutableString Get() { return sNullString; }
};

// The value under the key as a T, or JSONMissingValue<T> if the key is absent.
template <class T>
T ExtractPropertyFromObject(const JSONObject& object, const char* key)
{
    const boost::shared_ptr<boost::any> value = GetVariantInObject(object, key);
    return value ? JSONConvert<T>::FromJSON(*value) : JSONMissingValue<T>::Get();
}

// Sets `out` if the key is present; leaves it as it was if not.
template <class T>
void ExtractOptionalPropertyFromObjectGeneric(const JSONObject& object, const char* key, T& out)
{
    const boost::shared_ptr<boost::any> value = GetVariantInObject(object, key);
    if (value) out = JSONConvert<T>::FromJSON(*value);
}

// Stores JSONConvert<T>::ToJSON(value) under the key of `object`, a JSONObject.
template <class T>
void AddToObjectGeneric(boost::any& object, const char* key, const T& value)
{
    AddToObject(object, key, JSONConvert<T>::ToJSON(value));
}

// An array of the elements' conversions, in order.
template <class T>
class JSONConvertStdContainer {
public:
    static boost::any ToJSON(const std::vector<T>& values)
    {
        JSONArray array;
        array.reserve(values.size());
        for (const T& value : values) {
            array.push_back(boost::make_shared<boost::any>(JSONConvert<T>::ToJSON(value)));
        }
        return boost::any(std::move(array));
    }
};

// Appends the conversion of every element of the array `value` to `out`, in
// order. `value` must hold a JSONArray. If any element fails, `out` is left
// as it was.
template <class T>
class JSONConvertStdVector {
public:
    static void FromJSON(const boost::any& value, std::vector<T>& out)
    {
        const JSONArray& array = boost::any_cast<const JSONArray&>(value);
        std::vector<T> converted;
        converted.reserve(array.size());
        for (const boost::shared_ptr<boost::any>& element : array) {
            converted.push_back(JSONConvert<T>::FromJSON(element ? *element : boost::any()));
        }
        out.insert(out.end(), std::make_move_iterator(converted.begin()),
                   std::make_move_iterator(converted.end()));
    }
};

}  // namespace serialization
}  // namespace tolmocore
