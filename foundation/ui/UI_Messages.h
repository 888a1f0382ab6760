#pragma once
// Messages that controls send to whoever asked to be told of changes.
// A message lives only for the call of the handler it is given to.

namespace tolmoui {

class UI_ControlView;

class ConstMessage {
public:
    virtual ~ConstMessage() = default;
};

// A control's value or state changed.
class UI_ControlMessage : public ConstMessage {
public:
    explicit UI_ControlMessage(UI_ControlView* control) : mControl(control) {}
    UI_ControlView* GetControl() const { return mControl; }

private:
    UI_ControlView* mControl;
};

// Change codes of an interactive change. 0 means nothing the user changed
// (focus moving in or out, for instance); any other code is a user's edit.
enum {
    kInteractiveChange_None = 0,
    kInteractiveChange_Edit = 1,
    kInteractiveChange_Click = 2,
};

// A change that the user made, with its change code.
class UI_InteractiveControlChangedMessage : public UI_ControlMessage {
public:
    UI_InteractiveControlChangedMessage(UI_ControlView* control, int changeMessage)
        : UI_ControlMessage(control), mChangeMessage(changeMessage)
    {
    }
    int GetChangeMessage() const { return mChangeMessage; }

private:
    int mChangeMessage;
};

}  // namespace tolmoui
