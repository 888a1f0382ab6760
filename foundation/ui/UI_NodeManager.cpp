#include "foundation/ui/UI_NodeManager.h"

#include <mutex>

namespace tolmoui {

namespace {

std::mutex sModalMutex;  // guards the two below
UI_Node* sModalWindow = nullptr;
int sModalScopeDepth = 0;

}  // namespace

UI_NodeManager::SetModalWindow::SetModalWindow(UI_Node* window)
{
    std::lock_guard<std::mutex> lock(sModalMutex);
    mPrevious = sModalWindow;
    sModalWindow = window;
    ++sModalScopeDepth;
}

UI_NodeManager::SetModalWindow::~SetModalWindow()
{
    std::lock_guard<std::mutex> lock(sModalMutex);
    sModalWindow = mPrevious;
    --sModalScopeDepth;
}

UI_Node* UI_NodeManager::GetModalWindow()
{
    std::lock_guard<std::mutex> lock(sModalMutex);
    return sModalWindow;
}

int UI_NodeManager::GetModalScopeDepth()
{
    std::lock_guard<std::mutex> lock(sModalMutex);
    return sModalScopeDepth;
}

}  // namespace tolmoui
