#pragma once
// The state of one run of the password dialog and the handlers that its
// controls call. Lives as long as that run; everything runs on the UI thread.

#include <boost/intrusive_ptr.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/ui/UI_Button.h"
#include "foundation/ui/UI_HotTextButton.h"
#include "foundation/ui/UI_MessageBox.h"
#include "foundation/ui/UI_StaticText.h"
#include "foundation/ui/UI_TextEdit.h"
#include "identity/dialogs/SyncAuthenticationDialog.h"

namespace tolmonetsync {

struct MessageBoxCallbackHandler {
    boost::intrusive_ptr<tolmoui::UI_MessageBox> dialog;
    boost::intrusive_ptr<tolmoui::UI_TextEdit> userNameEdit;
    boost::intrusive_ptr<tolmoui::UI_TextEdit> passwordEdit;
    UTF16String message;                                           // the message of the start, put back after an error
    boost::intrusive_ptr<tolmoui::UI_HotTextButton> userNameLink;  // null without that link
    UTF16String userNameLinkURL;
    boost::intrusive_ptr<tolmoui::UI_HotTextButton> passwordLink;  // null without that link
    UTF16String passwordLinkURL;
    boost::shared_ptr<SyncAuthenticationValidator> validator;
    boost::intrusive_ptr<tolmoui::UI_Button> okButton;
    boost::intrusive_ptr<tolmoui::UI_StaticText> messageText;
    bool showingError = false;  // the message area holds a validator's text

    // Whether OK may close the dialog: both fields hold text and the
    // validator accepts. A refusal shows the validator's error text, unless
    // an earlier refusal's text is still showing.
    bool ValidateOK();

    // A user's edit of a field (change code not 0): OK enabled only while
    // both fields hold text, and the first message back in place of an error.
    void UserNameTextEditChanged(const tolmoui::UI_InteractiveControlChangedMessage* changed);
    void PasswordTextEditChanged(const tolmoui::UI_InteractiveControlChangedMessage* changed);

    // A click on a link opens its URL, if it has one.
    void UserNameLinkChanged(const tolmoui::UI_ControlMessage* changed);
    void PasswordLinkChanged(const tolmoui::UI_ControlMessage* changed);

private:
    void TextEditChanged(const tolmoui::UI_InteractiveControlChangedMessage* changed);
    void UpdateOkButton();
};

}  // namespace tolmonetsync
