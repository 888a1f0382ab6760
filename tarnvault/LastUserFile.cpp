#include "tarnvault/LastUserFile.h"

#include <boost/any.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/json/JSON.h"

namespace tolmonetsync {
namespace tarnvault {

namespace json = tolmocore::serialization;

UTF8String ParseLastUserText(const UTF8String& text)
{
    const boost::any parsed = json::JSONParse(text);
    const json::JSONObject& object = boost::any_cast<const json::JSONObject&>(parsed);
    const boost::shared_ptr<boost::any> userID = json::GetVariantInObject(object, "mUserID");
    return userID ? boost::any_cast<const UTF8String&>(*userID) : UTF8String();
}

UTF8String FormatLastUserText(const UTF8String& userID)
{
    boost::any object = json::JSONObject();
    json::AddToObject(object, "mUserID", boost::any(userID));
    return json::GetJSONUTF8String(object, false);
}

}  // namespace tarnvault
}  // namespace tolmonetsync
