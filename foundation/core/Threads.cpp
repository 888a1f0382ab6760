#include "foundation/core/Threads.h"

#include "foundation/core/Trace.h"

namespace tolmocore {
namespace threads {

unsigned long GetCurrentThreadID() { return debug::GetCurrentThreadIDForTrace(); }

void RecursiveMutex::Lock(const char*) const { mMutex.lock(); }

void RecursiveMutex::Unlock() const { mMutex.unlock(); }

Gate::Gate(bool open) : mOpen(open) {}

void Gate::Open()
{
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mOpen = true;
    }
    mOpened.notify_all();
}

bool Gate::PassThrough(int milliseconds)
{
    std::unique_lock<std::mutex> lock(mMutex);
    if (milliseconds < 0) {
        mOpened.wait(lock, [this] { return mOpen; });
        return true;
    }
    return mOpened.wait_for(lock, std::chrono::milliseconds(milliseconds), [this] { return mOpen; });
}

OpenOnceGate::OpenOnceGate() : mGate(new Gate(false)), mWeakGate(mGate) {}

void OpenOnceGate::Open()
{
    boost::shared_ptr<Gate> gate;
    {
        std::lock_guard<std::mutex> lock(mMutex);
        gate.swap(mGate);
    }
    if (gate) gate->Open();
}

bool OpenOnceGate::PassThrough(int milliseconds)
{
    boost::shared_ptr<Gate> gate = mWeakGate.lock();
    if (!gate) return true;
    return gate->PassThrough(milliseconds);
}

}  // namespace threads
}  // namespace tolmocore
