#pragma once
// The web sign-in: a modal dialog in which the sign-in extension runs, until
// it hands over a token or the user closes the window.

#include <boost/intrusive_ptr.hpp>

#include "foundation/core/Strings.h"
#include "foundation/ui/SupplierInterface.h"
#include "foundation/ui/UI_Node.h"
#include "identity/OvraResponse.h"
#include "identity/dialogs/MerrowExtensionLauncher.h"
#include "identity/dialogs/MerrowLoginExtensionInfo.h"

namespace tolmonetsync {

class MerrowLoginDialogImpl;

// Owns one sign-in dialog and runs it.
class MerrowLoginDialog {
public:
    MerrowLoginDialog(const tolmoui::SupplierInterface* supplier, tolmoui::UI_Node* parent, const UTF8String& clientID,
                      const MerrowCredentialsCallback& credentialsCallback, const UTF8String& locale,
                      OvraAuth_Scheme scheme);
    ~MerrowLoginDialog();

    // Runs the dialog modally on the calling (UI) thread, then unloads the
    // extension. True if the launcher says credentials were obtained.
    bool Execute();
    // Lets the dialog go (a launcher may still hold it).
    void Release();

private:
    boost::intrusive_ptr<MerrowLoginDialogImpl> mDialog;
};

// The whole web sign-in, synchronous, on the UI thread. The credentials go to
// `credentialsCallback` on the extension host's thread or the request
// processor's completion thread, before the dialog closes; empty credentials
// say that a token was unusable (the dialog may stay open then). True if
// credentials were obtained and the dialog closed on that account; false when
// the user closed it. `scheme` 1 signs in at the staging instance.
bool DoMerrowLoginDialog(const tolmoui::SupplierInterface* supplier, tolmoui::UI_Node* parent,
                         const UTF8String& clientID, const MerrowCredentialsCallback& credentialsCallback,
                         const UTF8String& locale, OvraAuth_Scheme scheme);
// The same.
bool MerrowAuthenticationDialog(const tolmoui::SupplierInterface* supplier, tolmoui::UI_Node* parent,
                                const UTF8String& clientID, const MerrowCredentialsCallback& credentialsCallback,
                                const UTF8String& locale, OvraAuth_Scheme scheme);

}  // namespace tolmonetsync
