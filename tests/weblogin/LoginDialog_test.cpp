// The sign-in window: its size, title and id, the host's view inside it, and
// a window without a view; the view that carries the host's.

#include "WebSignInHarness.h"
#include "foundation/ui/UI_SubView.h"
#include "identity/dialogs/KelpHTMLView.h"

namespace {

using namespace weblogin;
using tolmoui::PointT;
using tolmoui::RectT;

TEST_F(WebSignIn, TheDialogSizeIsTheHostsOnlyWhenBothValuesArePositive)
{
    const struct {
        PointT<int> mGiven;
        PointT<float> mExpected;
    } cases[] = {{{0, 500}, {800, 600}}, {{-1, -1}, {800, 600}}, {{1024, 0}, {800, 600}}, {{1024, 700}, {1024, 700}}};
    for (const auto& c : cases) {
        MerrowLoginExtensionInfo info;
        info.mSizeGetter = [c](PointT<int>& size) { size = c.mGiven; };
        SetMerrowLoginExtensionInfo(info);
        EXPECT_EQ(MerrowLoginDialogImpl::GetDialogSize(), c.mExpected) << c.mGiven.x << "x" << c.mGiven.y;
    }
    MerrowLoginExtensionInfo none;  // no size getter
    SetMerrowLoginExtensionInfo(none);
    EXPECT_EQ(MerrowLoginDialogImpl::GetDialogSize(), (PointT<float>{800, 600}));
}

// With the host's view the dialog carries it on its whole area; without one
// (no getter, or a getter giving none) it still runs until closed by hand.
TEST_F(WebSignIn, TheDialogCarriesTheHostsViewOrRunsWithoutOne)
{
    const boost::intrusive_ptr<tolmoui::OS_View> view = mStageView;
    const std::function<void(boost::intrusive_ptr<tolmoui::OS_View>&)> getters[] = {
        [view](boost::intrusive_ptr<tolmoui::OS_View>& out) { out = view; },
        nullptr,
        [](boost::intrusive_ptr<tolmoui::OS_View>&) {},
    };
    for (int row = 0; row < 3; ++row) {
        SCOPED_TRACE(row);
        const bool withView = row == 0;
        MerrowLoginExtensionInfo info;
        if (getters[row]) info.mViewGetter = getters[row];
        if (withView) info.mSizeGetter = [](PointT<int>& size) { size = PointT<int>{1024, 700}; };
        SetMerrowLoginExtensionInfo(info);
        Extension(boost::none);
        SignInRun run(mRecorder);
        const auto dialog = WaitForSignInDialog();
        ASSERT_TRUE(dialog);
        ASSERT_TRUE(tolmoui::RunInModalLoop([&] {
            EXPECT_EQ(tolmocore::utility::ToNarrow(dialog->GetTitle()), "Halvane Pellucid Authentication");
            EXPECT_TRUE(dialog->UI_IsShown() && dialog->UI_HasKeyboardFocus());
            const boost::intrusive_ptr<tolmonetsync::KelpHTMLView> htmlView = dialog->GetHTMLView();
            ASSERT_EQ(bool(htmlView), withView);
            if (!withView) {
                EXPECT_TRUE(dialog->GetContentContainer()->GetChildren().empty());
                EXPECT_EQ(dialog->UI_GetLocalRectF(), (RectT<float>{0, 0, 800, 600}));
                return;
            }
            EXPECT_EQ(dialog->UI_GetLocalRectF(), (RectT<float>{0, 0, 1024, 700}));
            EXPECT_EQ(htmlView->UI_GetParent(), dialog->GetContentContainer());
            EXPECT_EQ(mStageView->UI_GetParent(), htmlView.get());
            EXPECT_TRUE(htmlView->UI_IsShown() && mStageView->UI_IsShown());
            EXPECT_EQ(mStageView->UI_GetLocalRect(), (RectT<int>{0, 0, 1024, 700}));
        }));
        ASSERT_TRUE(CloseByHand());
        EXPECT_FALSE(run.Result());
        ASSERT_TRUE(LauncherGoneAfter(*mExtension, 1));
    }
}

// The view that carries the extension's native view: rectangles passed on,
// the area reported to the platform, and the view let go at the end.

TEST(KelpView, PassesItsRectangleOnReportsItsClipAndLetsTheStageViewGo)
{
    boost::intrusive_ptr<tolmonetsync::KelpHTMLView> view(new tolmonetsync::KelpHTMLView(nullptr));
    const boost::intrusive_ptr<tolmoui::OS_View> stage(new tolmoui::OS_View);
    view->SetStageView(stage);
    boost::intrusive_ptr<tolmoui::UI_SubView> window(new tolmoui::UI_SubView());
    window->UI_SetLocalRectF(RectT<float>{100, 200, 900, 800});
    window->ChildPushBack(view);

    // Truncated; no height changes nothing.
    view->UI_SetLocalRectF(RectT<float>{30.7f, 40.2f, 530.9f, 440.5f});
    EXPECT_EQ(stage->UI_GetLocalRect(), (RectT<int>{30, 40, 530, 440}));
    view->UI_SetLocalRectF(RectT<float>{5, 5, 200, 0});
    view->UI_SetLocalRectF(RectT<float>{5, 5, 200, -3});
    EXPECT_EQ(view->UI_GetLocalRectF(), (RectT<float>{30.7f, 40.2f, 530.9f, 440.5f}));
    EXPECT_EQ(stage->UI_GetLocalRect(), (RectT<int>{30, 40, 530, 440}));

    tolmonetsync::KelpHTMLView::ClipRectList list;
    view->UI_GetOSControlClipRects(list);
    ASSERT_EQ(list.size(), 1u);
    EXPECT_FALSE(list[0].first);
    // The stage view's rectangle moved by the view's origin; the window's own place is not added.
    EXPECT_EQ(list[0].second, (RectT<float>{60, 80, 560, 480}));

    window.reset();
    view.reset();
    EXPECT_EQ(stage->UI_GetParent(), nullptr);
}

}  // namespace
