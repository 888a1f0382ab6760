#pragma once
// The conversation with the sign-in extension: load it, tell it where to
// authenticate when it is ready, turn its token into OvraCredentials for the
// host, close the dialog, and go when the extension host says it is unloaded.
//
// Ownership: at most one launcher lives, held by sMerrowExtensionLauncher from
// the dialog that made it until the extension host's unloaded event names the
// extension; it may outlive that dialog's modal loop by that long. It holds
// the dialog alive.
//
// Threads: made on the UI thread. The listeners run on the extension host's
// thread, OnStaticOvraProfile on the request processor's completion thread;
// the credentials callback is called on either of them. So the pointer and
// `succeeded` are read and written under atomic operations only.

#include <atomic>
#include <string>

#include <boost/function.hpp>
#include <boost/intrusive_ptr.hpp>
#include <boost/shared_ptr.hpp>

#include "assets/Credentials.h"
#include "foundation/core/ImmutableString.h"
#include "foundation/tessel/RuvexEvent.h"
#include "foundation/ui/UI_Dialog.h"
#include "identity/OvraResponse.h"
#include "identity/dialogs/OvraTokenResponse.h"

namespace tolmonetsync {

extern const ImmutableString kHalvaneLoginProd;   // "prod"
extern const ImmutableString kHalvaneLoginStage;  // "stg1"
extern const ImmutableString kOvraScope;          // "openid,HalvaneID,pellucid"

// The sign-in extension and the events it exchanges.
extern const char kMerrowExtensionID[];                  // "com.halvane.merrow-tolmo.extension"
extern const char kMerrowEventReadyForInitialization[];  // from the extension
extern const char kMerrowEventInitialization[];          // to the extension
extern const char kMerrowEventAuthorizationToken[];      // from the extension

using MerrowCredentialsCallback = boost::function<void(const OvraCredentials)>;

class MerrowExtensionLauncher {
public:
    // Makes the launcher with its three listeners, makes it the current one
    // and then loads the extension, so that a ready event sent at once finds
    // it. `scheme` 1 signs in at the staging instance, anything else at
    // production. Returns the launcher.
    static boost::shared_ptr<MerrowExtensionLauncher> Launch(
        const boost::intrusive_ptr<tolmoui::UI_Dialog>& dialog, const MerrowCredentialsCallback& credentialsCallback,
        OvraAuth_Scheme scheme, const UTF8String& clientID, const UTF8String& scope, const UTF8String& locale);

    // Adds the three listeners; Launch loads the extension.
    MerrowExtensionLauncher(const boost::intrusive_ptr<tolmoui::UI_Dialog>& dialog,
                            const MerrowCredentialsCallback& credentialsCallback, OvraAuth_Scheme scheme,
                            const UTF8String& clientID, const UTF8String& scope, const UTF8String& locale);
    // Removes the listeners and lets the dialog go.
    ~MerrowExtensionLauncher();
    MerrowExtensionLauncher(const MerrowExtensionLauncher&) = delete;
    MerrowExtensionLauncher& operator=(const MerrowExtensionLauncher&) = delete;

    // Tells the extension where and how to sign in.
    void SendInitializationEvent();

    // The token event's text. Empty text is ignored. The credentials go to the
    // callback at once when the token comes with an email, otherwise after a
    // profile request; the dialog closes when credentials were obtained, or
    // when the profile request failed. Unreadable text, or no token, gives
    // the callback empty credentials and leaves the dialog open.
    void OnAuthorizationToken(const std::string& text);

    // The profile's answer, on the completion thread: credentials from the
    // token and the profile's email, or empty ones; then the current
    // launcher's `succeeded` says which, and its dialog closes.
    static void OnStaticOvraProfile(const UTF8String& token, const MerrowCredentialsCallback& credentialsCallback,
                                    OvraAuth_Scheme scheme, const OvraResponse& response,
                                    const boost::shared_ptr<tolmonet::Response>& httpResponse);

    // Reads the token event's JSON over `out`; JSON null gives an empty
    // response. Parse errors and keys that are not text throw.
    static void OvraDeserializeResponse(const UTF8String& text, OvraTokenResponse& out);

    const boost::intrusive_ptr<tolmoui::UI_Dialog> dialog;
    const UTF8String endpoint;
    const UTF8String clientID;
    const UTF8String scope;
    const UTF8String locale;
    const MerrowCredentialsCallback credentialsCallback;
    const OvraAuth_Scheme scheme;
    std::atomic<bool> succeeded{false};
};

// The one launcher, or null. Read it with boost::atomic_load and change it
// with boost::atomic_store: threads meet on it.
extern boost::shared_ptr<MerrowExtensionLauncher> sMerrowExtensionLauncher;
boost::shared_ptr<MerrowExtensionLauncher> CurrentMerrowExtensionLauncher();

// Listeners given to the extension host; `context` is always null. They let
// no exception out.
void ReadyForInitialization(const ruvex::event::Event* event, void* context);
void AuthorizationTokenListener(const ruvex::event::Event* event, void* context);
// Lets the launcher go when the unloaded event names the sign-in extension
// between "<Id>" and "</Id>"; any other text leaves it alone.
void ExtensionUnloaded(const ruvex::event::Event* event, void* context);

}  // namespace tolmonetsync
