#pragma once
// Runs the password dialog on a UI thread of its own while the test plays the
// user from its thread through the modal loop.

#include <functional>
#include <thread>

#include <boost/intrusive_ptr.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/ui/UI_HotTextButton.h"
#include "foundation/ui/UI_MessageBox.h"
#include "foundation/ui/UI_TextEdit.h"
#include "identity/dialogs/SyncAuthenticationDialog.h"
#include "support/UI_Automation.h"

namespace uitest {

using namespace tolmoui;
using tolmonetsync::SyncAuthenticationValidator;

struct DialogArguments {
    UTF16String title = UTF16String(u"Sign in");
    UTF16String message = UTF16String(u"Sign in with your Halvane ID.");
    UTF16String userNameLabel = UTF16String(u"User name:");
    UTF16String userName;
    UTF16String passwordLabel = UTF16String(u"Password:");
    UTF16String password;
    boost::shared_ptr<SyncAuthenticationValidator> validator;
    boost::shared_ptr<UI_MessageBox::MessageCallback> messageCallback;
    UTF16String userNameLinkText, userNameLinkURL, passwordLinkText, passwordLinkURL;
};

// A validator from a plain function.
boost::shared_ptr<SyncAuthenticationValidator> Validator(const SyncAuthenticationValidator& validator);

class DialogRun {
public:
    // Starts the dialog and waits until its modal loop runs.
    explicit DialogRun(const DialogArguments& arguments);
    // Closes a dialog still open and waits for its thread.
    ~DialogRun();

    // Runs `action` on the dialog inside its modal loop; false if the loop
    // did not run it (the dialog has closed).
    bool Do(const std::function<void(UI_MessageBox& box)>& action);

    // Waits for the dialog to end (the test must have closed it); its result. Afterwards Arguments() holds
    // the values written back.
    bool Finish();
    const DialogArguments& Arguments() const { return mArguments; }

private:
    DialogArguments mArguments;
    boost::intrusive_ptr<UI_MessageBox> mBox;  // used only inside the loop, released after it
    bool mResult = false;
    std::thread mThread;
};

// Nodes of the dialog by node id; null if absent.
boost::intrusive_ptr<UI_TextEdit> Edit(UI_MessageBox& box, const char* nodeID);
boost::intrusive_ptr<UI_HotTextButton> Link(UI_MessageBox& box, const char* nodeID);
UTF16String MessageText(UI_MessageBox& box);
bool OkEnabled(UI_MessageBox& box);

}  // namespace uitest
