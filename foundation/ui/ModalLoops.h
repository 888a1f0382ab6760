#pragma once
// The process-wide register of running modal loops, behind OS_Dialog and
// UI_Automation.h. One mutex guards the register, the queues of posted
// actions and each window's close flag; one condition variable wakes both
// the loops and the threads that wait on them.

#include <boost/function.hpp>
#include <boost/intrusive_ptr.hpp>

namespace tolmoui {

class OS_Dialog;
class UI_Dialog;

class ModalLoops {
public:
    static int Run(OS_Dialog& dialog);
    static void PostClose(OS_Dialog& dialog);
    static bool IsInLoop(const OS_Dialog& dialog);
    static boost::intrusive_ptr<UI_Dialog> WaitForDialog(int milliseconds);
    static bool RunAction(const boost::function<void()>& action, int milliseconds);
    static int Depth();
    static bool WaitForDepth(int depth, int milliseconds);
};

}  // namespace tolmoui
