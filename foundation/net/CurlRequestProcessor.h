#pragma once
// The request processor of the library: HTTP over libcurl's multi interface.
//
// Threads. Two of its own: a network thread that drives every transfer on one
// multi handle, and one completion thread that runs every handler and every
// CallAsynchronously function, one at a time. Verbs, TryToCancelRequest and
// CallAsynchronously may be called from any thread, also from inside a
// handler; they never wait for the network.
//
// Identifiers. The processor keeps the set of live identifiers: those of the
// requests it took whose outcome is not decided yet. A verb called with an
// identifier that is live already is refused: it returns false and its
// handler never runs. An identifier is retired before its handler runs, so
// the handler may start the next step of a chain under the same identifier.
// TryToCancelRequest cancels whichever request is live under the identifier
// at that moment, queued or running, and retires the identifier at once; the
// handler still runs, with status -100 and the body "Request cancelled". The
// nil identifier may be used by any number of requests at once; such
// requests cannot be cancelled.
//
// Outcomes. Every request taken gets exactly one handler call with a non-null
// Response (but see process exit below). A request that got no HTTP answer
// (refused connection, unknown host, TLS failure, time-out, a connection cut
// mid-body) gets status -100 and a one-line text a person can read as its
// body, for instance "Could not connect to 127.0.0.1 port 9: Connection
// refused". Response header names are stored in capitals, values as sent; the
// body is null when there is none. Redirects are not followed.
//
// Requests. HEAD sends no body, DEL is DELETE. PUT, POST and PATCH send the
// body given; a null body sends an empty one (Content-Length: 0). PUTForm and
// POSTForm send QuoteURL(form) as application/x-www-form-urlencoded. Without
// a Content-Type header a body goes without one. "Expect: 100-continue" is
// never sent. TLS certificates are always verified. A request header whose
// name or value holds CR or LF is dropped. An empty handler is refused. Of
// the Configuration only mMaxResponseBody and mBodySink are read: an answer
// whose body passes the bound is stopped while it arrives, what came of it is
// freed, and the handler gets status -100 with kResponseTooLargeText; a body
// the sink accepts streams into it (ResponseBodySink.h). Trace lines name the
// method and the URL without its query, never a header value.
//
// Process exit. The process-wide processor stops at exit (an atexit hook made
// with it): it waits for a handler that runs right now to return (unless
// exit was called from that handler), stops both threads and leaks itself
// with every pending request and handler, none called and none destroyed.
// Destroying them would drop the last references to objects whose
// destructors would then act as if their requests had ended. Verbs called
// after that are taken and kept the same way. A handler that waits for the
// thread calling exit makes exit wait for ever. Process-wide objects that
// handlers use should be made before the processor, or never destroyed: static
// objects made after it are destroyed before the hook runs.
//
// Other instances (tests, tools) stop in their destructor: they wait for a
// handler that runs right now, then destroy every pending handler without
// calling it. Destroy one from inside its own handler only as the last thing
// that handler does.

#include <atomic>
#include <chrono>
#include <memory>
#include <string>

#include "foundation/net/RequestProcessor.h"

namespace tolmonet {
namespace http {

class CompletionQueue;
class CurlNetworkLoop;
enum HttpMethod : int;  // CurlTransfer.h; kept out so that this header needs no libcurl

struct CurlProcessorSettings {
    // Time allowed to open a connection, TLS handshake included.
    std::chrono::milliseconds mConnectTimeout{std::chrono::seconds(30)};
    // A transfer moving less than 1 byte/s for this long is ended. At least 1 s.
    std::chrono::seconds mStallTime{60};
    long mMaxConnections = 16;
    long mMaxConnectionsPerHost = 6;
    // Certificates to trust instead of the system's store; empty: the store.
    std::string mCAFile;
};

class CurlRequestProcessor : public RequestProcessor {
public:
    // Starts both threads. Throws std::runtime_error if libcurl cannot start.
    explicit CurlRequestProcessor(const CurlProcessorSettings& settings = CurlProcessorSettings());
    ~CurlRequestProcessor() override;
    CurlRequestProcessor(const CurlRequestProcessor&) = delete;
    CurlRequestProcessor& operator=(const CurlRequestProcessor&) = delete;

    void TryToCancelRequest(const Guid& requestUID) override;
    bool GET(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
             const HeaderList& headers, const Configuration& configuration) override;
    bool HEAD(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
              const HeaderList& headers, const Configuration& configuration) override;
    bool PUT(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url, const Body& body,
             const HeaderList& headers, const Configuration& configuration) override;
    bool PUTForm(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                 const FormList& form, const HeaderList& headers, const Configuration& configuration) override;
    bool POST(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url, const Body& body,
              const HeaderList& headers, const Configuration& configuration) override;
    bool POSTForm(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                  const FormList& form, const HeaderList& headers, const Configuration& configuration) override;
    bool PATCH(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url, const Body& body,
               const HeaderList& headers, const Configuration& configuration) override;
    bool DEL(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
             const HeaderList& headers, const Configuration& configuration) override;
    // Runs the function on the completion thread once the delay (in
    // milliseconds; 0 or less: none) has passed. An empty function is ignored.
    void CallAsynchronously(const boost::function<void()>& function, const int& delayMilliseconds) const override;
    bool CurrentThreadIsCompletionThread() const override;
    // Made once per process.
    Guid GetProcessUniqueID() const override;

    // Changes the time-outs of requests started afterwards. Any thread.
    void SetTimeouts(std::chrono::milliseconds connectTimeout, std::chrono::seconds stallTime);

    // The process-wide processor, made on the first call with the default
    // settings, the time-outs of SetProcessWideTimeouts and the CA file named
    // by TOLMONETSYNC_CA_FILE. Every call gives the same one. See process exit
    // above.
    static boost::shared_ptr<RequestProcessor> CreateProcessWide();
    // Time-outs of the process-wide processor's requests started afterwards,
    // whether it exists yet or not. For tests that need a short stall time.
    static void SetProcessWideTimeouts(std::chrono::milliseconds connectTimeout, std::chrono::seconds stallTime);

    // Time-outs that one processor, or every user of the process-wide ones, reads.
    struct Timeouts {
        std::atomic<long> mConnectMilliseconds;
        std::atomic<long> mStallSeconds;
    };

private:
    CurlRequestProcessor(const CurlProcessorSettings& settings, Timeouts* sharedTimeouts);
    bool Submit(HttpMethod method, const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                const Body& body, const HeaderList& headers, const Configuration& configuration,
                const char* contentType);
    bool SubmitForm(HttpMethod method, const Guid& requestUID, const ResponseHandler& handler,
                    const ImmutableString& url, const FormList& form, const HeaderList& headers,
                    const Configuration& configuration);
    static void StoreTimeouts(Timeouts& timeouts, std::chrono::milliseconds connectTimeout,
                              std::chrono::seconds stallTime);
    static void StopProcessWideAtExit();

    Timeouts mOwnTimeouts;
    Timeouts* const mTimeouts;  // mOwnTimeouts, or the process-wide ones
    boost::shared_ptr<CompletionQueue> mCompletions;
    std::unique_ptr<CurlNetworkLoop> mNetwork;
};

}  // namespace http
}  // namespace tolmonet
