// The process-wide processor and how it ends at process exit.

#include <cstdlib>
#include <mutex>

#include "foundation/core/Trace.h"
#include "foundation/net/CompletionQueue.h"
#include "foundation/net/CurlNetworkLoop.h"
#include "foundation/net/CurlRequestProcessor.h"

namespace tolmonet {
namespace http {
namespace {

// Plain atomics and raw pointers: nothing here has a destructor that could
// run at exit while the threads still use it.
CurlRequestProcessor::Timeouts sProcessWideTimeouts{{30000}, {60}};
boost::shared_ptr<CurlRequestProcessor>* sProcessWide = nullptr;  // never deleted

}  // namespace

boost::shared_ptr<RequestProcessor> CurlRequestProcessor::CreateProcessWide()
{
    static std::once_flag sOnce;
    std::call_once(sOnce, [] {
        CurlProcessorSettings settings;
        if (const char* caFile = std::getenv("TOLMONETSYNC_CA_FILE")) settings.mCAFile = caFile;
        // Whatever the threads reach that is made on first use is made now,
        // before the hook: exit destroys statics in the reverse order of
        // their making, so these outlive the hook. libcurl's TLS library
        // registers its own exit cleanup here as well.
        tolmocore::debug::TraceChangeCount();
        sProcessWide =
            new boost::shared_ptr<CurlRequestProcessor>(new CurlRequestProcessor(settings, &sProcessWideTimeouts));
        (*sProcessWide)->GetProcessUniqueID();
        std::atexit(&CurlRequestProcessor::StopProcessWideAtExit);
    });
    return *sProcessWide;
}

void CurlRequestProcessor::SetProcessWideTimeouts(std::chrono::milliseconds connectTimeout,
                                                  std::chrono::seconds stallTime)
{
    StoreTimeouts(sProcessWideTimeouts, connectTimeout, stallTime);
}

void CurlRequestProcessor::StopProcessWideAtExit()
{
    CurlRequestProcessor& processor = **sProcessWide;
    // The completion thread first, so that no further handler starts while the
    // network thread is being stopped. Both stops leave every queue as it is.
    processor.mCompletions->StopForExit();
    processor.mNetwork->StopForExit();
    TOLMO_TRACE("tolmonetsync", 8, "request processor stopped at exit");
}

}  // namespace http
}  // namespace tolmonet
