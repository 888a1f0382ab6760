#pragma once
// Extensions for tests of code that talks to the extension host: each follows
// a script, and the test reads what it was sent and steers what it sends.
//
// A test registers one under its identifier, and the code under test loads
// it with TesselLoadExtension. Every event the extension sends goes out on
// the host's thread, after the call that caused it has returned. Members for
// the test may be used from any thread.

#include <atomic>
#include <string>

#include <boost/enable_shared_from_this.hpp>
#include <boost/optional.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/tessel/TesselExtension.h"
#include "support/CallRecorder.h"

namespace tessel {

struct ExtensionScript {
    // Sent once the extension has loaded; empty: nothing.
    std::string mReadyEventType;
    // False: the ready event waits for SendReady, for a test that must first
    // finish something the event's listener counts on.
    bool mReadyOnLoad = true;
    // The event the extension answers, and its answer: an event of
    // mAnswerEventType carrying mAnswerData, or nothing if that is unset.
    std::string mInitializationEventType;
    std::string mAnswerEventType;
    boost::optional<std::string> mAnswerData;
    // The extension ends, and the host sends its unloaded event, only on ReleaseUnloaded.
    bool mHoldUnloaded = false;
};

class ScriptedExtension : public TesselExtension, public boost::enable_shared_from_this<ScriptedExtension> {
public:
    // Makes one and registers it with the host, replacing any of its id.
    static boost::shared_ptr<ScriptedExtension> Register(const std::string& id, const ExtensionScript& script);

    // Sends the ready event of the script (meant for mReadyOnLoad false).
    void SendReady();
    // Lets the held unloads end.
    void ReleaseUnloaded();

    // Every initialisation event received, in order. Its answer, if any, is
    // already on its way when it is recorded: a FlushHost after the wait sees it delivered.
    const testsupport::CallRecorder<OwnedEvent> mInitializations;
    const testsupport::CallRecorder<bool> mLoads;
    const testsupport::CallRecorder<bool> mUnloads;
    // The unloaded events the host has delivered to every listener.
    const testsupport::CallRecorder<bool> mUnloadedEvents;

    const std::string& Id() const override { return mId; }
    void OnLoad() override;
    void OnUnload() override;
    void OnEvent(const OwnedEvent& event) override;

private:
    ScriptedExtension(const std::string& id, const ExtensionScript& script) : mId(id), mScript(script) {}
    void Send(const std::string& type, const boost::optional<std::string>& data);
    void Ended();

    const std::string mId;
    const ExtensionScript mScript;
    std::atomic<int> mHeldUnloads{0};
};

// Sends an event as the host itself would, to the listeners of its type.
void SendHostEvent(const std::string& type, const boost::optional<std::string>& data);
// Waits until the host's thread has run everything due now; false after 30 s.
bool FlushHost();

}  // namespace tessel
