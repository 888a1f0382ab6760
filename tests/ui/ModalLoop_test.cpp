// The headless UI's own behaviour that dialogs rely on: the modal loop and
// its automation across threads, buttons and the OK hook, and the node tree.

#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "foundation/core/Threads.h"
#include "foundation/ui/UI_Automation.h"
#include "foundation/ui/UI_MessageBox.h"

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
        mThread = std::thread([this] {
            mLoopThread = std::this_thread::get_id();
            mResponse = mDialog->RunModal();
        });
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
    std::thread::id Id() const { return mLoopThread; }  // after the loop ran an action

private:
    boost::intrusive_ptr<OS_Dialog> mDialog;
    std::thread::id mLoopThread;
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
    EXPECT_EQ(ModalLoopDepth(), 0);
}

TEST_F(ModalLoop, APostCloseBeforeTheLoopEndsTheNextLoopAtOnce)
{
    auto box = MakeBox();
    box->PostClose();
    EXPECT_EQ(box->RunModal(), kDialogResponse_None);
    // Consumed: a later loop runs until closed again.
    LoopThread loop(box);
    ASSERT_EQ(WaitForModalDialog(kWaitMs), box);
    ASSERT_TRUE(RunInModalLoop([&] { box->SimulateUserClose(); }, kWaitMs));
    EXPECT_EQ(loop.Join(), kDialogResponse_Cancel);
}

TEST_F(ModalLoop, RunInModalLoopRunsTheActionOnTheLoopsThreadAndWaitsForIt)
{
    auto box = MakeBox();
    std::thread::id ranOn;
    LoopThread loop(box);
    ASSERT_TRUE(RunInModalLoop([&] { ranOn = std::this_thread::get_id(); }, kWaitMs));
    EXPECT_NE(ranOn, std::this_thread::get_id());
    // A nested call from inside an action runs at once.
    bool nestedRan = false;
    ASSERT_TRUE(RunInModalLoop([&] { EXPECT_TRUE(RunInModalLoop([&] { nestedRan = true; }, 0)); }, kWaitMs));
    EXPECT_TRUE(nestedRan);
    ASSERT_TRUE(RunInModalLoop([&] { box->SimulateUserClose(); }, kWaitMs));
    loop.Join();
    EXPECT_EQ(ranOn, loop.Id());
}

TEST_F(ModalLoop, WithoutALoopNothingRunsAndNoDialogComes)
{
    bool ran = false;
    EXPECT_FALSE(RunInModalLoop([&] { ran = true; }, 20));
    EXPECT_FALSE(ran);
    EXPECT_FALSE(WaitForModalDialog(20));
}

TEST_F(ModalLoop, AnActionNotStartedInTimeIsWithdrawnAndNeverRuns)
{
    auto box = MakeBox();
    LoopThread loop(box);
    tolmocore::threads::Gate started(false), release(false);
    std::thread busy([&] {
        RunInModalLoop(
            [&] {
                started.Open();
                release.PassThrough(-1);
            },
            kWaitMs);
    });
    ASSERT_TRUE(started.PassThrough(kWaitMs));
    std::atomic<bool> lateRan{false};
    EXPECT_FALSE(RunInModalLoop([&] { lateRan = true; }, 20));  // the loop is busy until released
    release.Open();
    busy.join();
    ASSERT_TRUE(RunInModalLoop([&] { box->SimulateUserClose(); }, kWaitMs));
    loop.Join();
    EXPECT_FALSE(lateRan);
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
    ASSERT_TRUE(RunInModalLoop([&] { inner->SimulateButtonPress(kDialogResponse_OK); }, kWaitMs));
    opener.join();
    EXPECT_EQ(innerResponse, kDialogResponse_OK);
    ASSERT_EQ(WaitForModalDialog(kWaitMs), outer);
    ASSERT_TRUE(RunInModalLoop([&] { outer->SimulateUserClose(); }, kWaitMs));
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
            EXPECT_FALSE(box->SimulateButtonPress(kDialogResponse_OK));
            EXPECT_FALSE(box->SimulateButtonPress(7));  // no such button
            box->GetSpecificButton(kDialogResponse_OK)->SetDisabled(false);
            EXPECT_TRUE(box->SimulateButtonPress(kDialogResponse_OK));
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
    ASSERT_TRUE(RunInModalLoop([&] { EXPECT_TRUE(box->SimulateButtonPress(kDialogResponse_OK)); }, kWaitMs));
    ASSERT_TRUE(RunInModalLoop(
        [&] {
            EXPECT_EQ(asked, 1);
            EXPECT_TRUE(box->IsInModalLoop());
            accept = true;
            box->SimulateButtonPress(kDialogResponse_OK);
        },
        kWaitMs));
    EXPECT_EQ(loop.Join(), kDialogResponse_OK);
    EXPECT_EQ(asked, 2);

    LoopThread again(box);
    accept = false;
    ASSERT_TRUE(RunInModalLoop([&] { box->SimulateButtonPress(kDialogResponse_Cancel); }, kWaitMs));
    EXPECT_EQ(again.Join(), kDialogResponse_Cancel);
    EXPECT_EQ(asked, 2);
}

}  // namespace
