#pragma once
// What the callbacks of SyncServer operations report, gathered for a test to
// wait for (bounded) and look at afterwards.
//
// Make one with ServerOutcome::Make(), hand its On...() callbacks to an
// operation, then Wait(). Callbacks hold the outcome by a shared pointer, so a late one
// never writes into freed memory. Any thread.

#include <chrono>
#include <condition_variable>
#include <mutex>
#include <vector>

#include <boost/enable_shared_from_this.hpp>
#include <boost/make_shared.hpp>
#include <boost/shared_ptr.hpp>

#include "assets/SyncServer.h"
#include "foundation/net/RequestProcessor.h"

namespace testsupport {

// Long enough for a loaded sanitizer build; only a hang ever waits it out.
constexpr std::chrono::seconds kCallbackWaitLimit(20);

class ServerOutcome : public boost::enable_shared_from_this<ServerOutcome> {
public:
    static boost::shared_ptr<ServerOutcome> Make() { return boost::make_shared<ServerOutcome>(); }

    tolmonetsync::SuccessCallback OnSuccess()
    {
        boost::shared_ptr<ServerOutcome> self = Self();
        return [self](const Guid& guid) { self->Record(guid, true, [](ServerOutcome&) {}); };
    }
    tolmonetsync::CollectionCallback OnCollection()
    {
        boost::shared_ptr<ServerOutcome> self = Self();
        return [self](const Guid& guid, const boost::shared_ptr<tolmonetsync::Collection>& collection) {
            self->Record(guid, true, [&](ServerOutcome& o) { o.mCollection = collection; });
        };
    }
    tolmonetsync::AssetCallback OnAsset()
    {
        boost::shared_ptr<ServerOutcome> self = Self();
        return [self](const Guid& guid, const boost::shared_ptr<tolmonetsync::AssetBase>& asset) {
            self->Record(guid, true, [&](ServerOutcome& o) { o.mAsset = asset; });
        };
    }
    tolmonetsync::AssetsCallback OnAssets()
    {
        boost::shared_ptr<ServerOutcome> self = Self();
        return [self](const Guid& guid, const std::vector<boost::shared_ptr<tolmonetsync::AssetBase> >& assets) {
            self->Record(guid, true, [&](ServerOutcome& o) { o.mAssets = assets; });
        };
    }
    tolmonetsync::ItemCallback OnItem()
    {
        boost::shared_ptr<ServerOutcome> self = Self();
        return [self](const Guid& guid, const boost::shared_ptr<tolmonetsync::Item>& item) {
            self->Record(guid, true, [&](ServerOutcome& o) { o.mItem = item; });
        };
    }
    tolmonetsync::DownloadCallback OnDownload()
    {
        boost::shared_ptr<ServerOutcome> self = Self();
        return [self](const Guid& guid, const tolmonetsync::DownloadResult& result) {
            self->Record(guid, true, [&](ServerOutcome& o) { o.mDownload = result; });
        };
    }
    tolmonetsync::ErrorCallback OnError()
    {
        boost::shared_ptr<ServerOutcome> self = Self();
        return [self](const Guid& guid, const boost::shared_ptr<tolmonet::Response>& response) {
            self->Record(guid, false, [&](ServerOutcome& o) { o.mResponse = response; });
        };
    }
    tolmonetsync::ConnectionStateCallback OnState()
    {
        boost::shared_ptr<ServerOutcome> self = Self();
        return [self](tolmonetsync::SyncServer_ConnectionState state) {
            self->Record(Guid(), true, [&](ServerOutcome& o) { o.mState = state; });
        };
    }

    // Waits until `calls` callbacks in all have run, at most the limit; true
    // if they did.
    bool Wait(int calls = 1, std::chrono::seconds limit = kCallbackWaitLimit)
    {
        std::unique_lock<std::mutex> lock(mMutex);
        return mCalled.wait_for(lock, limit, [&] { return mSuccesses + mErrors >= calls; });
    }

    int Successes() const
    {
        return Read([](const ServerOutcome& o) { return o.mSuccesses; });
    }
    int Errors() const
    {
        return Read([](const ServerOutcome& o) { return o.mErrors; });
    }
    // The Guids of every call, in order.
    std::vector<Guid> Guids() const
    {
        return Read([](const ServerOutcome& o) { return o.mGuids; });
    }
    // True while every call so far ran on the completion thread.
    bool AllOnCompletionThread() const
    {
        return Read([](const ServerOutcome& o) { return o.mAllOnCompletion; });
    }
    // Status of the last error's response; 0 without one, 1 for a null response.
    tolmonet::StatusCode ErrorStatus() const
    {
        return Read([](const ServerOutcome& o) { return o.mResponse ? o.mResponse->status : (o.mErrors ? 1 : 0); });
    }
    std::string ErrorBody() const
    {
        return Read([](const ServerOutcome& o) { return o.mResponse ? o.mResponse->BodyText().ToStdString() : ""; });
    }
    boost::shared_ptr<tolmonetsync::Collection> Collection() const
    {
        return Read([](const ServerOutcome& o) { return o.mCollection; });
    }
    boost::shared_ptr<tolmonetsync::AssetBase> Asset() const
    {
        return Read([](const ServerOutcome& o) { return o.mAsset; });
    }
    std::vector<boost::shared_ptr<tolmonetsync::AssetBase> > Assets() const
    {
        return Read([](const ServerOutcome& o) { return o.mAssets; });
    }
    boost::shared_ptr<tolmonetsync::Item> Item() const
    {
        return Read([](const ServerOutcome& o) { return o.mItem; });
    }
    tolmonetsync::DownloadResult Download() const
    {
        return Read([](const ServerOutcome& o) { return o.mDownload; });
    }
    tolmonetsync::SyncServer_ConnectionState State() const
    {
        return Read([](const ServerOutcome& o) { return o.mState; });
    }

    // Made through Make(); public for make_shared.
    ServerOutcome() = default;

private:
    boost::shared_ptr<ServerOutcome> Self() { return shared_from_this(); }

    template <class Store>
    void Record(const Guid& guid, bool success, const Store& store)
    {
        const bool onCompletion = tolmonet::http::GetGlobalRequestProcessor()->CurrentThreadIsCompletionThread();
        {
            std::lock_guard<std::mutex> lock(mMutex);
            (success ? mSuccesses : mErrors) += 1;
            mGuids.push_back(guid);
            mAllOnCompletion = mAllOnCompletion && onCompletion;
            store(*this);
        }
        mCalled.notify_all();
    }

    template <class Reader>
    auto Read(const Reader& reader) const -> decltype(reader(*this))
    {
        std::lock_guard<std::mutex> lock(mMutex);
        return reader(*this);
    }

    mutable std::mutex mMutex;  // guards everything below
    std::condition_variable mCalled;
    int mSuccesses = 0;
    int mErrors = 0;
    std::vector<Guid> mGuids;
    bool mAllOnCompletion = true;
    boost::shared_ptr<tolmonet::Response> mResponse;
    boost::shared_ptr<tolmonetsync::Collection> mCollection;
    boost::shared_ptr<tolmonetsync::AssetBase> mAsset;
    std::vector<boost::shared_ptr<tolmonetsync::AssetBase> > mAssets;
    boost::shared_ptr<tolmonetsync::Item> mItem;
    tolmonetsync::DownloadResult mDownload;
    tolmonetsync::SyncServer_ConnectionState mState = tolmonetsync::SyncServer_Unknown;
};

// Waits until everything posted to the completion thread before this call
// has run: jobs run in turn, so a marker posted now runs after them. True if
// it did within the limit.
inline bool DrainCompletionThread(std::chrono::seconds limit = kCallbackWaitLimit)
{
    struct Marker {
        std::mutex mMutex;
        std::condition_variable mRan;
        bool mDone = false;
    };
    boost::shared_ptr<Marker> marker = boost::make_shared<Marker>();
    tolmonet::http::GetGlobalRequestProcessor()->CallAsynchronously(
        [marker]() {
            std::lock_guard<std::mutex> lock(marker->mMutex);
            marker->mDone = true;
            marker->mRan.notify_all();
        },
        0);
    std::unique_lock<std::mutex> lock(marker->mMutex);
    return marker->mRan.wait_for(lock, limit, [&] { return marker->mDone; });
}

}  // namespace testsupport
