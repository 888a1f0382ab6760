#include "foundation/ui/UI_ControlView.h"

namespace tolmoui {

void UI_ControlView::SendChanged()
{
    // A copy: a handler may add to the list of another control, or release
    // the last outside reference to this one.
    boost::intrusive_ptr<UI_ControlView> keep(this);
    const std::vector<ChangeHandler> handlers = mChangeHandlers;
    UI_ControlMessage message(this);
    for (const auto& handler : handlers) handler(&message);
}

bool UI_InteractiveControlView::HandleUserChange(int changeMessage)
{
    if (IsDisabled()) return false;
    boost::intrusive_ptr<UI_InteractiveControlView> keep(this);
    const std::vector<InteractiveChangeHandler> handlers = mInteractiveHandlers;
    UI_InteractiveControlChangedMessage message(this, changeMessage);
    for (const auto& handler : handlers) handler(&message);
    SendChanged();
    return true;
}

}  // namespace tolmoui
