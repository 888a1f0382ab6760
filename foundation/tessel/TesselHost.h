#pragma once
// The in-process extension host behind the C interface of Tessel.h: one
// thread that runs queued tasks in the order of their due time, the table of
// listeners, and the extensions known by identifier.
//
// Made on first use and never destroyed, so that late calls at process exit
// (a listener removed by a destructor of a process-wide object) stay safe;
// its thread is stopped and joined at exit, and tasks still queued then are
// dropped.

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <functional>
#include <map>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include <boost/shared_ptr.hpp>

#include "foundation/tessel/Tessel.h"
#include "foundation/tessel/TesselExtension.h"

namespace tessel {

class TesselHost {
public:
    static TesselHost& Get();

    using Task = std::function<void()>;
    // Runs `task` on the host's thread once `delay` has passed; tasks due at
    // the same time run in the order posted. Any thread.
    void Post(Task task, std::chrono::milliseconds delay = std::chrono::milliseconds(0));
    bool OnHostThread() const;

    int Load(const std::string& extensionId);
    int Unload(const std::string& extensionId);
    int Dispatch(const OwnedEvent& event);
    int AddListener(const std::string& type, TesselEventListener listener, void* context);
    int RemoveListener(const std::string& type, TesselEventListener listener, void* context);

    // Sends EVENT_TYPE_RUVEX_EXTENSION_UNLOADED for the extension after
    // `delay`, as the host does when an extension has ended, and then calls
    // `delivered` (may be empty) on its thread. Any thread.
    void Ended(const std::string& extensionId, std::chrono::milliseconds delay, const Task& delivered);

    // Replaces an extension of the same identifier. A registered extension
    // is loaded by Load.
    void Register(const boost::shared_ptr<TesselExtension>& extension);
    void Unregister(const std::string& extensionId);

    // Calls the listeners of the event's type; host's thread only. A listener
    // removed while the event is on its way is not called.
    void Deliver(const OwnedEvent& event);

    // Ends the thread; later tasks are dropped. Called at exit.
    void Stop();

private:
    TesselHost();
    void Run();
    void Start();  // with mMutex held
    boost::shared_ptr<TesselExtension> Find(const std::string& extensionId);

    struct Listener {
        std::string mType;
        TesselEventListener mFunction;
        void* mContext;
        bool operator==(const Listener& other) const
        {
            return mType == other.mType && mFunction == other.mFunction && mContext == other.mContext;
        }
    };
    using Due = std::pair<std::chrono::steady_clock::time_point, std::uint64_t>;

    mutable std::mutex mMutex;  // guards everything below
    std::condition_variable mWake;
    std::map<Due, Task> mTasks;
    std::uint64_t mNextSequence = 0;
    bool mStopping = false;
    std::thread mThread;
    std::thread::id mThreadId;
    std::vector<Listener> mListeners;
    std::map<std::string, boost::shared_ptr<TesselExtension> > mExtensions;
    std::set<std::string> mLoaded;
};

}  // namespace tessel
