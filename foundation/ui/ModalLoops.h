#pragma once
// The process-wide register of running modal loops, behind OS_Dialog. One
// mutex guards the register, the queues of posted tasks and each window's
// close flag; one condition variable wakes the loops.

#include <boost/function.hpp>

namespace tolmoui {

class OS_Dialog;

enum ModalLoopEvent {
    ModalLoopEvent_Started,  // on the loop's thread, before its first task
    ModalLoopEvent_Closing,  // on the thread of PostClose, once per posted close
    ModalLoopEvent_Ended,    // on the loop's thread, after its last task
};

class ModalLoops {
public:
    static int Run(OS_Dialog& dialog);
    static void PostClose(OS_Dialog& dialog);
    static bool IsInLoop(const OS_Dialog& dialog);

    // Hands `task` to the innermost modal loop of `dialog`: it runs on the
    // loop's thread, inside the loop, after the tasks posted before it; this
    // is how another thread reaches a window. Tasks posted before the loop
    // sees its close still run. False if `dialog` runs no loop; the task then
    // never runs. Any thread. A task must not throw.
    static bool Post(OS_Dialog& dialog, const boost::function<void()>& task);

    // One observer of every loop of the process, for accessibility and
    // automation layers that must know which window is modal. Called without
    // the register's lock held, so it may call Post and PostClose. An empty
    // function removes it. Any thread; set it while no loop runs.
    using Observer = boost::function<void(OS_Dialog& dialog, ModalLoopEvent event)>;
    static void SetObserver(const Observer& observer);
};

}  // namespace tolmoui
