// The headless UI's own behaviour that dialogs rely on: the modal loop
// (closing from another thread, nesting), buttons and the OK hook.

#include <gtest/gtest.h>

#include <thread>

#include "foundation/ui/UI_MessageBox.h"
#include "support/UI_Automation.h"

namespace {

using namespace tolmoui;

const int kWaitMs = 30000;
const int kOkAndCancel = UI_MessageBox::kMessageBoxButton_OK | UI_MessageBox::kMessageBoxButton_Cancel;

boost::intrusive_ptr<UI_MessageBox> MakeBox()
{
    return new UI_MessageBox(nullptr, UTF16String(u"Title"), UTF16String(u"Message"), kOkAndCancel, kDialogResponse_OK,
                             3, nullptr, 0, 0, 0, nullptr);
}

// Runs a dialog's modal loop on a thread of its own.
class LoopThread {
public:
    explicit LoopThread(const boost::intrusive_ptr<OS_Dialog>& dialog) : mDialog(dialog)
    {
        mThread = std::thread([this] { mResponse = mDialog->RunModal(); });
    }
    ~LoopThread()
    {
        if (mThread.joinable()) Join();
    }
    int Join()
    {
        mThread.join();
        return mResponse;
    }

private:
    boost::intrusive_ptr<OS_Dialog> mDialog;
    int mResponse = -1;
    std::thread mThread;
};

class ModalLoop : public ::testing::Test {};

TEST_F(ModalLoop, PostCloseFromAnotherThreadEndsRunModal)
{
    auto box = MakeBox();
    LoopThread loop(box);
    ASSERT_EQ(WaitForModalDialog(kWaitMs), box);
    EXPECT_TRUE(box->IsInModalLoop());
    box->PostClose();
    EXPECT_EQ(loop.Join(), kDialogResponse_None);
    EXPECT_FALSE(box->IsInModalLoop());
}

TEST_F(ModalLoop, APostCloseBeforeTheLoopEndsTheNextLoopAtOnce)
{
    auto box = MakeBox();
    box->PostClose();
    EXPECT_EQ(box->RunModal(), kDialogResponse_None);
    // Consumed: a later loop runs until closed again.
    LoopThread loop(box);
    ASSERT_EQ(WaitForModalDialog(kWaitMs), box);
    ASSERT_TRUE(RunInModalLoop([&] { box->HandleCloseBox(); }, kWaitMs));
    EXPECT_EQ(loop.Join(), kDialogResponse_Cancel);
}

TEST_F(ModalLoop, NestedLoopsTakeActionsInnermostFirst)
{
    auto outer = MakeBox();
    auto inner = MakeBox();
    LoopThread loop(outer);
    ASSERT_EQ(WaitForModalDialog(kWaitMs), outer);
    int innerResponse = -1;
    std::thread opener([&] { RunInModalLoop([&] { innerResponse = inner->RunModal(); }, kWaitMs); });
    ASSERT_TRUE(WaitForModalLoopDepth(2, kWaitMs));
    EXPECT_EQ(WaitForModalDialog(kWaitMs), inner);
    ASSERT_TRUE(RunInModalLoop([&] { inner->HandleButtonClick(kDialogResponse_OK); }, kWaitMs));
    opener.join();
    EXPECT_EQ(innerResponse, kDialogResponse_OK);
    ASSERT_EQ(WaitForModalDialog(kWaitMs), outer);
    ASSERT_TRUE(RunInModalLoop([&] { outer->HandleCloseBox(); }, kWaitMs));
    EXPECT_EQ(loop.Join(), kDialogResponse_Cancel);
}

class DialogButtons : public ::testing::Test {};

TEST_F(DialogButtons, ADisabledButtonCannotBePressed)
{
    auto box = MakeBox();
    box->GetSpecificButton(kDialogResponse_OK)->SetDisabled(true);
    LoopThread loop(box);
    ASSERT_TRUE(RunInModalLoop(
        [&] {
            EXPECT_FALSE(box->HandleButtonClick(kDialogResponse_OK));
            EXPECT_FALSE(box->HandleButtonClick(7));  // no such button
            box->GetSpecificButton(kDialogResponse_OK)->SetDisabled(false);
            EXPECT_TRUE(box->HandleButtonClick(kDialogResponse_OK));
        },
        kWaitMs));
    EXPECT_EQ(loop.Join(), kDialogResponse_OK);
}

TEST_F(DialogButtons, OKGoesThroughTheHookAndCancelDoesNot)
{
    auto box = MakeBox();
    int asked = 0;
    bool accept = false;
    box->SetOkHook([&] {
        ++asked;
        return accept;
    });
    box->SetOkButton(box->GetSpecificButton(kDialogResponse_OK));
    LoopThread loop(box);
    ASSERT_TRUE(RunInModalLoop([&] { EXPECT_TRUE(box->HandleButtonClick(kDialogResponse_OK)); }, kWaitMs));
    ASSERT_TRUE(RunInModalLoop(
        [&] {
            EXPECT_EQ(asked, 1);
            EXPECT_TRUE(box->IsInModalLoop());
            accept = true;
            box->HandleButtonClick(kDialogResponse_OK);
        },
        kWaitMs));
    EXPECT_EQ(loop.Join(), kDialogResponse_OK);
    EXPECT_EQ(asked, 2);

    LoopThread again(box);
    accept = false;
    ASSERT_TRUE(RunInModalLoop([&] { box->HandleButtonClick(kDialogResponse_Cancel); }, kWaitMs));
    EXPECT_EQ(again.Join(), kDialogResponse_Cancel);
    EXPECT_EQ(asked, 2);
}

}  // namespace
