#include "identity/OvraResponse.h"

#include <map>
#include <mutex>
#include <stdexcept>

#include "assets/RestException.h"
#include "foundation/core/Localizer.h"
#include "foundation/core/Redaction.h"
#include "foundation/core/Trace.h"
#include "foundation/json/JSONText.h"

namespace tolmocore {
namespace serialization {

tolmonetsync::OvraResponse JSONConvert<tolmonetsync::OvraResponse>::FromJSON(const boost::any& value)
{
    const JSONObject& object = boost::any_cast<const JSONObject&>(value);
    tolmonetsync::OvraResponse response;
    ExtractOptionalPropertyFromObjectGeneric(object, "access_token", response.access_token);
    ExtractOptionalPropertyFromObjectGeneric(object, "countryCode", response.countryCode);
    ExtractOptionalPropertyFromObjectGeneric(object, "device_token", response.device_token);
    ExtractOptionalPropertyFromObjectGeneric(object, "displayName", response.displayName);
    ExtractOptionalPropertyFromObjectGeneric(object, "email", response.email);
    ExtractOptionalPropertyFromObjectGeneric(object, "first_name", response.first_name);
    ExtractOptionalPropertyFromObjectGeneric(object, "last_name", response.last_name);
    ExtractOptionalPropertyFromObjectGeneric(object, "name", response.name);
    ExtractOptionalPropertyFromObjectGeneric(object, "refresh_token", response.refresh_token);
    ExtractOptionalPropertyFromObjectGeneric(object, "jump", response.jump);
    ExtractOptionalPropertyFromObjectGeneric(object, "token_type", response.token_type);
    ExtractOptionalPropertyFromObjectGeneric(object, "userId", response.userId);
    ExtractOptionalPropertyFromObjectGeneric(object, "error", response.error);
    return response;
}

}  // namespace serialization
}  // namespace tolmocore

namespace tolmonetsync {

namespace {

const char kAuthenticationFailed[] =
    "$$$/tolmonetsync/OVRA/AuthenticationFailed=Authentication failed. Check network connection, Halvane ID, and "
    "password. Please try again.";

// Error codes with a text of their own; built once, then only read.
const std::map<UTF8String, std::string>& ErrorTable()
{
    static std::once_flag once;
    static std::map<UTF8String, std::string>* table = nullptr;
    std::call_once(once, [] {
        table = new std::map<UTF8String, std::string>{
            {UTF8String(reinterpret_cast<const unsigned char*>("access_denied_non_t1")),
             "$$$/tolmonetsync/OVRA/AuthenticationDenied=You do not have access to this service. Contact your IT "
             "administrator to gain access or sign in with an Halvane ID."}};
    });
    return *table;
}

bool IsSuccess(const boost::shared_ptr<tolmonet::Response>& response)
{
    return response->status >= 200 && response->status <= 299;
}

// A failure of our own making goes to the handler in place of the answer.
void HandOverUnexpected(OvraAuth_Scheme scheme, const char* where, const OvraResponseHandler& handler,
                        const OvraResponse& response, const Guid& requestUID, const std::exception& e)
{
    TOLMO_TRACE("OVRA", 1, where << ": Unexpected error: " << e.what() << ", requestUID: " << requestUID);
    handler(scheme, response, MakeErrorResponse(tolmocore::utility::AsciiToUTF16(e.what())));
}

}  // namespace

void OvraDeserializeResponse(const UTF8String& body, OvraResponse& out)
{
    const boost::any tree = tolmocore::serialization::JSONParse(body);
    out = tree.empty() ? OvraResponse() : tolmocore::serialization::JSONConvert<OvraResponse>::FromJSON(tree);
}

UTF8String HandleOvraResponseBody(const char* name, const Guid& requestUID,
                                  const boost::shared_ptr<tolmonet::Response>& response)
{
    const UTF8String body = response->BodyText();
    const int level = IsSuccess(response) ? 8 : 1;
    // The answer carries the user's tokens: the trace shows its keys, not them.
    TOLMO_TRACE("OVRA", level,
                name << ", status_code: " << response->status << ", body: "
                     << tolmocore::debug::RedactSecrets(body.ToStdString()) << ", requestUID: " << requestUID);
    return body;
}

void HandleOvraResponse(OvraAuth_Scheme scheme, const char* name, const OvraResponseHandler& handler,
                        const Guid& requestUID, const boost::shared_ptr<tolmonet::Response>& response)
{
    OvraResponse answer;
    try {
        const UTF8String body = HandleOvraResponseBody(name, requestUID, response);
        if (IsSuccess(response)) {
            if (!body.empty()) OvraDeserializeResponse(body, answer);
        } else {
            try {
                OvraDeserializeResponse(body, answer);
            } catch (const std::exception& e) {
                TOLMO_TRACE("OVRA", 1, "OvraDeserializeResponse error: " << e.what() << ", requestUID: " << requestUID);
            }
            const auto known = ErrorTable().find(answer.error);
            const std::string text = known != ErrorTable().end() ? known->second : kAuthenticationFailed;
            answer.errorMessage = tolmocore::config::Localizer::Get().Localize(text.c_str());
        }
    } catch (const std::exception& e) {
        HandOverUnexpected(scheme, "HandleOvraResponse", handler, answer, requestUID, e);
        return;
    }
    if (IsSuccess(response)) {
        // An exception from the handler here is the processor's to see.
        handler(scheme, answer, response);
        return;
    }
    try {
        handler(scheme, answer, response);
    } catch (const std::exception& e) {
        HandOverUnexpected(scheme, "HandleOvraResponse", handler, answer, requestUID, e);
    }
}

void HandleOvraLogout(OvraAuth_Scheme scheme, const OvraResponseHandler& handler, const Guid& requestUID,
                      const boost::shared_ptr<tolmonet::Response>& response)
{
    const OvraResponse empty;
    try {
        HandleOvraResponseBody("Logout", requestUID, response);
        handler(scheme, empty, response);
    } catch (const std::exception& e) {
        HandOverUnexpected(scheme, "HandleOvraLogout", handler, empty, requestUID, e);
    }
}

}  // namespace tolmonetsync
