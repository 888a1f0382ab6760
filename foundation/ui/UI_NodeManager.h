#pragma once
// Process-wide state of the node tree: which window is modal.

#include <boost/noncopyable.hpp>

#include "foundation/ui/UI_Node.h"

namespace tolmoui {

class UI_NodeManager {
public:
    // Makes `window` (may be null: the application's frontmost window) the
    // modal window for the scope's lifetime; the destructor restores the one
    // before. Scopes nest. On the UI thread.
    class SetModalWindow : boost::noncopyable {
    public:
        explicit SetModalWindow(UI_Node* window);
        ~SetModalWindow();

    private:
        UI_Node* mPrevious;
    };

    // Any thread.
    static UI_Node* GetModalWindow();
    // How many SetModalWindow scopes are open.
    static int GetModalScopeDepth();
};

}  // namespace tolmoui
