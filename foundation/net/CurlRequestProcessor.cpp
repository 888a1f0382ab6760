#include "foundation/net/CurlRequestProcessor.h"

#include <cstdlib>
#include <mutex>
#include <stdexcept>

#include "foundation/net/CompletionQueue.h"
#include "foundation/net/CurlNetworkLoop.h"
#include "foundation/net/CurlTransfer.h"
#include "foundation/net/HeaderConstants.h"
#include "foundation/net/QuoteURL.h"

namespace tolmonet {
namespace http {
namespace {

void InitialiseCurlOnce()
{
    static std::once_flag sOnce;
    static CURLcode sResult = CURLE_OK;
    std::call_once(sOnce, [] { sResult = curl_global_init(CURL_GLOBAL_DEFAULT); });
    if (sResult != CURLE_OK) throw std::runtime_error("curl_global_init failed");
}

// Loopback never goes through a proxy, whatever the environment names; the
// environment's own exceptions still hold.
std::string NoProxyList()
{
    const char* fromEnvironment = std::getenv("no_proxy");
    if (!fromEnvironment || !*fromEnvironment) fromEnvironment = std::getenv("NO_PROXY");
    const std::string loopback = "localhost,127.0.0.1,::1";
    if (!fromEnvironment || !*fromEnvironment) return loopback;
    if (std::string(fromEnvironment) == "*") return "*";  // libcurl honours "*" only alone
    return std::string(fromEnvironment) + "," + loopback;
}

}  // namespace

CurlRequestProcessor::CurlRequestProcessor(const CurlProcessorSettings& settings)
    : CurlRequestProcessor(settings, nullptr)
{
}

CurlRequestProcessor::CurlRequestProcessor(const CurlProcessorSettings& settings, Timeouts* sharedTimeouts)
    : mTimeouts(sharedTimeouts ? sharedTimeouts : &mOwnTimeouts)
{
    StoreTimeouts(mOwnTimeouts, settings.mConnectTimeout, settings.mStallTime);
    InitialiseCurlOnce();
    CurlTransferEnvironment environment;
    environment.mCAFile = settings.mCAFile;
    environment.mNoProxy = NoProxyList();
    mCompletions = CompletionQueue::Start();
    try {
        mNetwork.reset(
            new CurlNetworkLoop(environment, settings.mMaxConnections, settings.mMaxConnectionsPerHost, mCompletions));
    } catch (...) {
        mCompletions->Stop();
        throw;
    }
}

CurlRequestProcessor::~CurlRequestProcessor()
{
    // The network first: once it is stopped nothing posts to the queue.
    mNetwork->Stop();
    mCompletions->Stop();
}

void CurlRequestProcessor::SetTimeouts(std::chrono::milliseconds connectTimeout, std::chrono::seconds stallTime)
{
    StoreTimeouts(*mTimeouts, connectTimeout, stallTime);
}

void CurlRequestProcessor::StoreTimeouts(Timeouts& timeouts, std::chrono::milliseconds connectTimeout,
                                         std::chrono::seconds stallTime)
{
    // 0 would mean libcurl's own 300 s for the connection, and no stall check at all.
    timeouts.mConnectMilliseconds = connectTimeout.count() < 1 ? 1L : static_cast<long>(connectTimeout.count());
    timeouts.mStallSeconds = stallTime.count() < 1 ? 1L : static_cast<long>(stallTime.count());
}

bool CurlRequestProcessor::Submit(HttpMethod method, const Guid& requestUID, const ResponseHandler& handler,
                                  const ImmutableString& url, const Body& body, const HeaderList& headers,
                                  const Configuration& configuration, const char* contentType)
{
    if (!handler) return false;
    CurlTransferTimeouts timeouts;
    timeouts.mConnectMilliseconds = mTimeouts->mConnectMilliseconds.load(std::memory_order_relaxed);
    timeouts.mStallSeconds = mTimeouts->mStallSeconds.load(std::memory_order_relaxed);
    std::unique_ptr<CurlTransfer> transfer(
        new CurlTransfer(requestUID, handler, method, url, body, headers, contentType, timeouts, configuration));
    return mNetwork->Start(transfer);
}

bool CurlRequestProcessor::SubmitForm(HttpMethod method, const Guid& requestUID, const ResponseHandler& handler,
                                      const ImmutableString& url, const FormList& form, const HeaderList& headers,
                                      const Configuration& configuration)
{
    const UTF8String quoted = QuoteURL(form);
    return Submit(method, requestUID, handler, url, RecycledMemory::CopyOf(quoted.data(), quoted.size()), headers,
                  configuration, kHEADER_CONTENT_TYPE_APPLICATION_WWW_FORM_URLENCODED.c_str());
}

void CurlRequestProcessor::TryToCancelRequest(const Guid& requestUID)
{
    mNetwork->Cancel(requestUID);
}

bool CurlRequestProcessor::GET(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                               const HeaderList& headers, const Configuration& configuration)
{
    return Submit(HttpMethod_GET, requestUID, handler, url, Body(), headers, configuration, nullptr);
}

bool CurlRequestProcessor::HEAD(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                                const HeaderList& headers, const Configuration& configuration)
{
    return Submit(HttpMethod_HEAD, requestUID, handler, url, Body(), headers, configuration, nullptr);
}

bool CurlRequestProcessor::PUT(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                               const Body& body, const HeaderList& headers, const Configuration& configuration)
{
    return Submit(HttpMethod_PUT, requestUID, handler, url, body, headers, configuration, nullptr);
}

bool CurlRequestProcessor::PUTForm(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                                   const FormList& form, const HeaderList& headers, const Configuration& configuration)
{
    return SubmitForm(HttpMethod_PUT, requestUID, handler, url, form, headers, configuration);
}

bool CurlRequestProcessor::POST(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                                const Body& body, const HeaderList& headers, const Configuration& configuration)
{
    return Submit(HttpMethod_POST, requestUID, handler, url, body, headers, configuration, nullptr);
}

bool CurlRequestProcessor::POSTForm(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                                    const FormList& form, const HeaderList& headers, const Configuration& configuration)
{
    return SubmitForm(HttpMethod_POST, requestUID, handler, url, form, headers, configuration);
}

bool CurlRequestProcessor::PATCH(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                                 const Body& body, const HeaderList& headers, const Configuration& configuration)
{
    return Submit(HttpMethod_PATCH, requestUID, handler, url, body, headers, configuration, nullptr);
}

bool CurlRequestProcessor::DEL(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                               const HeaderList& headers, const Configuration& configuration)
{
    return Submit(HttpMethod_DELETE, requestUID, handler, url, Body(), headers, configuration, nullptr);
}

void CurlRequestProcessor::CallAsynchronously(const boost::function<void()>& function,
                                              const int& delayMilliseconds) const
{
    if (!function) return;
    CompletionJob job;
    job.mFunction = function;
    mCompletions->PostAfter(std::move(job), std::chrono::milliseconds(delayMilliseconds));
}

bool CurlRequestProcessor::CurrentThreadIsCompletionThread() const
{
    return mCompletions->IsCurrentThread();
}

Guid CurlRequestProcessor::GetProcessUniqueID() const
{
    static const Guid sProcessID = Guid::CreateUnique();
    return sProcessID;
}

}  // namespace http
}  // namespace tolmonet
