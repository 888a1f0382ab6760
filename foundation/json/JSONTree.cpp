#include "foundation/json/JSONTree.h"

#include <boost/make_shared.hpp>

namespace tolmocore {
namespace serialization {

void AddToObject(boost::any& object, const char* key, const boost::any& value)
{
    AddToObject(object, key, boost::any(value));
}

void AddToObject(boost::any& object, const char* key, boost::any&& value)
{
    JSONObject& members = boost::any_cast<JSONObject&>(object);
    members[UTF8String(key)] = boost::make_shared<boost::any>(std::move(value));
}

void AppendToArray(boost::any& array, const boost::any& value)
{
    AppendToArray(array, boost::any(value));
}

void AppendToArray(boost::any& array, boost::any&& value)
{
    JSONArray& elements = boost::any_cast<JSONArray&>(array);
    elements.push_back(boost::make_shared<boost::any>(std::move(value)));
}

bool ObjectHasProperty(const JSONObject& object, const char* key, bool)
{
    return object.find(UTF8String(key)) != object.end();
}

boost::shared_ptr<boost::any> GetVariantInObject(const JSONObject& object, const char* key)
{
    const JSONObject::const_iterator found = object.find(UTF8String(key));
    return found == object.end() ? boost::shared_ptr<boost::any>() : found->second;
}

}  // namespace serialization
}  // namespace tolmocore
