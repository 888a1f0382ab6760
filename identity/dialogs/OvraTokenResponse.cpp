#include "identity/dialogs/OvraTokenResponse.h"

namespace tolmocore {
namespace serialization {

tolmonetsync::OvraTokenResponse JSONConvert<tolmonetsync::OvraTokenResponse>::FromJSON(const boost::any& value)
{
    const JSONObject& object = boost::any_cast<const JSONObject&>(value);
    tolmonetsync::OvraTokenResponse response;
    ExtractOptionalPropertyFromObjectGeneric(object, "token", response.token);
    ExtractOptionalPropertyFromObjectGeneric(object, "userID", response.userID);
    ExtractOptionalPropertyFromObjectGeneric(object, "email", response.email);
    return response;
}

}  // namespace serialization
}  // namespace tolmocore
