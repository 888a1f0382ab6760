#include "DialogDriver.h"

#include <gtest/gtest.h>

namespace uitest {

boost::shared_ptr<SyncAuthenticationValidator> Validator(const SyncAuthenticationValidator& validator)
{
    return boost::shared_ptr<SyncAuthenticationValidator>(new SyncAuthenticationValidator(validator));
}

DialogRun::DialogRun(const DialogArguments& arguments) : mArguments(arguments)
{
    mThread = std::thread([this] {
        DialogArguments& a = mArguments;
        mResult = tolmonetsync::SyncAuthenticationDialog(
            nullptr, a.title, a.message, a.userNameLabel, a.userName, a.passwordLabel, a.password, a.validator, nullptr,
            0, 0, a.messageCallback, a.userNameLinkText, a.userNameLinkURL, a.passwordLinkText, a.passwordLinkURL);
    });
    mBox.reset(dynamic_cast<UI_MessageBox*>(WaitForModalDialog().get()));
    EXPECT_TRUE(mBox) << "no message box came up";
}

DialogRun::~DialogRun()
{
    if (mThread.joinable()) {
        Do([](UI_MessageBox& box) { box.HandleCloseBox(); });
        Finish();
    }
}

bool DialogRun::Do(const std::function<void(UI_MessageBox& box)>& action)
{
    return RunInModalLoop([&] {
        if (mBox) action(*mBox);
    });
}

bool DialogRun::Finish()
{
    if (mThread.joinable()) mThread.join();
    // The box may go on this thread now that its own has finished with it.
    mBox.reset();
    return mResult;
}

boost::intrusive_ptr<UI_TextEdit> Edit(UI_MessageBox& box, const char* nodeID)
{
    return box.FindDescendantAs<UI_TextEdit>(nodeID);
}

boost::intrusive_ptr<UI_HotTextButton> Link(UI_MessageBox& box, const char* nodeID)
{
    return box.FindDescendantAs<UI_HotTextButton>(nodeID);
}

UTF16String MessageText(UI_MessageBox& box)
{
    return box.GetMessageStaticText()->GetValue();
}

bool OkEnabled(UI_MessageBox& box)
{
    return !box.GetSpecificButton(kDialogResponse_OK)->IsDisabled();
}

}  // namespace uitest
