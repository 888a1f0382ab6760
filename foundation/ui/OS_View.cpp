#include "foundation/ui/OS_View.h"

namespace tolmoui {

void OS_View::UI_SetLocalRect(const RectT<int>& rect)
{
    UI_SetLocalRectF(RectT<float>{static_cast<float>(rect.left), static_cast<float>(rect.top),
                                  static_cast<float>(rect.right), static_cast<float>(rect.bottom)});
}

RectT<int> OS_View::UI_GetLocalRect() const
{
    const RectT<float> rect = UI_GetLocalRectF();
    return RectT<int>{static_cast<int>(rect.left), static_cast<int>(rect.top), static_cast<int>(rect.right),
                      static_cast<int>(rect.bottom)};
}

void OS_View::UI_GetOSControlClipRects(ClipRectList& list)
{
    const RectT<int> local = UI_GetLocalRect();
    const RectT<int> global = UI_LocalToGlobal(RectT<int>{0, 0, local.Width(), local.Height()});
    list.emplace_back(boost::intrusive_ptr<UI_Node>(this),
                      RectT<float>{static_cast<float>(global.left), static_cast<float>(global.top),
                                   static_cast<float>(global.right), static_cast<float>(global.bottom)});
}

}  // namespace tolmoui
