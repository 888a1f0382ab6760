#include "cli/TransferCounter.h"

#include <atomic>
#include <cstdlib>

#include <boost/make_shared.hpp>

#include "foundation/net/ForwardingProcessor.h"
#include "foundation/net/HeaderConstants.h"
#include "foundation/net/RequestBodySource.h"

namespace tolmonetsync {
namespace cli {

namespace {

using tolmonet::http::ResponseHandler;

std::atomic<std::uint64_t> sTransferred{0};

// What the answer carried: a streamed download's body went to its sink, so
// its length comes from the header.
std::uint64_t ReceivedBytes(const tolmonet::Response& response)
{
    if (const ImmutableString* length = tolmonet::FindHeader(response.headers, tolmonet::kHEADER_CONTENT_LENGTH))
        return std::strtoull(length->ToStdString().c_str(), nullptr, 10);
    return response.body ? response.body->Size() : 0;
}

std::uint64_t SentBytes(const tolmonet::http::RequestProcessor::Body& body,
                        const tolmonet::Configuration& configuration)
{
    if (configuration.mBodySource) return configuration.mBodySource->Size();
    return body ? body->Size() : 0;
}

// Counts once the request is answered; a request with no answer moved
// nothing worth showing.
ResponseHandler Counting(const ResponseHandler& handler, std::uint64_t sent)
{
    return [handler, sent](const Guid& id, const boost::shared_ptr<tolmonet::Response>& response) {
        if (response && response->status > 0)
            sTransferred.fetch_add(sent + ReceivedBytes(*response), std::memory_order_relaxed);
        handler(id, response);
    };
}

class CountingProcessor : public tolmonet::http::ForwardingProcessor {
public:
    using ForwardingProcessor::ForwardingProcessor;

    bool GET(const Guid& id, const ResponseHandler& handler, const ImmutableString& url,
             const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override
    {
        return Target()->GET(id, Counting(handler, 0), url, headers, configuration);
    }
    bool PUT(const Guid& id, const ResponseHandler& handler, const ImmutableString& url, const Body& body,
             const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override
    {
        return Target()->PUT(id, Counting(handler, SentBytes(body, configuration)), url, body, headers, configuration);
    }
    bool POST(const Guid& id, const ResponseHandler& handler, const ImmutableString& url, const Body& body,
              const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override
    {
        return Target()->POST(id, Counting(handler, SentBytes(body, configuration)), url, body, headers, configuration);
    }
};

}  // namespace

void InstallTransferCounter()
{
    static const bool installed = [] {
        const auto real = tolmonet::http::GetGlobalRequestProcessor();
        tolmonet::http::SetGlobalRequestProcessor(boost::make_shared<CountingProcessor>(real));
        return true;
    }();
    (void)installed;
}

std::uint64_t TransferredBytes()
{
    return sTransferred.load(std::memory_order_relaxed);
}

}  // namespace cli
}  // namespace tolmonetsync
