#pragma once
// The interface every network request goes through.
//
// Contract of the verbs: a verb starts the request and returns at once, from
// any thread, also from inside a handler. True means the handler will run
// exactly once, later, on the processor's one completion thread, with the
// request's identifier and a non-null Response. False means the request was not
// taken and the handler will never run. Handlers never run at the same time.
// The URL is absolute with its query already quoted; a null body sends none.

#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/net/Response.h"

namespace tolmonet {
namespace http {

class RequestProcessor {
public:
    using Body = boost::shared_ptr<RecycledMemory const>;

    // Cancels whichever request is live under the identifier; its handler
    // still runs, with a status -100 response. Unknown identifiers are ignored.
    virtual void TryToCancelRequest(const Guid& requestUID) = 0;
    virtual bool GET(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                     const HeaderList& headers, const Configuration& configuration) = 0;
    virtual bool HEAD(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                      const HeaderList& headers, const Configuration& configuration) = 0;
    virtual bool PUT(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                     const Body& body, const HeaderList& headers, const Configuration& configuration) = 0;
    virtual bool PUTForm(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                         const FormList& form, const HeaderList& headers,
                         const Configuration& configuration) = 0;
    virtual bool POST(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                      const Body& body, const HeaderList& headers, const Configuration& configuration) = 0;
    virtual bool POSTForm(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                          const FormList& form, const HeaderList& headers,
                          const Configuration& configuration) = 0;
    virtual bool PATCH(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                       const Body& body, const HeaderList& headers, const Configuration& configuration) = 0;
    virtual bool DEL(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                     const HeaderList& headers, const Configuration& configuration) = 0;
    virtual ~RequestProcessor();
    // Runs the function on the completion thread, in turn with the handlers.
    virtual void CallAsynchronously(const boost::function<void()>& function, const int& delayMilliseconds) const = 0;
    virtual bool CurrentThreadIsCompletionThread() const = 0;
    virtual void Shutdown();
    virtual Guid GetProcessUniqueID() const = 0;
};

// The process-wide processor, made on first use (the libcurl one, unless a
// test installed another). Never destroyed: see CurlRequestProcessor.h.
boost::shared_ptr<RequestProcessor> GetGlobalRequestProcessor();

// Replaces the process-wide processor for the rest of the process (tests use
// this to put a wrapper in front of the real one). Returns the previous one,
// which is made first if it did not exist yet.
boost::shared_ptr<RequestProcessor> SetGlobalRequestProcessor(const boost::shared_ptr<RequestProcessor>& processor);

}  // namespace http
}  // namespace tolmonet

namespace tolmonetsync {
// The library's own name for the process-wide processor; adds nothing.
boost::shared_ptr<tolmonet::http::RequestProcessor> GetGlobalSyncProcessor();
}  // namespace tolmonetsync
