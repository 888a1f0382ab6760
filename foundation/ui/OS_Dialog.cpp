#include "foundation/ui/ModalLoops.h"
#include "foundation/ui/UI_Dialog.h"

namespace tolmoui {

OS_Dialog::OS_Dialog(const UTF16String& title, const PointT<float>& position, const PointT<float>& size)
    : mTitle(title), mScreenPosition(position)
{
    UI_SetLocalRectF(RectT<float>{0, 0, size.x, size.y});
    UI_Show(false);
}

OS_Dialog::~OS_Dialog() = default;

void OS_Dialog::Center()
{
    const RectT<float> rect = UI_GetLocalRectF();
    mScreenPosition = PointT<float>{(kScreenSize.x - rect.Width()) / 2, (kScreenSize.y - rect.Height()) / 2};
}

int OS_Dialog::RunModal()
{
    return ModalLoops::Run(*this);
}

void OS_Dialog::PostClose()
{
    ModalLoops::PostClose(*this);
}

bool OS_Dialog::IsInModalLoop() const
{
    return ModalLoops::IsInLoop(*this);
}

}  // namespace tolmoui
