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

    // A disabled control takes no user input: presses, typing and clicks
    // simulated on it do nothing.
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

    // Automation: sends an interactive change with `changeMessage` (0 for one
    // that changes nothing) and then the plain change. A disabled control
    // takes no input: false, and nothing is sent. On the UI thread.
    bool SimulateInteractiveChange(int changeMessage);

private:
    std::vector<InteractiveChangeHandler> mInteractiveHandlers;
};

}  // namespace tolmoui
