#include "identity/dialogs/MessageBoxCallbackHandler.h"

#include "foundation/core/Opener.h"

namespace tolmonetsync {

bool MessageBoxCallbackHandler::ValidateOK()
{
    const UTF16String userName = userNameEdit->GetValue();
    const UTF16String password = passwordEdit->GetValue();
    UTF16String error;
    if (!userName.empty() && !password.empty() && validator && *validator) {
        if ((*validator)(userName, password, error)) return true;
    }
    // The first refusal's text stays until the user changes something.
    if (!showingError) {
        messageText->SetValue(error);
        showingError = true;
    }
    return false;
}

void MessageBoxCallbackHandler::UserNameTextEditChanged(const tolmoui::UI_InteractiveControlChangedMessage* changed)
{
    TextEditChanged(changed);
}

void MessageBoxCallbackHandler::PasswordTextEditChanged(const tolmoui::UI_InteractiveControlChangedMessage* changed)
{
    TextEditChanged(changed);
}

void MessageBoxCallbackHandler::TextEditChanged(const tolmoui::UI_InteractiveControlChangedMessage* changed)
{
    if (changed->GetChangeMessage() == 0) return;
    UpdateOkButton();
    if (showingError) {
        messageText->SetValue(message);
        showingError = false;
    }
}

void MessageBoxCallbackHandler::UpdateOkButton()
{
    okButton->SetDisabled(userNameEdit->GetValue().empty() || passwordEdit->GetValue().empty());
}

void MessageBoxCallbackHandler::UserNameLinkChanged(const tolmoui::UI_ControlMessage* changed)
{
    if (changed->GetControl() == userNameLink.get() && !userNameLinkURL.empty())
        tolmocore::utility::OpenURLInDefaultBrowser(userNameLinkURL);
}

void MessageBoxCallbackHandler::PasswordLinkChanged(const tolmoui::UI_ControlMessage* changed)
{
    if (changed->GetControl() == passwordLink.get() && !passwordLinkURL.empty())
        tolmocore::utility::OpenURLInDefaultBrowser(passwordLinkURL);
}

}  // namespace tolmonetsync
