#include "identity/dialogs/MerrowExtensionLauncher.h"

#include <exception>

#include <boost/bind/bind.hpp>

#include "foundation/core/Redaction.h"
#include "foundation/core/Trace.h"
#include "foundation/json/JSONText.h"
#include "foundation/json/JSONTree.h"
#include "foundation/tessel/Tessel.h"
#include "identity/OvraAuth.h"

namespace tolmonetsync {

const ImmutableString kHalvaneLoginProd = ImmutableString::CreateStatic("prod");
const ImmutableString kHalvaneLoginStage = ImmutableString::CreateStatic("stg1");
const ImmutableString kOvraScope = ImmutableString::CreateStatic("openid,HalvaneID,pellucid");

const char kMerrowExtensionID[] = "com.halvane.merrow-tolmo.extension";
const char kMerrowEventReadyForInitialization[] = "com.halvane.merrow.readyForInitialization";
const char kMerrowEventInitialization[] = "com.halvane.merrow.initialization";
const char kMerrowEventAuthorizationToken[] = "com.halvane.merrow.authorizationToken";

boost::shared_ptr<MerrowExtensionLauncher> sMerrowExtensionLauncher;

namespace {

// The extension host's scope for events of the whole application; its
// interface names the value, we only pass it.
const int kEventScopeApplication = 1;
const char kEventAppID[] = "CINDERAL";

std::string EventData(const ruvex::event::Event* event)
{
    return event != nullptr && event->data != nullptr ? std::string(event->data) : std::string();
}

// Exceptions must not reach the extension host's C caller.
template <class Action>
void Guarded(const char* listener, const Action& action)
{
    try {
        action();
    } catch (const std::exception& e) {
        TOLMO_TRACE("OVRA", 1, listener << ": Unexpected error: " << e.what());
    } catch (...) {
        TOLMO_TRACE("OVRA", 1, listener << ": Unexpected error");
    }
}

}  // namespace

boost::shared_ptr<MerrowExtensionLauncher> CurrentMerrowExtensionLauncher()
{
    return boost::atomic_load(&sMerrowExtensionLauncher);
}

MerrowExtensionLauncher::MerrowExtensionLauncher(const boost::intrusive_ptr<tolmoui::UI_Dialog>& dialog_,
                                                 const MerrowCredentialsCallback& credentialsCallback_,
                                                 OvraAuth_Scheme scheme_, const UTF8String& clientID_,
                                                 const UTF8String& scope_, const UTF8String& locale_)
    : dialog(dialog_),
      endpoint((scheme_ == 1 ? kHalvaneLoginStage : kHalvaneLoginProd).ToUTF8String()),
      clientID(clientID_),
      scope(scope_),
      locale(locale_),
      credentialsCallback(credentialsCallback_),
      scheme(scheme_)
{
    TesselAddEventListener(kMerrowEventAuthorizationToken, &AuthorizationTokenListener, nullptr);
    TesselAddEventListener(kMerrowEventReadyForInitialization, &ReadyForInitialization, nullptr);
    TesselAddEventListener(ruvex::event::EVENT_TYPE_RUVEX_EXTENSION_UNLOADED, &ExtensionUnloaded, nullptr);
}

boost::shared_ptr<MerrowExtensionLauncher> MerrowExtensionLauncher::Launch(
    const boost::intrusive_ptr<tolmoui::UI_Dialog>& dialog, const MerrowCredentialsCallback& credentialsCallback,
    OvraAuth_Scheme scheme, const UTF8String& clientID, const UTF8String& scope, const UTF8String& locale)
{
    const boost::shared_ptr<MerrowExtensionLauncher> launcher(
        new MerrowExtensionLauncher(dialog, credentialsCallback, scheme, clientID, scope, locale));
    // The extension's ready event may come on the host's thread as soon as the
    // load is under way; its listener reaches the launcher only through
    // sMerrowExtensionLauncher, so that must hold it first.
    boost::atomic_store(&sMerrowExtensionLauncher, launcher);
    TesselLoadExtension(kMerrowExtensionID);
    return launcher;
}

MerrowExtensionLauncher::~MerrowExtensionLauncher()
{
    TesselRemoveEventListener(kMerrowEventAuthorizationToken, &AuthorizationTokenListener, nullptr);
    TesselRemoveEventListener(kMerrowEventReadyForInitialization, &ReadyForInitialization, nullptr);
    TesselRemoveEventListener(ruvex::event::EVENT_TYPE_RUVEX_EXTENSION_UNLOADED, &ExtensionUnloaded, nullptr);
}

void MerrowExtensionLauncher::SendInitializationEvent()
{
    using namespace tolmocore::serialization;
    boost::any object = JSONObject();
    AddToObjectGeneric(object, "endpoint", endpoint);
    AddToObjectGeneric(object, "client_id", clientID);
    AddToObjectGeneric(object, "scope", scope);
    AddToObjectGeneric(object, "locale", locale);
    AddToObject(object, "force_reauth", boost::any(true));
    const UTF8String json = GetJSONUTF8String(object, false);

    const ruvex::event::Event event{kMerrowEventInitialization, kEventScopeApplication, kEventAppID, nullptr,
                                    json.Chars()};
    TesselDispatchEvent(&event);
}

void MerrowExtensionLauncher::OvraDeserializeResponse(const UTF8String& text, OvraTokenResponse& out)
{
    const boost::any tree = tolmocore::serialization::JSONParse(text);
    out = tree.empty() ? OvraTokenResponse() : tolmocore::serialization::JSONConvert<OvraTokenResponse>::FromJSON(tree);
}

void MerrowExtensionLauncher::OnAuthorizationToken(const std::string& text)
{
    if (text.empty()) return;
    // The event carries the access token: the trace shows its keys, not it.
    TOLMO_TRACE("OVRA", 8,
                "OnAuthorizationToken"
                    << ", body: " << tolmocore::debug::RedactSecrets(text));

    OvraTokenResponse tokenResponse;
    try {
        OvraDeserializeResponse(UTF8String(text), tokenResponse);
    } catch (const std::exception& e) {
        TOLMO_TRACE("OVRA", 1, "OvraDeserializeResponse error: " << e.what());
    }

    OvraCredentials credentials;
    if (tokenResponse.token.empty()) {
        credentialsCallback(credentials);
        return;
    }
    if (!tokenResponse.email.empty()) {
        credentials.accessToken = tokenResponse.token;
        credentials.userID = tokenResponse.email;
        credentials.tokenUserID = tokenResponse.userID;
        credentialsCallback(credentials);
        succeeded.store(true);
        dialog->PostClose();
        return;
    }
    using namespace boost::placeholders;
    const Guid sent = OvraProfile(scheme, tokenResponse.token,
                                  boost::bind(&MerrowExtensionLauncher::OnStaticOvraProfile, tokenResponse.token,
                                              credentialsCallback, _1, _2, _3));
    if (sent.IsNil()) credentialsCallback(credentials);
}

void MerrowExtensionLauncher::OnStaticOvraProfile(const UTF8String& token,
                                                  const MerrowCredentialsCallback& credentialsCallback, OvraAuth_Scheme,
                                                  const OvraResponse& response,
                                                  const boost::shared_ptr<tolmonet::Response>&)
{
    OvraCredentials credentials;
    bool outcome = false;
    if (!response.email.empty()) {
        credentials.accessToken = token;
        credentials.userID = response.email;
        outcome = true;
    }
    credentialsCallback(credentials);
    if (const boost::shared_ptr<MerrowExtensionLauncher> launcher = CurrentMerrowExtensionLauncher()) {
        launcher->succeeded.store(outcome);
        launcher->dialog->PostClose();
    }
}

void ReadyForInitialization(const ruvex::event::Event*, void*)
{
    Guarded("ReadyForInitialization", [] {
        if (const boost::shared_ptr<MerrowExtensionLauncher> launcher = CurrentMerrowExtensionLauncher())
            launcher->SendInitializationEvent();
    });
}

void AuthorizationTokenListener(const ruvex::event::Event* event, void*)
{
    Guarded("AuthorizationTokenListener", [event] {
        if (const boost::shared_ptr<MerrowExtensionLauncher> launcher = CurrentMerrowExtensionLauncher())
            launcher->OnAuthorizationToken(EventData(event));
    });
}

void ExtensionUnloaded(const ruvex::event::Event* event, void*)
{
    Guarded("ExtensionUnloaded", [event] {
        const std::string text = EventData(event);
        static const std::string kOpen = "<Id>";
        static const std::string kClose = "</Id>";
        const std::size_t open = text.find(kOpen);
        const std::size_t close = text.rfind(kClose);
        if (open == std::string::npos || close == std::string::npos || close < open + kOpen.size()) return;
        const std::string id = text.substr(open + kOpen.size(), close - open - kOpen.size());
        if (id != kMerrowExtensionID) return;
        // The launcher may go here, on the extension host's thread: its
        // destructor takes its listeners away, this one included.
        boost::atomic_store(&sMerrowExtensionLauncher, boost::shared_ptr<MerrowExtensionLauncher>());
    });
}

}  // namespace tolmonetsync
