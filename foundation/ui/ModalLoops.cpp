#include "foundation/ui/ModalLoops.h"

#include <algorithm>
#include <condition_variable>
#include <deque>
#include <mutex>
#include <vector>

#include "foundation/ui/UI_Dialog.h"

namespace tolmoui {

namespace {

struct Frame {
    OS_Dialog* dialog;
    std::deque<boost::function<void()>> queue;
};

struct Register {
    std::mutex mutex;
    std::condition_variable changed;
    std::vector<Frame*> frames;  // innermost last
    ModalLoops::Observer observer;
};

Register& TheRegister()
{
    static Register sRegister;
    return sRegister;
}

void Tell(const ModalLoops::Observer& observer, OS_Dialog& dialog, ModalLoopEvent event)
{
    if (observer) observer(dialog, event);
}

}  // namespace

int ModalLoops::Run(OS_Dialog& dialog)
{
    Register& reg = TheRegister();
    Frame frame{&dialog, {}};
    std::unique_lock<std::mutex> lock(reg.mutex);
    ++dialog.mLoopDepth;
    reg.frames.push_back(&frame);
    const Observer observer = reg.observer;
    lock.unlock();
    Tell(observer, dialog, ModalLoopEvent_Started);
    lock.lock();
    for (;;) {
        reg.changed.wait(lock, [&] { return !frame.queue.empty() || dialog.mClosePosted; });
        if (frame.queue.empty()) break;
        const boost::function<void()> task = frame.queue.front();
        frame.queue.pop_front();
        lock.unlock();
        task();
        lock.lock();
    }
    dialog.mClosePosted = false;
    --dialog.mLoopDepth;
    reg.frames.erase(std::find(reg.frames.begin(), reg.frames.end(), &frame));
    lock.unlock();
    dialog.UI_Show(false);
    Tell(observer, dialog, ModalLoopEvent_Ended);
    return dialog.GetResponse();
}

void ModalLoops::PostClose(OS_Dialog& dialog)
{
    Register& reg = TheRegister();
    std::unique_lock<std::mutex> lock(reg.mutex);
    dialog.mClosePosted = true;
    reg.changed.notify_all();
    const Observer observer = reg.observer;
    lock.unlock();
    Tell(observer, dialog, ModalLoopEvent_Closing);
}

bool ModalLoops::IsInLoop(const OS_Dialog& dialog)
{
    Register& reg = TheRegister();
    std::lock_guard<std::mutex> lock(reg.mutex);
    return dialog.mLoopDepth > 0;
}

bool ModalLoops::Post(OS_Dialog& dialog, const boost::function<void()>& task)
{
    Register& reg = TheRegister();
    std::lock_guard<std::mutex> lock(reg.mutex);
    for (auto it = reg.frames.rbegin(); it != reg.frames.rend(); ++it) {
        if ((*it)->dialog != &dialog) continue;
        (*it)->queue.push_back(task);
        reg.changed.notify_all();
        return true;
    }
    return false;
}

void ModalLoops::SetObserver(const Observer& observer)
{
    Register& reg = TheRegister();
    std::lock_guard<std::mutex> lock(reg.mutex);
    reg.observer = observer;
}

}  // namespace tolmoui
