#pragma once
// The network thread: one libcurl multi handle driving every transfer of a
// processor, and the bookkeeping of live request identifiers.

#include <deque>
#include <memory>
#include <mutex>
#include <thread>
#include <unordered_map>
#include <vector>

#include <curl/curl.h>
#include <boost/shared_ptr.hpp>

#include "foundation/net/CompletionQueue.h"
#include "foundation/net/CurlTransfer.h"

namespace tolmonet {
namespace http {

struct GuidHash {
    size_t operator()(const Guid& guid) const noexcept;
};

class CurlNetworkLoop {
public:
    // Starts the thread. Each finished transfer's handler goes to `completions`.
    CurlNetworkLoop(const CurlTransferEnvironment& environment, long maxConnections, long maxConnectionsPerHost,
                    const boost::shared_ptr<CompletionQueue>& completions);
    // Stops if not stopped yet.
    ~CurlNetworkLoop();
    CurlNetworkLoop(const CurlNetworkLoop&) = delete;
    CurlNetworkLoop& operator=(const CurlNetworkLoop&) = delete;

    // Takes the transfer, unless its identifier (when not nil) is live: then
    // returns false and leaves the transfer with the caller. Any thread.
    bool Start(std::unique_ptr<CurlTransfer>& transfer);

    // Retires the identifier at once and ends the transfer live under it,
    // queued or running; its handler gets the cancelled response. Any thread.
    void Cancel(const Guid& requestUID);

    // Joins the thread, then destroys every unfinished transfer with its
    // handler, uncalled. Not from the network thread.
    void Stop();

    // Joins the thread and keeps every unfinished transfer, with its handler,
    // allocated and uncalled for good. Transfers started later are kept the
    // same way. For process exit.
    void StopForExit();

private:
    void Run();
    // Waits for network events or a wake, unless work came in meanwhile.
    void Poll();
    void Wake();
    void Begin(std::unique_ptr<CurlTransfer> transfer);
    // Hands waiting transfers to libcurl, oldest first, while there is room.
    void Admit();
    bool HasRoom() const { return mRunning.size() < mMaxRunning; }
    void EndCancelled();
    void CollectFinished();
    // Ends a transfer that libcurl has (or had) and hands its handler over.
    void Finish(CurlTransfer* transfer, CURLcode result, bool cancelled);
    void Deliver(std::unique_ptr<CurlTransfer> transfer, const boost::shared_ptr<Response>& response);
    // The caller holds mMutex.
    void RetireLocked(CurlTransfer* transfer);
    CURL* TakeHandle();
    void RecycleHandle(CURL* easy);

    const CurlTransferEnvironment mEnvironment;
    const boost::shared_ptr<CompletionQueue> mCompletions;
    CURLM* const mMulti;
    // libcurl's multi walks all its handles on every perform and removal, so
    // thousands queued there cost quadratic time; it holds a few more than it
    // can connect, and the rest wait in mWaiting in the order they came.
    const size_t mMaxRunning;

    std::mutex mMutex;
    std::unordered_map<Guid, CurlTransfer*, GuidHash> mLive;  // guarded by mMutex
    std::vector<std::unique_ptr<CurlTransfer> > mIncoming;    // guarded by mMutex
    bool mCancelPending = false;                              // guarded by mMutex
    bool mStopping = false;                                   // guarded by mMutex
    bool mPolling = false;  // guarded by mMutex: the thread waits in curl_multi_poll, needs a wake

    // Written to wake the thread from curl_multi_poll. Our own eventfd rather
    // than curl_multi_wakeup: cheaper, and written only when the thread sleeps.
    const int mWakeFd;

    // The network thread's own, and after the join the stopping thread's.
    std::unordered_map<CurlTransfer*, std::unique_ptr<CurlTransfer> > mRunning;
    std::deque<std::unique_ptr<CurlTransfer> > mWaiting;
    std::vector<CURL*> mSpareHandles;

    std::thread mThread;
};

}  // namespace http
}  // namespace tolmonet
