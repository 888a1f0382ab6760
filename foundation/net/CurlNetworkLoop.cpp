#include "foundation/net/CurlNetworkLoop.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <stdexcept>

#include <pthread.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include "foundation/core/Trace.h"

namespace tolmonet {
namespace http {
namespace {

// libcurl ends the poll itself for its own timers, and Wake() for new work;
// this only bounds an idle wait.
constexpr int kIdlePollMilliseconds = 1000;
// Handles kept for reuse: enough for the connections in use, no more.
constexpr size_t kMaxSpareHandles = 32;
// Answers waiting for their handlers, beyond which no new transfer starts:
// when handlers are slower than the network (a download's file is made
// durable there), what they would hold (open files, bodies) stays bounded.
constexpr size_t kMaxCompletionBacklog = 64;

CURLM* MakeMulti(long maxConnections, long maxConnectionsPerHost)
{
    CURLM* multi = curl_multi_init();
    if (!multi) throw std::runtime_error("curl_multi_init failed");
    curl_multi_setopt(multi, CURLMOPT_MAX_TOTAL_CONNECTIONS, maxConnections);
    curl_multi_setopt(multi, CURLMOPT_MAX_HOST_CONNECTIONS, maxConnectionsPerHost);
    // Keep as many idle connections as may be open, so that bursts reuse them.
    curl_multi_setopt(multi, CURLMOPT_MAXCONNECTS, maxConnections);
    return multi;
}

int MakeWakeFd()
{
    const int fd = eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC);
    if (fd < 0) throw std::runtime_error(std::string("eventfd failed: ") + std::strerror(errno));
    return fd;
}

}  // namespace

size_t GuidHash::operator()(const Guid& guid) const noexcept
{
    // Identifiers are random: folding the two halves spreads them well enough.
    static_assert(sizeof(Guid) == 16, "Guid is 16 bytes");
    unsigned long long halves[2];
    std::memcpy(halves, &guid, sizeof halves);
    return static_cast<size_t>(halves[0] ^ (halves[1] * 0x9E3779B97F4A7C15ull));
}

CurlNetworkLoop::CurlNetworkLoop(const CurlTransferEnvironment& environment, long maxConnections,
                                 long maxConnectionsPerHost, const boost::shared_ptr<CompletionQueue>& completions)
    : mEnvironment(environment),
      mCompletions(completions),
      mMulti(MakeMulti(maxConnections, maxConnectionsPerHost)),
      // Twice the connections: a handle is ready whenever one frees up.
      mMaxRunning(static_cast<size_t>(std::max(2 * maxConnections, 8L))),
      mWakeFd(MakeWakeFd())
{
    mCompletions->SetBacklogWaker(kMaxCompletionBacklog, [this] { Wake(); });
    mThread = std::thread([this] { Run(); });
}

CurlNetworkLoop::~CurlNetworkLoop()
{
    Stop();
}

bool CurlNetworkLoop::Start(std::unique_ptr<CurlTransfer>& transfer)
{
    const Guid& requestUID = transfer->RequestUID();
    bool wake = false;
    {
        std::lock_guard<std::mutex> lock(mMutex);
        if (!requestUID.IsNil() && !mLive.emplace(requestUID, transfer.get()).second) return false;
        mIncoming.push_back(std::move(transfer));
        wake = mPolling && !mStopping;
        mPolling = false;  // one wake is enough
    }
    if (wake) Wake();
    return true;
}

void CurlNetworkLoop::Cancel(const Guid& requestUID)
{
    if (requestUID.IsNil()) return;
    {
        std::lock_guard<std::mutex> lock(mMutex);
        auto found = mLive.find(requestUID);
        if (found == mLive.end()) return;
        found->second->mCancelled = true;
        mLive.erase(found);
        mCancelPending = true;
        if (!mPolling || mStopping) return;
        mPolling = false;
    }
    Wake();
}

void CurlNetworkLoop::Wake()
{
    const uint64_t one = 1;
    // Fails only when the counter is full, and then the thread wakes anyway.
    while (::write(mWakeFd, &one, sizeof one) < 0 && errno == EINTR) {
    }
}

void CurlNetworkLoop::Poll()
{
    {
        std::lock_guard<std::mutex> lock(mMutex);
        if (mStopping || mCancelPending || !mIncoming.empty()) return;
        mPolling = true;
    }
    curl_waitfd wake{mWakeFd, CURL_WAIT_POLLIN, 0};
    curl_multi_poll(mMulti, &wake, 1, kIdlePollMilliseconds, nullptr);
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mPolling = false;
    }
    if (wake.revents) {
        uint64_t count = 0;
        while (::read(mWakeFd, &count, sizeof count) < 0 && errno == EINTR) {
        }
    }
}

void CurlNetworkLoop::Run()
{
    pthread_setname_np(pthread_self(), "tolmo-network");
    std::vector<std::unique_ptr<CurlTransfer> > incoming;
    std::vector<std::unique_ptr<CurlTransfer> > cancelled;
    for (;;) {
        bool cancelPending = false;
        {
            std::lock_guard<std::mutex> lock(mMutex);
            if (mStopping) return;
            for (auto& transfer : mIncoming)
                (transfer->mCancelled ? cancelled : incoming).push_back(std::move(transfer));
            mIncoming.clear();
            cancelPending = mCancelPending;
            mCancelPending = false;
        }
        for (auto& transfer : cancelled) Deliver(std::move(transfer), CurlTransfer::MakeCancelledResponse());
        cancelled.clear();
        for (auto& transfer : incoming) mWaiting.push_back(std::move(transfer));
        incoming.clear();
        if (cancelPending) EndCancelled();
        Admit();

        int running = 0;
        curl_multi_perform(mMulti, &running);
        CollectFinished();
        // Finished transfers made room: start the next ones without sleeping.
        if (!mWaiting.empty() && HasRoom() && !mCompletions->IsBacklogged()) continue;
        Poll();
    }
}

void CurlNetworkLoop::Admit()
{
    if (mWaiting.empty() || !HasRoom() || mCompletions->IsBacklogged()) return;
    while (!mWaiting.empty() && HasRoom()) {
        std::unique_ptr<CurlTransfer> transfer(std::move(mWaiting.front()));
        mWaiting.pop_front();
        Begin(std::move(transfer));
    }
}

void CurlNetworkLoop::Begin(std::unique_ptr<CurlTransfer> transfer)
{
    TOLMO_TRACE("tolmonetsync", 8,
                "sending " << MethodName(transfer->Method()) << " " << transfer->UrlForTrace() << " ("
                           << transfer->RequestUID() << ")");
    CURL* easy = TakeHandle();
    CURLMcode added = CURLM_OUT_OF_MEMORY;
    if (easy) {
        transfer->Attach(easy, mEnvironment);
        added = curl_multi_add_handle(mMulti, easy);
    }
    if (added != CURLM_OK) {
        RecycleHandle(transfer->Detach());
        {
            std::lock_guard<std::mutex> lock(mMutex);
            RetireLocked(transfer.get());
        }
        const UTF8String text(curl_multi_strerror(added));
        return Deliver(std::move(transfer), CurlTransfer::MakeFailureResponse(text));
    }
    CurlTransfer* key = transfer.get();
    mRunning.emplace(key, std::move(transfer));
}

void CurlNetworkLoop::EndCancelled()
{
    std::vector<CurlTransfer*> cancelled;
    std::deque<std::unique_ptr<CurlTransfer> > unsent;
    {
        std::lock_guard<std::mutex> lock(mMutex);
        for (const auto& running : mRunning)
            if (running.first->mCancelled) cancelled.push_back(running.first);
        // One sweep keeps the order of the rest: a cancel-all stays linear.
        std::deque<std::unique_ptr<CurlTransfer> > kept;
        for (auto& transfer : mWaiting) (transfer->mCancelled ? unsent : kept).push_back(std::move(transfer));
        mWaiting.swap(kept);
    }
    for (auto& transfer : unsent) Deliver(std::move(transfer), CurlTransfer::MakeCancelledResponse());
    for (CurlTransfer* transfer : cancelled) Finish(transfer, CURLE_OK, true);
}

void CurlNetworkLoop::CollectFinished()
{
    int left = 0;
    while (CURLMsg* message = curl_multi_info_read(mMulti, &left)) {
        if (message->msg != CURLMSG_DONE) continue;
        const CURLcode result = message->data.result;  // `message` dies with the handle's removal
        char* transfer = nullptr;
        curl_easy_getinfo(message->easy_handle, CURLINFO_PRIVATE, &transfer);
        Finish(reinterpret_cast<CurlTransfer*>(transfer), result, false);
    }
}

void CurlNetworkLoop::Finish(CurlTransfer* transfer, CURLcode result, bool cancelled)
{
    auto found = mRunning.find(transfer);
    if (found == mRunning.end()) return;
    std::unique_ptr<CurlTransfer> owned(std::move(found->second));
    mRunning.erase(found);

    boost::shared_ptr<Response> response;
    if (!cancelled) response = transfer->MakeResponse(result);
    curl_multi_remove_handle(mMulti, transfer->Handle());
    // Reset after the handler is on its way: a chain's next step waits for it.
    CURL* easy = transfer->Detach();
    {
        // A cancel that reached the request while it was live decides the
        // outcome, even when the answer came in the meantime.
        std::lock_guard<std::mutex> lock(mMutex);
        cancelled = cancelled || transfer->mCancelled;
        if (!cancelled) RetireLocked(transfer);
    }
    if (cancelled) response = CurlTransfer::MakeCancelledResponse();
    Deliver(std::move(owned), response);
    RecycleHandle(easy);
}

void CurlNetworkLoop::Deliver(std::unique_ptr<CurlTransfer> transfer, const boost::shared_ptr<Response>& response)
{
    if (response->status == kStatusNoResponse) {
        TOLMO_TRACE("tolmonetsync", 1,
                    "no answer to " << MethodName(transfer->Method()) << " " << transfer->UrlForTrace() << ": "
                                    << response->BodyText() << " (" << transfer->RequestUID() << ")");
    } else {
        TOLMO_TRACE("tolmonetsync", 8,
                    "answer " << response->status << " to " << MethodName(transfer->Method()) << " "
                              << transfer->UrlForTrace() << ", " << (response->body ? response->body->Size() : 0)
                              << " bytes (" << transfer->RequestUID() << ")");
    }
    CompletionJob job;
    job.mHandler = std::move(transfer->Handler());
    job.mRequestUID = transfer->RequestUID();
    job.mResponse = response;
    mCompletions->Post(std::move(job));
}

void CurlNetworkLoop::RetireLocked(CurlTransfer* transfer)
{
    if (transfer->RequestUID().IsNil()) return;
    auto found = mLive.find(transfer->RequestUID());
    // The identifier may be live again already, for a newer request.
    if (found != mLive.end() && found->second == transfer) mLive.erase(found);
}

CURL* CurlNetworkLoop::TakeHandle()
{
    if (mSpareHandles.empty()) return curl_easy_init();
    CURL* easy = mSpareHandles.back();
    mSpareHandles.pop_back();
    return easy;
}

void CurlNetworkLoop::RecycleHandle(CURL* easy)
{
    if (!easy) return;
    if (mSpareHandles.size() >= kMaxSpareHandles) return curl_easy_cleanup(easy);
    curl_easy_reset(easy);
    mSpareHandles.push_back(easy);
}

void CurlNetworkLoop::Stop()
{
    {
        std::lock_guard<std::mutex> lock(mMutex);
        if (mStopping && !mThread.joinable()) return;
        mStopping = true;
    }
    mCompletions->SetBacklogWaker(0, boost::function<void()>());  // the wake descriptor closes below
    Wake();
    if (mThread.joinable()) mThread.join();

    std::vector<std::unique_ptr<CurlTransfer> > incoming;
    {
        std::lock_guard<std::mutex> lock(mMutex);
        incoming.swap(mIncoming);
        mLive.clear();
    }
    for (auto& running : mRunning) {
        curl_multi_remove_handle(mMulti, running.first->Handle());
        curl_easy_cleanup(running.first->Detach());
    }
    for (CURL* easy : mSpareHandles) curl_easy_cleanup(easy);
    mSpareHandles.clear();
    curl_multi_cleanup(mMulti);
    ::close(mWakeFd);
    // Handlers go here, uncalled; whatever their destructors start is kept
    // in mIncoming and never sent.
    mRunning.clear();
    mWaiting.clear();
    incoming.clear();
}

void CurlNetworkLoop::StopForExit()
{
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mStopping = true;
    }
    Wake();
    if (mThread.joinable()) mThread.join();
}

}  // namespace http
}  // namespace tolmonet
