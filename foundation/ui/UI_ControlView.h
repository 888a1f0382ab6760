#pragma once
// Controls: nodes with a disabled state that tell listeners of changes.
// Handlers run on the UI thread, synchronously, in the order they were added;
// they may change the control (but not add handlers to it) while running.

#include <vector>

#include <boost/function.hpp>

#include "foundation/ui/UI_Messages.h"
#include "foundation/ui/UI_Node.h"

namespace tolmoui {

class UI_ControlView : public UI_Node {
public:
    using ChangeHandler = boost::function<void(const UI_ControlMessage*)>;

    // A disabled control takes no user input (HandleUserChange refuses it).
    void SetDisabled(bool disabled) { mDisabled = disabled; }
    bool IsDisabled() const { return mDisabled; }

    // Adds a handler for every change of the control's value or state.
    void NotifyWhenChanged(const ChangeHandler& handler) { mChangeHandlers.push_back(handler); }

protected:
    // Tells the change handlers.
    void SendChanged();

private:
    bool mDisabled = false;
    std::vector<ChangeHandler> mChangeHandlers;
};

class UI_InteractiveControlView : public UI_ControlView {
public:
    using InteractiveChangeHandler = boost::function<void(const UI_InteractiveControlChangedMessage*)>;

    // Adds a handler for the changes that come from the user.
    void NotifyWhenChangedInteractively(const InteractiveChangeHandler& handler)
    {
        mInteractiveHandlers.push_back(handler);
    }

    // What the platform control calls when the user changed it: the
    // interactive handlers hear `changeMessage` (0 for a change of nothing),
    // then the plain ones. A disabled control takes no input: false, and
    // nothing is sent. On the UI thread.
    bool HandleUserChange(int changeMessage);

private:
    std::vector<InteractiveChangeHandler> mInteractiveHandlers;
};

}  // namespace tolmoui
