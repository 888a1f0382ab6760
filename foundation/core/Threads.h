#pragma once
// Locks and gates shared between threads.

#include <chrono>
#include <condition_variable>
#include <memory>
#include <mutex>

#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>

namespace tolmocore {
namespace threads {

// A number naming the calling thread, for trace lines.
unsigned long GetCurrentThreadID();

// A recursive mutex whose Lock takes a label for diagnostics; the label
// changes nothing about locking.
class RecursiveMutex {
public:
    void Lock(const char* where = nullptr) const;
    void Unlock() const;

private:
    mutable std::recursive_mutex mMutex;
};

// A gate that waiters pass once it is open. Open is final.
class Gate {
public:
    explicit Gate(bool open);
    void Open();
    // Blocks until the gate is open or the time has run out; true if open.
    // -1 waits without limit.
    bool PassThrough(int milliseconds);

private:
    std::mutex mMutex;
    std::condition_variable mOpened;
    bool mOpen;
};

// Lets a synchronous caller wait for one asynchronous completion. The
// completion calls Open(); the waiter calls PassThrough(). The gate lives only
// while someone holds it: after Open() released it, PassThrough is true at once.
// A second Open() does nothing. Any thread.
class OpenOnceGate {
public:
    OpenOnceGate();
    void Open();
    bool PassThrough(int milliseconds);

private:
    std::mutex mMutex;  // guards mGate against two concurrent Open() calls
    boost::shared_ptr<Gate> mGate;
    const boost::weak_ptr<Gate> mWeakGate;
};

}  // namespace threads
}  // namespace tolmocore
