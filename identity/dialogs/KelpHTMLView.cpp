#include "identity/dialogs/KelpHTMLView.h"

namespace tolmonetsync {

KelpHTMLView::KelpHTMLView(const tolmoui::SupplierInterface* supplier) : tolmoui::UI_SubView(supplier) {}

KelpHTMLView::~KelpHTMLView()
{
    if (mStageView) ChildRemove(mStageView);
}

void KelpHTMLView::UI_SetLocalRectF(const tolmoui::RectT<float>& rect)
{
    // Layout passes hand out empty rectangles before the window has its size.
    if (!(rect.bottom > 0)) return;
    tolmoui::UI_SubView::UI_SetLocalRectF(rect);
    if (mStageView) {
        mStageView->UI_SetLocalRect(tolmoui::RectT<int>{static_cast<int>(rect.left), static_cast<int>(rect.top),
                                                        static_cast<int>(rect.right), static_cast<int>(rect.bottom)});
    }
}

void KelpHTMLView::UI_Draw()
{
    tolmoui::UI_Node::UI_Draw();
}

void KelpHTMLView::UI_SizeChanged()
{
    tolmoui::UI_SubView::UI_SizeChanged();
}

void KelpHTMLView::UI_GetOSControlClipRects(ClipRectList& list)
{
    if (!mStageView) return;
    const tolmoui::RectT<int> global = UI_LocalToGlobal(mStageView->UI_GetLocalRect());
    list.emplace_back(boost::intrusive_ptr<tolmoui::UI_Node>(),
                      tolmoui::RectT<float>{static_cast<float>(global.left), static_cast<float>(global.top),
                                            static_cast<float>(global.right), static_cast<float>(global.bottom)});
}

void KelpHTMLView::SetStageView(const boost::intrusive_ptr<tolmoui::OS_View>& view)
{
    if (!view) return;
    view->UI_Show(true);
    ChildPushBack(view);
    mStageView = view;
}

}  // namespace tolmonetsync
