#include "foundation/ui/ModalLoops.h"

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <deque>
#include <memory>
#include <mutex>
#include <thread>
#include <vector>

#include "foundation/ui/UI_Dialog.h"

namespace tolmoui {

namespace {

struct Frame;

struct PostedAction {
    enum State { Waiting, Running, Done, Dropped };
    boost::function<void()> action;
    State state = Waiting;
    Frame* frame = nullptr;  // valid while Waiting
};

struct Frame {
    OS_Dialog* dialog;
    std::thread::id thread;
    std::deque<std::shared_ptr<PostedAction>> queue;
};

struct Register {
    std::mutex mutex;
    std::condition_variable changed;
    std::vector<Frame*> frames;  // innermost last
};

Register& TheRegister()
{
    static Register sRegister;
    return sRegister;
}

using Clock = std::chrono::steady_clock;

Clock::time_point DeadlineAfter(int milliseconds)
{
    return milliseconds < 0 ? Clock::time_point::max() : Clock::now() + std::chrono::milliseconds(milliseconds);
}

// Waits for `ready` until `deadline`; time_point::max() waits without limit
// (wait_until would overflow on it).
template <class Predicate>
bool WaitUntil(std::unique_lock<std::mutex>& lock, Clock::time_point deadline, Predicate ready)
{
    Register& reg = TheRegister();
    if (deadline == Clock::time_point::max()) {
        reg.changed.wait(lock, ready);
        return true;
    }
    return reg.changed.wait_until(lock, deadline, ready);
}

}  // namespace

int ModalLoops::Run(OS_Dialog& dialog)
{
    dialog.UI_PrepareModal();
    Register& reg = TheRegister();
    Frame frame{&dialog, std::this_thread::get_id(), {}};
    std::unique_lock<std::mutex> lock(reg.mutex);
    ++dialog.mLoopDepth;
    reg.frames.push_back(&frame);
    reg.changed.notify_all();
    for (;;) {
        reg.changed.wait(lock, [&] { return !frame.queue.empty() || dialog.mClosePosted; });
        if (frame.queue.empty()) break;
        std::shared_ptr<PostedAction> posted = frame.queue.front();
        frame.queue.pop_front();
        posted->state = PostedAction::Running;
        posted->frame = nullptr;
        lock.unlock();
        posted->action();
        lock.lock();
        posted->state = PostedAction::Done;
        reg.changed.notify_all();
    }
    dialog.mClosePosted = false;
    --dialog.mLoopDepth;
    for (const auto& posted : frame.queue) {
        posted->state = PostedAction::Dropped;
        posted->frame = nullptr;
    }
    reg.frames.erase(std::find(reg.frames.begin(), reg.frames.end(), &frame));
    reg.changed.notify_all();
    lock.unlock();
    dialog.UI_Show(false);
    return dialog.GetResponse();
}

void ModalLoops::PostClose(OS_Dialog& dialog)
{
    Register& reg = TheRegister();
    std::lock_guard<std::mutex> lock(reg.mutex);
    dialog.mClosePosted = true;
    reg.changed.notify_all();
}

bool ModalLoops::IsInLoop(const OS_Dialog& dialog)
{
    Register& reg = TheRegister();
    std::lock_guard<std::mutex> lock(reg.mutex);
    return dialog.mLoopDepth > 0;
}

boost::intrusive_ptr<UI_Dialog> ModalLoops::WaitForDialog(int milliseconds)
{
    Register& reg = TheRegister();
    std::unique_lock<std::mutex> lock(reg.mutex);
    UI_Dialog* found = nullptr;
    // A loop whose close is posted is ending: a test waiting for the next
    // dialog must not get the one it has just closed.
    auto open = [&] {
        for (auto it = reg.frames.rbegin(); it != reg.frames.rend(); ++it) {
            if ((*it)->dialog->mClosePosted) continue;
            found = dynamic_cast<UI_Dialog*>((*it)->dialog);
            return found != nullptr;
        }
        return false;
    };
    if (!WaitUntil(lock, DeadlineAfter(milliseconds), open)) return nullptr;
    return boost::intrusive_ptr<UI_Dialog>(found);
}

bool ModalLoops::RunAction(const boost::function<void()>& action, int milliseconds)
{
    Register& reg = TheRegister();
    std::unique_lock<std::mutex> lock(reg.mutex);
    if (!reg.frames.empty() && reg.frames.back()->thread == std::this_thread::get_id()) {
        lock.unlock();
        action();
        return true;
    }
    const Clock::time_point deadline = DeadlineAfter(milliseconds);
    if (!WaitUntil(lock, deadline, [&] { return !reg.frames.empty(); })) return false;
    auto posted = std::make_shared<PostedAction>();
    posted->action = action;
    posted->frame = reg.frames.back();
    posted->frame->queue.push_back(posted);
    reg.changed.notify_all();
    const auto finished = [&] { return posted->state == PostedAction::Done || posted->state == PostedAction::Dropped; };
    if (!WaitUntil(lock, deadline, [&] { return finished() || posted->state == PostedAction::Running; })) {
        // Not started in time: take it back so that it never runs.
        auto& queue = posted->frame->queue;
        queue.erase(std::find(queue.begin(), queue.end(), posted));
        return false;
    }
    reg.changed.wait(lock, finished);
    return posted->state == PostedAction::Done;
}

int ModalLoops::Depth()
{
    Register& reg = TheRegister();
    std::lock_guard<std::mutex> lock(reg.mutex);
    return static_cast<int>(reg.frames.size());
}

bool ModalLoops::WaitForDepth(int depth, int milliseconds)
{
    Register& reg = TheRegister();
    std::unique_lock<std::mutex> lock(reg.mutex);
    return WaitUntil(lock, DeadlineAfter(milliseconds), [&] { return static_cast<int>(reg.frames.size()) >= depth; });
}

}  // namespace tolmoui
