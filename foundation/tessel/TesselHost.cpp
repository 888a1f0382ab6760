#include "foundation/tessel/TesselHost.h"

#include <exception>

#include "foundation/core/Trace.h"

namespace ruvex {
namespace event {

const char* const EVENT_TYPE_RUVEX_EXTENSION_UNLOADED = "com.halvane.ruvex.events.ExtensionUnloaded";

}  // namespace event
}  // namespace ruvex

namespace tessel {

namespace {

// Stops the host's thread at exit while the host itself stays, so that calls
// from destructors of process-wide objects that run later find it.
struct StopAtExit {
    ~StopAtExit() { TesselHost::Get().Stop(); }
};

}  // namespace

OwnedEvent::OwnedEvent(const ruvex::event::Event& event) : mType(event.type ? event.type : ""), mScope(event.scope)
{
    if (event.appId) mAppId = std::string(event.appId);
    if (event.extensionId) mExtensionId = std::string(event.extensionId);
    if (event.data) mData = std::string(event.data);
}

OwnedEvent::OwnedEvent(const std::string& type, int scope, const boost::optional<std::string>& appId,
                       const boost::optional<std::string>& extensionId, const boost::optional<std::string>& data)
    : mType(type), mScope(scope), mAppId(appId), mExtensionId(extensionId), mData(data)
{
}

ruvex::event::Event OwnedEvent::View() const
{
    return ruvex::event::Event{mType.c_str(), mScope, mAppId ? mAppId->c_str() : nullptr,
                               mExtensionId ? mExtensionId->c_str() : nullptr, mData ? mData->c_str() : nullptr};
}

TesselHost& TesselHost::Get()
{
    static TesselHost* host = new TesselHost();
    static StopAtExit stopAtExit;
    return *host;
}

TesselHost::TesselHost() = default;

void TesselHost::Start()
{
    if (mThread.joinable() || mStopping) return;
    mThread = std::thread([this] { Run(); });
    mThreadId = mThread.get_id();
}

void TesselHost::Stop()
{
    std::thread thread;
    std::map<Due, Task> dropped;  // destroyed unlocked: what they hold may call back in
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mStopping = true;
        dropped.swap(mTasks);
        thread.swap(mThread);
    }
    mWake.notify_all();
    if (thread.joinable() && thread.get_id() != std::this_thread::get_id()) thread.join();
    if (thread.joinable()) thread.detach();
}

void TesselHost::Post(Task task, std::chrono::milliseconds delay)
{
    {
        std::lock_guard<std::mutex> lock(mMutex);
        if (mStopping) return;
        Start();
        mTasks.emplace(Due(std::chrono::steady_clock::now() + delay, mNextSequence++), std::move(task));
    }
    mWake.notify_all();
}

void TesselHost::Run()
{
    std::unique_lock<std::mutex> lock(mMutex);
    while (!mStopping) {
        if (mTasks.empty()) {
            mWake.wait(lock);
            continue;
        }
        const auto first = mTasks.begin();
        if (first->first.first > std::chrono::steady_clock::now()) {
            mWake.wait_until(lock, first->first.first);
            continue;
        }
        Task task = std::move(first->second);
        mTasks.erase(first);
        lock.unlock();
        // A failing listener or extension must not take the host down with it.
        try {
            task();
        } catch (const std::exception& e) {
            TOLMO_TRACE("tolmonetsync", 1, "Tessel host: a task failed: " << e.what());
        } catch (...) {
            TOLMO_TRACE("tolmonetsync", 1, "Tessel host: a task failed");
        }
        task = Task();  // what the task held goes before the lock is taken again
        lock.lock();
    }
}

bool TesselHost::OnHostThread() const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mThread.joinable() && std::this_thread::get_id() == mThreadId;
}

boost::shared_ptr<TesselExtension> TesselHost::Find(const std::string& extensionId)
{
    std::lock_guard<std::mutex> lock(mMutex);
    const auto found = mExtensions.find(extensionId);
    return found == mExtensions.end() ? boost::shared_ptr<TesselExtension>() : found->second;
}

int TesselHost::Load(const std::string& extensionId)
{
    const boost::shared_ptr<TesselExtension> extension = Find(extensionId);
    if (!extension) return kTesselErrorUnknownExtension;
    {
        std::lock_guard<std::mutex> lock(mMutex);
        // Loading a loaded extension keeps the one that runs.
        if (!mLoaded.insert(extensionId).second) return kTesselOK;
    }
    Post([extension] { extension->OnLoad(); });
    return kTesselOK;
}

int TesselHost::Unload(const std::string& extensionId)
{
    const boost::shared_ptr<TesselExtension> extension = Find(extensionId);
    if (!extension) return kTesselErrorUnknownExtension;
    {
        std::lock_guard<std::mutex> lock(mMutex);
        if (mLoaded.erase(extensionId) == 0) return kTesselErrorNotLoaded;
    }
    Post([extension] { extension->OnUnload(); });
    return kTesselOK;
}

void TesselHost::Ended(const std::string& extensionId, std::chrono::milliseconds delay, const Task& delivered)
{
    const OwnedEvent unloaded(ruvex::event::EVENT_TYPE_RUVEX_EXTENSION_UNLOADED, 1, boost::none, extensionId,
                              "<ExtensionUnloaded><Id>" + extensionId + "</Id></ExtensionUnloaded>");
    Post(
        [this, unloaded, delivered] {
            Deliver(unloaded);
            if (delivered) delivered();
        },
        delay);
}

int TesselHost::Dispatch(const OwnedEvent& event)
{
    Post([this, event] {
        std::vector<boost::shared_ptr<TesselExtension> > receivers;
        {
            std::lock_guard<std::mutex> lock(mMutex);
            for (const auto& entry : mExtensions) {
                const bool named = !event.ExtensionId() || *event.ExtensionId() == entry.first;
                if (named && mLoaded.count(entry.first) != 0) receivers.push_back(entry.second);
            }
        }
        for (const auto& extension : receivers) extension->OnEvent(event);
        Deliver(event);
    });
    return kTesselOK;
}

int TesselHost::AddListener(const std::string& type, TesselEventListener listener, void* context)
{
    std::lock_guard<std::mutex> lock(mMutex);
    mListeners.push_back(Listener{type, listener, context});
    return kTesselOK;
}

int TesselHost::RemoveListener(const std::string& type, TesselEventListener listener, void* context)
{
    std::lock_guard<std::mutex> lock(mMutex);
    for (auto it = mListeners.begin(); it != mListeners.end(); ++it) {
        if (*it == Listener{type, listener, context}) {
            mListeners.erase(it);
            return kTesselOK;
        }
    }
    return kTesselErrorNotFound;
}

void TesselHost::Deliver(const OwnedEvent& event)
{
    std::vector<Listener> matching;
    {
        std::lock_guard<std::mutex> lock(mMutex);
        for (const Listener& listener : mListeners)
            if (listener.mType == event.Type()) matching.push_back(listener);
    }
    const ruvex::event::Event record = event.View();
    for (const Listener& listener : matching) {
        {
            std::lock_guard<std::mutex> lock(mMutex);
            bool present = false;
            for (const Listener& now : mListeners) present = present || now == listener;
            if (!present) continue;
        }
        listener.mFunction(&record, listener.mContext);
    }
}

void TesselHost::Register(const boost::shared_ptr<TesselExtension>& extension)
{
    std::lock_guard<std::mutex> lock(mMutex);
    mExtensions[extension->Id()] = extension;
}

void TesselHost::Unregister(const std::string& extensionId)
{
    std::lock_guard<std::mutex> lock(mMutex);
    mExtensions.erase(extensionId);
    mLoaded.erase(extensionId);
}

}  // namespace tessel
