#pragma once
// Extensions for tests of code that talks to the extension host: each follows
// a script, and the test reads what it was sent and steers what it sends.
//
// A test makes one, registers it under its identifier, and the code under
// test loads it with TesselLoadExtension. Every event the extension sends
// goes out on the host's thread, after the call that caused it has returned.
// Members for the test may be called from any thread.

#include <chrono>
#include <condition_variable>
#include <mutex>
#include <string>
#include <vector>

#include <boost/enable_shared_from_this.hpp>
#include <boost/optional.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/tessel/TesselExtension.h"

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
    // How long the extension takes to end once unloaded, until the host's
    // unloaded event; with mHoldUnloaded it ends only on ReleaseUnloaded.
    std::chrono::milliseconds mUnloadDelay{0};
    bool mHoldUnloaded = false;
};

class ScriptedExtension : public TesselExtension, public boost::enable_shared_from_this<ScriptedExtension> {
public:
    ScriptedExtension(const std::string& id, const ExtensionScript& script);

    // Makes one and registers it with the host, replacing any of its id.
    static boost::shared_ptr<ScriptedExtension> Register(const std::string& id, const ExtensionScript& script);

    // Sends the ready event of the script (meant for mReadyOnLoad false).
    void SendReady();
    // Sends an event of its own, as the page inside it would.
    void Send(const std::string& type, const boost::optional<std::string>& data);
    // Lets a held unload finish: the unloaded event follows after the delay.
    void ReleaseUnloaded();

    // Every initialisation event received, in order.
    std::vector<OwnedEvent> Initializations() const;
    // Waits for the count-th initialisation event; none on time-out. Its
    // answer, if any, is already on its way: a FlushHost after this returns
    // sees it delivered.
    boost::optional<OwnedEvent> WaitForInitialization(int count, int milliseconds) const;
    int Loads() const;
    int Unloads() const;
    // Waits until the extension has been unloaded `count` times; false on time-out.
    bool WaitForUnloads(int count, int milliseconds) const;
    // Waits until the host has delivered `count` unloaded events for the
    // extension to every listener; false on time-out.
    bool WaitForUnloadedEvents(int count, int milliseconds) const;

    const std::string& Id() const override { return mId; }
    void OnLoad() override;
    void OnUnload() override;
    void OnEvent(const OwnedEvent& event) override;

private:
    void Ended();

    const std::string mId;
    const ExtensionScript mScript;
    mutable std::mutex mMutex;  // guards the fields below
    mutable std::condition_variable mChanged;
    std::vector<OwnedEvent> mInitializations;
    int mLoads = 0;
    int mUnloadedEvents = 0;
    int mUnloads = 0;
    int mHeldUnloads = 0;
};

// Sends an event as the host itself would, to the listeners of its type.
void SendHostEvent(const std::string& type, const boost::optional<std::string>& data);
// Waits until the host's thread has run everything due now; false on time-out.
bool FlushHost(int milliseconds);
// Forgets the extension of this identifier.
void UnregisterExtension(const std::string& id);

}  // namespace tessel
