#include "support/TesselScriptedExtension.h"

#include "foundation/core/Threads.h"
#include "foundation/tessel/TesselHost.h"

namespace tessel {

ScriptedExtension::ScriptedExtension(const std::string& id, const ExtensionScript& script) : mId(id), mScript(script) {}

boost::shared_ptr<ScriptedExtension> ScriptedExtension::Register(const std::string& id, const ExtensionScript& script)
{
    const boost::shared_ptr<ScriptedExtension> extension(new ScriptedExtension(id, script));
    TesselHost::Get().Register(extension);
    return extension;
}

void ScriptedExtension::SendReady()
{
    if (!mScript.mReadyEventType.empty()) Send(mScript.mReadyEventType, boost::none);
}

void ScriptedExtension::Send(const std::string& type, const boost::optional<std::string>& data)
{
    const OwnedEvent event(type, 1, boost::none, mId, data);
    TesselHost::Get().Post([event] { TesselHost::Get().Deliver(event); });
}

void ScriptedExtension::ReleaseUnloaded()
{
    int held = 0;
    {
        std::lock_guard<std::mutex> lock(mMutex);
        std::swap(held, mHeldUnloads);
    }
    for (int i = 0; i < held; ++i) Ended();
}

std::vector<OwnedEvent> ScriptedExtension::Initializations() const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mInitializations;
}

boost::optional<OwnedEvent> ScriptedExtension::WaitForInitialization(int count, int milliseconds) const
{
    std::unique_lock<std::mutex> lock(mMutex);
    const bool came = mChanged.wait_for(lock, std::chrono::milliseconds(milliseconds),
                                        [&] { return int(mInitializations.size()) >= count; });
    if (!came || count < 1) return boost::none;
    return mInitializations[count - 1];
}

int ScriptedExtension::Loads() const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mLoads;
}

int ScriptedExtension::Unloads() const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mUnloads;
}

bool ScriptedExtension::WaitForUnloads(int count, int milliseconds) const
{
    std::unique_lock<std::mutex> lock(mMutex);
    return mChanged.wait_for(lock, std::chrono::milliseconds(milliseconds), [&] { return mUnloads >= count; });
}

bool ScriptedExtension::WaitForUnloadedEvents(int count, int milliseconds) const
{
    std::unique_lock<std::mutex> lock(mMutex);
    return mChanged.wait_for(lock, std::chrono::milliseconds(milliseconds), [&] { return mUnloadedEvents >= count; });
}

void ScriptedExtension::OnLoad()
{
    {
        std::lock_guard<std::mutex> lock(mMutex);
        ++mLoads;
    }
    mChanged.notify_all();
    if (mScript.mReadyOnLoad) SendReady();
}

void ScriptedExtension::OnUnload()
{
    // Ended first, so that a test woken by the count finds the event queued.
    if (!mScript.mHoldUnloaded) Ended();
    {
        std::lock_guard<std::mutex> lock(mMutex);
        ++mUnloads;
        if (mScript.mHoldUnloaded) ++mHeldUnloads;
    }
    mChanged.notify_all();
}

void ScriptedExtension::Ended()
{
    const boost::shared_ptr<ScriptedExtension> self = shared_from_this();
    TesselHost::Get().Ended(mId, mScript.mUnloadDelay, [self] {
        {
            std::lock_guard<std::mutex> lock(self->mMutex);
            ++self->mUnloadedEvents;
        }
        self->mChanged.notify_all();
    });
}

void ScriptedExtension::OnEvent(const OwnedEvent& event)
{
    if (event.Type() != mScript.mInitializationEventType) return;
    // The answer is queued before the test can see the initialisation.
    if (mScript.mAnswerData) Send(mScript.mAnswerEventType, mScript.mAnswerData);
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mInitializations.push_back(event);
    }
    mChanged.notify_all();
}

void SendHostEvent(const std::string& type, const boost::optional<std::string>& data)
{
    const OwnedEvent event(type, 1, boost::none, boost::none, data);
    TesselHost::Get().Post([event] { TesselHost::Get().Deliver(event); });
}

bool FlushHost(int milliseconds)
{
    // Tasks due at once run in the order posted: this one runs after them.
    if (TesselHost::Get().OnHostThread()) return false;
    const boost::shared_ptr<tolmocore::threads::Gate> ran(new tolmocore::threads::Gate(false));
    TesselHost::Get().Post([ran] { ran->Open(); });
    return ran->PassThrough(milliseconds);
}

void UnregisterExtension(const std::string& id)
{
    TesselHost::Get().Unregister(id);
}

}  // namespace tessel
