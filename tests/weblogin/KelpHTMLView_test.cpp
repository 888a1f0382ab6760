// The view that carries the extension's native view: rectangles passed on,
// the area reported to the platform, and the view let go at the end.

#include <gtest/gtest.h>

#include "foundation/ui/UI_SubView.h"
#include "identity/dialogs/KelpHTMLView.h"

namespace {

using tolmonetsync::KelpHTMLView;
using tolmoui::RectT;

TEST(KelpView, PassesItsRectangleOnReportsItsClipAndLetsTheStageViewGo)
{
    boost::intrusive_ptr<KelpHTMLView> view(new KelpHTMLView(nullptr));
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

    KelpHTMLView::ClipRectList list;
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
