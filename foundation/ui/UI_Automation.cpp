#include "foundation/ui/UI_Automation.h"

#include "foundation/ui/ModalLoops.h"

namespace tolmoui {

boost::intrusive_ptr<UI_Dialog> WaitForModalDialog(int milliseconds)
{
    return ModalLoops::WaitForDialog(milliseconds);
}

bool RunInModalLoop(const boost::function<void()>& action, int milliseconds)
{
    return ModalLoops::RunAction(action, milliseconds);
}

int ModalLoopDepth()
{
    return ModalLoops::Depth();
}

bool WaitForModalLoopDepth(int depth, int milliseconds)
{
    return ModalLoops::WaitForDepth(depth, milliseconds);
}

}  // namespace tolmoui
