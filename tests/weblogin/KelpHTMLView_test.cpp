// The view that carries the extension's native view: rectangles passed on,
// the area reported to the platform, and the view let go at the end.

#include <gtest/gtest.h>

#include "foundation/ui/UI_SubView.h"
#include "identity/dialogs/KelpHTMLView.h"

namespace {

using tolmonetsync::KelpHTMLView;
using tolmoui::OS_View;
using tolmoui::RectT;

class KelpView : public ::testing::Test {
protected:
    KelpView() { mView->SetStageView(mStage); }

    boost::intrusive_ptr<KelpHTMLView> mView{new KelpHTMLView(nullptr)};
    boost::intrusive_ptr<OS_View> mStage{new OS_View};
};

TEST_F(KelpView, TheStageViewGetsTheRectangleTruncatedAndNoHeightChangesNothing)
{
    mView->UI_SetLocalRectF(RectT<float>{10.7f, 20.2f, 300.9f, 400.5f});
    EXPECT_EQ(mStage->UI_GetLocalRect(), (RectT<int>{10, 20, 300, 400}));

    mView->UI_SetLocalRectF(RectT<float>{5, 5, 200, 0});
    mView->UI_SetLocalRectF(RectT<float>{5, 5, 200, -3});
    EXPECT_EQ(mView->UI_GetLocalRectF(), (RectT<float>{10.7f, 20.2f, 300.9f, 400.5f}));
    EXPECT_EQ(mStage->UI_GetLocalRect(), (RectT<int>{10, 20, 300, 400}));
}

TEST_F(KelpView, TheClipRectangleIsTheStageViewInWindowCoordinates)
{
    boost::intrusive_ptr<tolmoui::UI_SubView> window(new tolmoui::UI_SubView());
    window->UI_SetLocalRectF(RectT<float>{100, 200, 900, 800});
    window->ChildPushBack(mView);
    mView->UI_SetLocalRectF(RectT<float>{30, 40, 530, 440});

    KelpHTMLView::ClipRectList list;
    mView->UI_GetOSControlClipRects(list);
    ASSERT_EQ(list.size(), 1u);
    EXPECT_FALSE(list[0].first);
    // The stage view's rectangle (30, 40, ...) moved by the view's origin; the window's own place is not added.
    EXPECT_EQ(list[0].second, (RectT<float>{60, 80, 560, 480}));

    // The stage view is let go with the view.
    window.reset();
    mView.reset();
    EXPECT_EQ(mStage->UI_GetParent(), nullptr);
}

}  // namespace
