#pragma once
// A native view: a node whose area belongs to the platform (a web view, for
// instance). Its rectangle is kept in whole pixels.

#include "foundation/ui/UI_Node.h"

namespace tolmoui {

class OS_View : public UI_Node {
public:
    OS_View() = default;

    // The rectangle in the parent's coordinates, in whole pixels; the float
    // rectangle of the node follows it.
    void UI_SetLocalRect(const RectT<int>& rect);
    RectT<int> UI_GetLocalRect() const;

    // The view itself, with its rectangle in window coordinates.
    void UI_GetOSControlClipRects(ClipRectList& list) override;
};

}  // namespace tolmoui
