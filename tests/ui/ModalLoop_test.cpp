// The headless UI's modal loop that dialogs rely on: closing from another
// thread, and nesting.

#include <gtest/gtest.h>

#include <future>
#include <thread>

#include "foundation/ui/UI_MessageBox.h"
#include "support/UI_Automation.h"

namespace {

using namespace tolmoui;

boost::intrusive_ptr<UI_MessageBox> MakeBox()
{
    return new UI_MessageBox(nullptr, UTF16String(u"Title"), UTF16String(u"Message"),
                             UI_MessageBox::kMessageBoxButton_OK | UI_MessageBox::kMessageBoxButton_Cancel,
                             kDialogResponse_OK, 3, nullptr, 0, 0, 0, nullptr);
}

// The inner loop ends by a click inside it, the outer one by a close posted
// from another thread.
TEST(ModalLoop, NestedLoopsTakeActionsInnermostFirstAndPostCloseEndsALoop)
{
    auto outer = MakeBox();
    auto inner = MakeBox();
    auto loop = std::async(std::launch::async, [outer] { return outer->RunModal(); });
    ASSERT_EQ(WaitForModalDialog(), outer);
    int innerResponse = -1;
    std::thread opener([&] { RunInModalLoop([&] { innerResponse = inner->RunModal(); }); });
    ASSERT_TRUE(WaitForModalLoopDepth(2));
    EXPECT_EQ(WaitForModalDialog(), inner);
    ASSERT_TRUE(RunInModalLoop([&] { inner->HandleButtonClick(kDialogResponse_OK); }));
    opener.join();
    EXPECT_EQ(innerResponse, kDialogResponse_OK);
    ASSERT_EQ(WaitForModalDialog(), outer);
    EXPECT_TRUE(outer->IsInModalLoop());
    outer->PostClose();
    EXPECT_EQ(loop.get(), kDialogResponse_None);
    EXPECT_FALSE(outer->IsInModalLoop());
}

}  // namespace
