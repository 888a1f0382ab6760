#include "identity/OvraAuth.h"

#include <cstdlib>
#include <mutex>

#include <boost/bind/bind.hpp>

#include "foundation/core/Redaction.h"
#include "foundation/core/Trace.h"
#include "foundation/net/HeaderConstants.h"
#include "foundation/net/QuoteURL.h"
#include "foundation/net/RequestProcessor.h"

namespace tolmonetsync {

const ImmutableString kOVRA_GM_SERVER = ImmutableString::CreateStatic("https://id.tolmonet.net/ovra");
const ImmutableString kOVRA_GM_SERVER_REDIRECT = ImmutableString::CreateStatic("https://id.tolmonet.net");
const ImmutableString kOVRA_STAGE_SERVER = ImmutableString::CreateStatic("https://id-stage.tolmonet.net/ovra");
const ImmutableString kOVRA_STAGE_SERVER_REDIRECT = ImmutableString::CreateStatic("https://id-stage.tolmonet.net");
const ImmutableString kTOLMO_OVRA_CLIENT_ID = ImmutableString::CreateStatic("5B1E2C7A-93D4-4F08-A6E1-2D7C90B3F415");
const ImmutableString kTOLMO_OVRA_CLIENT_SECRET_GM =
    ImmutableString::CreateStatic("8f2d4a61-0c3e-4b7a-9d15-e6a0c2b84f73");
const ImmutableString kTOLMO_OVRA_CLIENT_SECRET_STAGE =
    ImmutableString::CreateStatic("c41e9b07-5a26-4d83-b0f9-37d1e8a26c5e");

namespace {

using tolmonet::FormList;

const char kScope[] = "openid,pellucid";

// The replacement base URL: a setter's value, else the environment's, read
// on the first identity request.
struct ServiceOverride {
    std::mutex mMutex;
    bool mRead = false;
    UTF8String mURL;
};

ServiceOverride& Override()
{
    static ServiceOverride* override = new ServiceOverride;  // never destroyed: used until exit
    return *override;
}

UTF8String Text(const char* text)
{
    return UTF8String(reinterpret_cast<const unsigned char*>(text));
}

void GetOvraEndpointDetails(OvraAuth_Scheme scheme, const UTF8String& server, const UTF8String& redirect,
                            const UTF8String& clientID, const UTF8String& clientSecret, UTF8String& outServer,
                            UTF8String& outRedirect, UTF8String& outClientID, UTF8String& outClientSecret)
{
    const bool stage = scheme == OvraAuth_Stage;
    outServer = !server.empty() ? server : GetOvraServiceURL(scheme);
    outRedirect =
        !redirect.empty() ? redirect : (stage ? kOVRA_STAGE_SERVER_REDIRECT : kOVRA_GM_SERVER_REDIRECT).ToUTF8String();
    outClientID = !clientID.empty() ? clientID : kTOLMO_OVRA_CLIENT_ID.ToUTF8String();
    outClientSecret = !clientSecret.empty()
                          ? clientSecret
                          : (stage ? kTOLMO_OVRA_CLIENT_SECRET_STAGE : kTOLMO_OVRA_CLIENT_SECRET_GM).ToUTF8String();
}

void AddField(FormList& fields, const char* name, const UTF8String& value)
{
    fields.emplace_back(ImmutableString::CreateStatic(name), value);
}

tolmonet::HeaderList FormHeaders()
{
    tolmonet::HeaderList headers;
    headers.emplace(tolmonet::kHEADER_CONTENT_TYPE, tolmonet::kHEADER_CONTENT_TYPE_APPLICATION_WWW_FORM_URLENCODED);
    return headers;
}

// Sends a POST whose fields travel in the query, with an empty body.
Guid PostQuery(const char* traceName, const UTF8String& url, const tolmonet::http::ResponseHandler& handler)
{
    const auto processor = GetGlobalSyncProcessor();
    const Guid requestUID = Guid::CreateUnique();
    // The query holds the password, the client secret or a token: the trace
    // keeps the call's shape and blanks those.
    TOLMO_TRACE(
        "OVRA", 8,
        traceName << ", url: " << tolmocore::debug::RedactSecrets(url.ToStdString()) << ", requestUID: " << requestUID);
    const bool taken =
        processor->POST(requestUID, handler, ImmutableString::CreateDynamic(url),
                        tolmonet::http::RequestProcessor::Body(), FormHeaders(), tolmonet::Configuration());
    return taken ? requestUID : Guid();
}

}  // namespace

void SetOvraServiceURL(const UTF8String& url)
{
    ServiceOverride& override = Override();
    std::lock_guard<std::mutex> lock(override.mMutex);
    override.mRead = true;
    override.mURL = url;
}

UTF8String GetOvraServiceURL(OvraAuth_Scheme scheme)
{
    ServiceOverride& override = Override();
    {
        std::lock_guard<std::mutex> lock(override.mMutex);
        if (!override.mRead) {
            override.mRead = true;
            if (const char* url = std::getenv("TOLMONETSYNC_IDENTITY_SERVICE_URL")) override.mURL = Text(url);
        }
        if (!override.mURL.empty()) return override.mURL;
    }
    return (scheme == OvraAuth_Stage ? kOVRA_STAGE_SERVER : kOVRA_GM_SERVER).ToUTF8String();
}

Guid OvraAuthenticate(OvraAuth_Scheme scheme, const OvraResponseHandler& handler, const UTF8String& userName,
                      const UTF8String& password, const UTF8String& deviceID, const UTF8String& locale,
                      const UTF8String& server, const UTF8String& redirect, const UTF8String& clientID,
                      const UTF8String& clientSecret)
{
    UTF8String outServer, outRedirect, outClientID, outClientSecret;
    GetOvraEndpointDetails(scheme, server, redirect, clientID, clientSecret, outServer, outRedirect, outClientID,
                           outClientSecret);
    FormList fields;
    AddField(fields, "username", userName);
    AddField(fields, "password", password);
    AddField(fields, "client_id", outClientID);
    AddField(fields, "client_secret", outClientSecret);
    AddField(fields, "device_id", deviceID);
    AddField(fields, "device_name", Text("Desktop"));
    AddField(fields, "scope", Text(kScope));
    AddField(fields, "redirect_uri", outRedirect);
    AddField(fields, "locale", locale.empty() ? Text("en_US") : locale);
    const UTF8String url = outServer + "/login/v1/device?" + tolmonet::QuoteURL(fields);
    return PostQuery("Authenticate", url,
                     boost::bind(&HandleOvraResponse, scheme, "Authenticate", handler, boost::placeholders::_1,
                                 boost::placeholders::_2));
}

Guid OvraRefreshAuthenticate(OvraAuth_Scheme scheme, const OvraResponseHandler& handler, const UTF8String& refreshToken,
                             const UTF8String& server, const UTF8String& redirect, const UTF8String& clientID,
                             const UTF8String& clientSecret)
{
    UTF8String outServer, outRedirect, outClientID, outClientSecret;
    GetOvraEndpointDetails(scheme, server, redirect, clientID, clientSecret, outServer, outRedirect, outClientID,
                           outClientSecret);
    FormList fields;
    AddField(fields, "client_id", outClientID);
    AddField(fields, "client_secret", outClientSecret);
    AddField(fields, "grant_type", Text("refresh_token"));
    AddField(fields, "scope", Text(kScope));
    AddField(fields, "redirect_uri", outRedirect);
    AddField(fields, "refresh_token", refreshToken);
    const UTF8String url = outServer + "/token/v1?" + tolmonet::QuoteURL(fields);
    return PostQuery(
        "Refresh", url,
        boost::bind(&HandleOvraResponse, scheme, "Refresh", handler, boost::placeholders::_1, boost::placeholders::_2));
}

Guid OvraLogout(OvraAuth_Scheme scheme, const OvraResponseHandler& handler, const UTF8String& token,
                const UTF8String& server)
{
    UTF8String outServer, outRedirect, outClientID, outClientSecret;
    GetOvraEndpointDetails(scheme, server, UTF8String(), UTF8String(), UTF8String(), outServer, outRedirect,
                           outClientID, outClientSecret);
    FormList fields;
    AddField(fields, "token_type", Text("device_token"));
    AddField(fields, "token", token);
    AddField(fields, "cascading", Text("all"));
    const UTF8String url = outServer + "/invalidate_token/v1?" + tolmonet::QuoteURL(fields);
    return PostQuery("Logout", url,
                     boost::bind(&HandleOvraLogout, scheme, handler, boost::placeholders::_1, boost::placeholders::_2));
}

Guid OvraProfile(OvraAuth_Scheme scheme, const UTF8String& bearerToken, const OvraResponseHandler& handler)
{
    // Any scheme but production reads the staging instance here.
    const UTF8String server = GetOvraServiceURL(scheme == OvraAuth_GM ? OvraAuth_GM : OvraAuth_Stage);
    const UTF8String url = server + "/profile/v1?bearer_token=" + bearerToken;
    const auto processor = GetGlobalSyncProcessor();
    const Guid requestUID = Guid::CreateUnique();
    TOLMO_TRACE(
        "OVRA", 8,
        "Profile, url: " << tolmocore::debug::RedactSecrets(url.ToStdString()) << ", requestUID: " << requestUID);
    const bool taken = processor->GET(
        requestUID,
        boost::bind(&HandleOvraResponse, scheme, "Profile", handler, boost::placeholders::_1, boost::placeholders::_2),
        ImmutableString::CreateDynamic(url), tolmonet::HeaderList(), tolmonet::Configuration());
    return taken ? requestUID : Guid();
}

}  // namespace tolmonetsync
