#pragma once
// JSON values as boost::any trees, and the few operations that build and
// read them.
//
// A value holds exactly one of:
//   JSONObject          object, its keys ordered by their bytes
//   JSONArray           array
//   UTF8String          string
//   long long           integer that fits in 64 signed bits
//   unsigned long long  integer above INT64_MAX
//   double              any other number
//   bool                true, false
// and an empty boost::any is JSON null. Readers of integers must take both
// integer kinds. Children are held by shared pointer: copying a container
// copies the pointers, not the subtrees beneath them.

#include <boost/any.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/core/SmallBlockAllocator.h"
#include "foundation/core/Strings.h"

namespace tolmocore {
namespace serialization {

using JSONObject =
    SmallBlockAllocator::map<UTF8String, boost::shared_ptr<boost::any>, std::less<UTF8String> >;
using JSONArray = SmallBlockAllocator::vector<boost::shared_ptr<boost::any> >;

// JSON null is the empty boost::any; a null child pointer reads as null too.
inline bool IsJSONNull(const boost::any& value) { return value.empty(); }

// Stores a copy of `value` under `key`, replacing what was there. `object`
// must hold a JSONObject, else boost::bad_any_cast.
void AddToObject(boost::any& object, const char* key, const boost::any& value);
void AddToObject(boost::any& object, const char* key, boost::any&& value);
// A literal would be held as a pointer, which has no JSON form: wrap it in UTF8String.
void AddToObject(boost::any& object, const char* key, const char* value) = delete;

// Appends a copy of `value`. `array` must hold a JSONArray, else boost::bad_any_cast.
void AppendToArray(boost::any& array, const boost::any& value);
void AppendToArray(boost::any& array, boost::any&& value);
void AppendToArray(boost::any& array, const char* value) = delete;

// True if the key is present, whatever its value (null included). The flag
// is reserved and changes nothing.
bool ObjectHasProperty(const JSONObject& object, const char* key, bool reserved);

// The value under the key, or a null pointer if the key is absent.
boost::shared_ptr<boost::any> GetVariantInObject(const JSONObject& object, const char* key);

}  // namespace serialization
}  // namespace tolmocore
