#pragma once
// Runs the password dialog on a UI thread of its own while the test plays the
// user from its thread through the modal loop.

#include <gtest/gtest.h>

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

// Filled in as for a returning user, ann:secret.
struct DialogArguments {
    UTF16String title = UTF16String(u"Sign in");
    UTF16String message = UTF16String(u"Sign in with your Halvane ID.");
    UTF16String userNameLabel = UTF16String(u"User name:");
    UTF16String userName = UTF16String(u"ann");
    UTF16String passwordLabel = UTF16String(u"Password:");
    UTF16String password = UTF16String(u"secret");
    boost::shared_ptr<SyncAuthenticationValidator> validator;
    boost::shared_ptr<UI_MessageBox::MessageCallback> messageCallback;
    UTF16String userNameLinkText, userNameLinkURL, passwordLinkText, passwordLinkURL;
};

// A validator from a plain function.
inline boost::shared_ptr<SyncAuthenticationValidator> Validator(const SyncAuthenticationValidator& validator)
{
    return boost::shared_ptr<SyncAuthenticationValidator>(new SyncAuthenticationValidator(validator));
}

class DialogRun {
public:
    // Starts the dialog and waits until its modal loop runs.
    explicit DialogRun(const DialogArguments& arguments) : mArguments(arguments)
    {
        mThread = std::thread([this] {
            DialogArguments& a = mArguments;
            mResult = tolmonetsync::SyncAuthenticationDialog(nullptr, a.title, a.message, a.userNameLabel, a.userName,
                                                             a.passwordLabel, a.password, a.validator, nullptr, 0, 0,
                                                             a.messageCallback, a.userNameLinkText, a.userNameLinkURL,
                                                             a.passwordLinkText, a.passwordLinkURL);
        });
        mBox.reset(dynamic_cast<UI_MessageBox*>(WaitForModalDialog().get()));
        EXPECT_TRUE(mBox) << "no message box came up";
    }
    // Closes a dialog still open and waits for its thread.
    ~DialogRun()
    {
        if (mThread.joinable()) {
            Do([](UI_MessageBox& box) { box.HandleCloseBox(); });
            Finish();
        }
    }

    // Runs `action` on the dialog inside its modal loop; false if the loop
    // did not run it (the dialog has closed).
    bool Do(const std::function<void(UI_MessageBox& box)>& action)
    {
        return RunInModalLoop([&] {
            if (mBox) action(*mBox);
        });
    }

    // Waits for the dialog to end (the test must have closed it); its
    // result. Afterwards Arguments() holds the values written back.
    bool Finish()
    {
        if (mThread.joinable()) mThread.join();
        // The box may go on this thread now that its own has finished with it.
        mBox.reset();
        return mResult;
    }
    const DialogArguments& Arguments() const { return mArguments; }

private:
    DialogArguments mArguments;
    boost::intrusive_ptr<UI_MessageBox> mBox;  // used only inside the loop, released after it
    bool mResult = false;
    std::thread mThread;
};

// Nodes of the dialog by node id; null if absent.
inline boost::intrusive_ptr<UI_TextEdit> Edit(UI_MessageBox& box, const char* nodeID)
{
    return box.FindDescendantAs<UI_TextEdit>(nodeID);
}
inline boost::intrusive_ptr<UI_HotTextButton> Link(UI_MessageBox& box, const char* nodeID)
{
    return box.FindDescendantAs<UI_HotTextButton>(nodeID);
}
inline UTF16String MessageText(UI_MessageBox& box)
{
    return box.GetMessageStaticText()->GetValue();
}
inline bool OkEnabled(UI_MessageBox& box)
{
    return !box.GetSpecificButton(kDialogResponse_OK)->IsDisabled();
}

}  // namespace uitest
