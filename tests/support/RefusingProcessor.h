#pragma once
// A request processor that cannot send what its rule names: the request is
// refused as a processor refuses one it cannot take, and the rest go to the
// real processor. Install it behind the global accessor while a client is
// made; that client keeps it.

#include <functional>
#include <string>

#include "foundation/net/ForwardingProcessor.h"

namespace testsupport {

// Given the method ("GET", "PUT", "POST", "DELETE") and the URL.
using RefusalRule = std::function<bool(const std::string& method, const std::string& url)>;

class RefusingProcessor : public tolmonet::http::ForwardingProcessor {
public:
    RefusingProcessor(const boost::shared_ptr<RequestProcessor>& target, const RefusalRule& refuse)
        : ForwardingProcessor(target), mRefuse(refuse)
    {
    }
    bool GET(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override
    {
        return Pass("GET", url) && ForwardingProcessor::GET(id, handler, url, headers, configuration);
    }
    bool PUT(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const Body& body, const tolmonet::HeaderList& headers,
             const tolmonet::Configuration& configuration) override
    {
        return Pass("PUT", url) && ForwardingProcessor::PUT(id, handler, url, body, headers, configuration);
    }
    bool POST(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
              const Body& body, const tolmonet::HeaderList& headers,
              const tolmonet::Configuration& configuration) override
    {
        return Pass("POST", url) && ForwardingProcessor::POST(id, handler, url, body, headers, configuration);
    }
    bool DEL(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override
    {
        return Pass("DELETE", url) && ForwardingProcessor::DEL(id, handler, url, headers, configuration);
    }

private:
    bool Pass(const char* method, const ImmutableString& url) { return !mRefuse(method, url.c_str()); }
    RefusalRule mRefuse;
};

}  // namespace testsupport
