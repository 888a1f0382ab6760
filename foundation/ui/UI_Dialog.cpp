#include "foundation/ui/UI_Dialog.h"

#include <algorithm>

#include "foundation/ui/UI_SubView.h"

namespace tolmoui {

UI_Dialog::UI_Dialog(const SupplierInterface* supplier, const UTF16String& title, const PointT<float>& position,
                     const PointT<float>& size, bool, UI_Node* parent, bool, bool, bool, bool, int style, int flags,
                     const ViewContainerFactory& viewContainerFactory)
    : OS_Dialog(title, position, size), mSupplier(supplier), mParentNode(parent), mStyle(style), mFlags(flags)
{
    if (viewContainerFactory) mContent = viewContainerFactory();
    if (!mContent) mContent = new UI_SubView(supplier);
    mContent->UI_SetLocalRectF(RectT<float>{0, 0, size.x, size.y});
    mContent->UI_Show(true);
    ChildPushBack(mContent);
}

void UI_Dialog::UI_PostClose()
{
    PostClose();
}

void UI_Dialog::AddButton(const boost::intrusive_ptr<UI_Button>& button)
{
    if (!button) return;
    auto same = std::find_if(mButtons.begin(), mButtons.end(), [&](const boost::intrusive_ptr<UI_Button>& each) {
        return each->GetResponse() == button->GetResponse();
    });
    if (same != mButtons.end()) {
        ChildRemove(same->get());
        mButtons.erase(same);
    }
    mButtons.push_back(button);
    button->UI_Show(true);
    ChildPushBack(button);
}

boost::intrusive_ptr<UI_Button> UI_Dialog::FindButton(int response) const
{
    for (const auto& button : mButtons) {
        if (button->GetResponse() == response) return button;
    }
    return nullptr;
}

void UI_Dialog::SetOkButton(const boost::intrusive_ptr<UI_Button>& button)
{
    if (button && FindButton(button->GetResponse()) != button) AddButton(button);
    mOkButton = button;
}

void UI_Dialog::HandleCloseBox()
{
    SetResponse(kDialogResponse_Cancel);
    UI_PostClose();
}

bool UI_Dialog::HandleButtonClick(int response)
{
    const boost::intrusive_ptr<UI_Button> button = FindButton(response);
    if (!button || button->IsDisabled()) return false;
    button->NotifyPressed();
    if (button == mOkButton && mOkHook && !mOkHook()) return true;
    SetResponse(response);
    UI_PostClose();
    return true;
}

}  // namespace tolmoui
