#include "support/UI_Automation.h"

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <set>
#include <vector>

#include "foundation/ui/ModalLoops.h"

namespace tolmoui {

namespace {

struct LoopFrame {
    OS_Dialog* dialog;
    bool closing;
};

// What the observer has seen of the running loops; innermost last.
struct Tracker {
    std::mutex mutex;
    std::condition_variable changed;
    std::vector<LoopFrame> frames;
    std::set<OS_Dialog*> closedBeforeLoop;  // a PostClose that ends the next loop at once
};

Tracker& TheTracker()
{
    static Tracker sTracker;
    return sTracker;
}

void Observe(OS_Dialog& dialog, ModalLoopEvent event)
{
    Tracker& tracker = TheTracker();
    std::lock_guard<std::mutex> lock(tracker.mutex);
    const auto frame = std::find_if(tracker.frames.rbegin(), tracker.frames.rend(),
                                    [&](const LoopFrame& frame) { return frame.dialog == &dialog; });
    switch (event) {
        case ModalLoopEvent_Started:
            tracker.frames.push_back({&dialog, tracker.closedBeforeLoop.erase(&dialog) > 0});
            break;
        case ModalLoopEvent_Closing:
            if (frame == tracker.frames.rend())
                tracker.closedBeforeLoop.insert(&dialog);
            else
                frame->closing = true;
            break;
        case ModalLoopEvent_Ended:
            if (frame != tracker.frames.rend()) tracker.frames.erase(std::next(frame).base());
            break;
    }
    tracker.changed.notify_all();
}

// Installed before main, so that no loop of a test starts unseen.
const bool sObserving = (ModalLoops::SetObserver(&Observe), true);

template <class Predicate>
bool WaitFor(std::unique_lock<std::mutex>& lock, Predicate ready)
{
    return TheTracker().changed.wait_for(lock, std::chrono::seconds(30), ready);
}

struct PostedAction {
    enum State { Waiting, Running, Done, Withdrawn };
    State state = Waiting;
};

}  // namespace

boost::intrusive_ptr<UI_Dialog> WaitForModalDialog()
{
    (void)sObserving;
    Tracker& tracker = TheTracker();
    std::unique_lock<std::mutex> lock(tracker.mutex);
    UI_Dialog* found = nullptr;
    // A loop whose close is posted is ending: a test waiting for the next
    // dialog must not get the one it has just closed.
    auto open = [&] {
        const auto frame = std::find_if(tracker.frames.rbegin(), tracker.frames.rend(),
                                        [](const LoopFrame& frame) { return !frame.closing; });
        found = frame != tracker.frames.rend() ? dynamic_cast<UI_Dialog*>(frame->dialog) : nullptr;
        return found != nullptr;
    };
    if (!WaitFor(lock, open)) return nullptr;
    return boost::intrusive_ptr<UI_Dialog>(found);
}

bool RunInModalLoop(const boost::function<void()>& action)
{
    Tracker& tracker = TheTracker();
    std::unique_lock<std::mutex> lock(tracker.mutex);
    if (!WaitFor(lock, [&] { return !tracker.frames.empty(); })) return false;
    const auto posted = std::make_shared<PostedAction>();
    const bool taken = ModalLoops::Post(*tracker.frames.back().dialog, [posted, action] {
        Tracker& tracker = TheTracker();
        {
            std::lock_guard<std::mutex> lock(tracker.mutex);
            if (posted->state == PostedAction::Withdrawn) return;
            posted->state = PostedAction::Running;
        }
        action();
        std::lock_guard<std::mutex> lock(tracker.mutex);
        posted->state = PostedAction::Done;
        tracker.changed.notify_all();
    });
    if (!taken) return false;
    if (!WaitFor(lock, [&] { return posted->state != PostedAction::Waiting; })) {
        // Not started in time: withdrawn, so that it never runs.
        posted->state = PostedAction::Withdrawn;
        return false;
    }
    tracker.changed.wait(lock, [&] { return posted->state == PostedAction::Done; });
    return true;
}

bool WaitForModalLoopDepth(int depth)
{
    Tracker& tracker = TheTracker();
    std::unique_lock<std::mutex> lock(tracker.mutex);
    return WaitFor(lock, [&] { return static_cast<int>(tracker.frames.size()) >= depth; });
}

bool SimulateTyping(UI_TextEdit& edit, const UTF16String& newValue)
{
    if (edit.IsDisabled()) return false;
    edit.SetValue(newValue, false);
    return edit.HandleUserChange(kInteractiveChange_Edit);
}

}  // namespace tolmoui
