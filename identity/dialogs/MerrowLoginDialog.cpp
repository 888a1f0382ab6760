#include "identity/dialogs/MerrowLoginDialog.h"

#include "foundation/tessel/Tessel.h"
#include "foundation/ui/UI_NodeManager.h"
#include "identity/dialogs/MerrowLoginDialogImpl.h"

namespace tolmonetsync {

// Focus given on opening a window.
static const int kFocusReasonWindowOpened = 3;

MerrowLoginDialog::MerrowLoginDialog(const tolmoui::SupplierInterface* supplier, tolmoui::UI_Node* parent,
                                     const UTF8String& clientID, const MerrowCredentialsCallback& credentialsCallback,
                                     const UTF8String& locale, OvraAuth_Scheme scheme)
    : mDialog(new MerrowLoginDialogImpl(supplier, parent, clientID, credentialsCallback, locale, scheme))
{
}

MerrowLoginDialog::~MerrowLoginDialog() = default;

bool MerrowLoginDialog::Execute()
{
    const tolmoui::UI_NodeManager::SetModalWindow modalScope(nullptr);
    mDialog->UI_GainKeyboardFocus(kFocusReasonWindowOpened);
    mDialog->UI_Show(true);
    mDialog->RunModal();

    const boost::shared_ptr<MerrowExtensionLauncher> launcher = CurrentMerrowExtensionLauncher();
    if (!launcher) return false;
    const bool succeeded = launcher->succeeded.load();
    TesselUnloadExtension(kMerrowExtensionID);
    return succeeded;
}

void MerrowLoginDialog::Release()
{
    mDialog.reset();
}

bool DoMerrowLoginDialog(const tolmoui::SupplierInterface* supplier, tolmoui::UI_Node* parent,
                         const UTF8String& clientID, const MerrowCredentialsCallback& credentialsCallback,
                         const UTF8String& locale, OvraAuth_Scheme scheme)
{
    MerrowLoginDialog dialog(supplier, parent, clientID, credentialsCallback, locale, scheme);
    const bool result = dialog.Execute();
    dialog.Release();
    return result;
}

bool MerrowAuthenticationDialog(const tolmoui::SupplierInterface* supplier, tolmoui::UI_Node* parent,
                                const UTF8String& clientID, const MerrowCredentialsCallback& credentialsCallback,
                                const UTF8String& locale, OvraAuth_Scheme scheme)
{
    return DoMerrowLoginDialog(supplier, parent, clientID, credentialsCallback, locale, scheme);
}

}  // namespace tolmonetsync
