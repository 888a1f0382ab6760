#include "support/TesselScriptedExtension.h"

#include "foundation/core/Threads.h"
#include "foundation/tessel/TesselHost.h"

namespace tessel {

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
    for (int held = mHeldUnloads.exchange(0); held > 0; --held) Ended();
}

void ScriptedExtension::OnLoad()
{
    mLoads.Add(true);
    if (mScript.mReadyOnLoad) SendReady();
}

void ScriptedExtension::OnUnload()
{
    // Ended or held first, so that a test woken by the count finds it so.
    if (mScript.mHoldUnloaded)
        ++mHeldUnloads;
    else
        Ended();
    mUnloads.Add(true);
}

void ScriptedExtension::Ended()
{
    const boost::shared_ptr<ScriptedExtension> self = shared_from_this();
    TesselHost::Get().Ended(mId, std::chrono::milliseconds(0), [self] { self->mUnloadedEvents.Add(true); });
}

void ScriptedExtension::OnEvent(const OwnedEvent& event)
{
    if (event.Type() != mScript.mInitializationEventType) return;
    // The answer is queued before the test can see the initialisation.
    if (mScript.mAnswerData) Send(mScript.mAnswerEventType, mScript.mAnswerData);
    mInitializations.Add(event);
}

void SendHostEvent(const std::string& type, const boost::optional<std::string>& data)
{
    const OwnedEvent event(type, 1, boost::none, boost::none, data);
    TesselHost::Get().Post([event] { TesselHost::Get().Deliver(event); });
}

bool FlushHost()
{
    // Tasks due at once run in the order posted: this one runs after them.
    if (TesselHost::Get().OnHostThread()) return false;
    const boost::shared_ptr<tolmocore::threads::Gate> ran(new tolmocore::threads::Gate(false));
    TesselHost::Get().Post([ran] { ran->Open(); });
    return ran->PassThrough(30000);
}

}  // namespace tessel
