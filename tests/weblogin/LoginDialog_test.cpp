// The sign-in window: its size, title and id, the host's view inside it, and
// a window without a view.

#include "WebSignInHarness.h"

namespace {

using namespace weblogin;
using tolmoui::PointT;
using tolmoui::RectT;

void GiveSize(int width, int height)
{
    MerrowLoginExtensionInfo info;
    info.mSizeGetter = [width, height](PointT<int>& size) {
        size.x = width;
        size.y = height;
    };
    SetMerrowLoginExtensionInfo(info);
}

TEST_F(WebSignIn, TheDialogSizeIsTheHostsOnlyWhenBothValuesArePositive)
{
    const struct {
        int width, height;
        float expectedWidth, expectedHeight;
    } cases[] = {{0, 500, 800, 600}, {-1, -1, 800, 600}, {1024, 0, 800, 600}, {1024, 700, 1024, 700}};
    for (const auto& c : cases) {
        GiveSize(c.width, c.height);
        const PointT<float> size = MerrowLoginDialogImpl::GetDialogSize();
        EXPECT_EQ(size, (PointT<float>{c.expectedWidth, c.expectedHeight})) << c.width << "x" << c.height;
    }
    GiveNoViewGetter();
    EXPECT_EQ(MerrowLoginDialogImpl::GetDialogSize(), (PointT<float>{800, 600}));
}

TEST_F(WebSignIn, TheDialogCarriesTheHostsViewOnItsWholeArea)
{
    MerrowLoginExtensionInfo info;
    const boost::intrusive_ptr<tolmoui::OS_View> view = mStageView;
    info.mViewGetter = [view](boost::intrusive_ptr<tolmoui::OS_View>& out) { out = view; };
    info.mSizeGetter = [](PointT<int>& size) { size = PointT<int>{1024, 700}; };
    SetMerrowLoginExtensionInfo(info);
    Extension(boost::none);
    SignInRun run(mRecorder);
    const auto dialog = WaitForSignInDialog();
    ASSERT_TRUE(dialog);

    ASSERT_TRUE(tolmoui::RunInModalLoop(
        [&] {
            EXPECT_EQ(dialog->UI_GetLocalRectF(), (RectT<float>{0, 0, 1024, 700}));
            EXPECT_EQ(tolmocore::utility::ToNarrow(dialog->GetTitle()), "Halvane Pellucid Authentication");
            EXPECT_TRUE(dialog->UI_IsShown() && dialog->UI_HasKeyboardFocus());

            const boost::intrusive_ptr<KelpHTMLView> htmlView = dialog->GetHTMLView();
            ASSERT_TRUE(htmlView);
            EXPECT_EQ(htmlView->UI_GetParent(), dialog->GetContentContainer());
            EXPECT_EQ(mStageView->UI_GetParent(), htmlView.get());
            EXPECT_TRUE(htmlView->UI_IsShown() && mStageView->UI_IsShown());
            EXPECT_EQ(mStageView->UI_GetLocalRect(), (RectT<int>{0, 0, 1024, 700}));
        },
        kWaitMs));
    ASSERT_TRUE(CloseByHand());
    EXPECT_FALSE(run.Result());
}

TEST_F(WebSignIn, WithoutAViewTheDialogStillRunsUntilClosedByHand)
{
    for (const bool getterGivesNull : {false, true}) {
        if (getterGivesNull) {
            MerrowLoginExtensionInfo info;
            info.mViewGetter = [](boost::intrusive_ptr<tolmoui::OS_View>&) {};
            SetMerrowLoginExtensionInfo(info);
        } else {
            GiveNoViewGetter();
        }
        Extension(boost::none);
        SignInRun run(mRecorder);
        const auto dialog = WaitForSignInDialog();
        ASSERT_TRUE(dialog);
        ASSERT_TRUE(tolmoui::RunInModalLoop(
            [&] {
                EXPECT_FALSE(dialog->GetHTMLView());
                EXPECT_TRUE(dialog->GetContentContainer()->GetChildren().empty());
                EXPECT_EQ(dialog->UI_GetLocalRectF(), (RectT<float>{0, 0, 800, 600}));
            },
            kWaitMs));
        ASSERT_TRUE(CloseByHand());
        EXPECT_FALSE(run.Result());
        ASSERT_TRUE(LauncherGoneAfter(*mExtension, 1));
    }
}

}  // namespace
