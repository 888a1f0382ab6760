// The headless UI's own behaviour that dialogs rely on: the modal loop and
// its automation across threads, buttons and the OK hook, and the node tree.

#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "foundation/core/Threads.h"
#include "foundation/ui/OS_View.h"
#include "foundation/ui/UI_Automation.h"
#include "foundation/ui/UI_MessageBox.h"
#include "foundation/ui/UI_NodeManager.h"
#include "foundation/ui/UI_SubView.h"

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

class NodeTree : public ::testing::Test {};

TEST_F(NodeTree, GlobalRectanglesAddTheOriginsBelowTheWindow)
{
    boost::intrusive_ptr<UI_Dialog> dialog(new UI_Dialog(nullptr, UTF16String(u"d"), PointT<float>{0, 0},
                                                         PointT<float>{800, 600}, false, nullptr, true, false, true,
                                                         true, 0, 4, UI_Dialog::ViewContainerFactory()));
    dialog->Center();
    EXPECT_EQ(dialog->GetScreenPosition(), (PointT<float>{560, 240}));
    EXPECT_EQ(dialog->UI_GetLocalRectF(), (RectT<float>{0, 0, 800, 600}));
    EXPECT_FALSE(dialog->UI_IsShown());

    boost::intrusive_ptr<UI_SubView> sub(new UI_SubView());
    dialog->GetContentContainer()->ChildPushBack(sub);
    sub->UI_SetLocalRectF(RectT<float>{10, 20, 110, 220});
    EXPECT_EQ(sub->GetSizeChangedCount(), 1);
    sub->UI_SetLocalRectF(RectT<float>{11, 21, 111, 221});  // moved, same size
    EXPECT_EQ(sub->GetSizeChangedCount(), 1);

    boost::intrusive_ptr<OS_View> view(new OS_View());
    view->UI_SetNodeID("stage");
    sub->ChildPushBack(view);
    view->UI_SetLocalRect(RectT<int>{5, 5, 55, 45});
    EXPECT_EQ(view->UI_LocalToGlobal(RectT<int>{0, 0, 50, 40}), (RectT<int>{16, 26, 66, 66}));
    EXPECT_EQ(dialog->FindDescendant("stage"), view);

    UI_Node::ClipRectList clips;
    dialog->UI_GetOSControlClipRects(clips);
    ASSERT_EQ(clips.size(), 1u);
    EXPECT_EQ(clips[0].first, view);
    EXPECT_EQ(clips[0].second, (RectT<float>{16, 26, 66, 66}));

    EXPECT_TRUE(sub->ChildRemove(view));
    EXPECT_FALSE(sub->ChildRemove(view));
    EXPECT_EQ(view->UI_GetParent(), nullptr);
    EXPECT_FALSE(dialog->FindDescendant("stage"));
}

TEST_F(NodeTree, KeyboardFocusMovesWithinAWindowAndModalScopesNest)
{
    auto box = MakeBox();
    auto ok = box->GetSpecificButton(kDialogResponse_OK);
    auto cancel = box->GetSpecificButton(kDialogResponse_Cancel);
    ok->UI_GainKeyboardFocus(3);
    cancel->UI_GainKeyboardFocus(1);
    EXPECT_FALSE(ok->UI_HasKeyboardFocus());
    EXPECT_TRUE(cancel->UI_HasKeyboardFocus());
    EXPECT_EQ(cancel->UI_GetKeyboardFocusReason(), 1);

    {
        UI_NodeManager::SetModalWindow outer(box.get());
        {
            UI_NodeManager::SetModalWindow inner(nullptr);
            EXPECT_EQ(UI_NodeManager::GetModalWindow(), nullptr);
            EXPECT_EQ(UI_NodeManager::GetModalScopeDepth(), 2);
        }
        EXPECT_EQ(UI_NodeManager::GetModalWindow(), box.get());
    }
    EXPECT_EQ(UI_NodeManager::GetModalScopeDepth(), 0);
}

}  // namespace
