#include "foundation/net/ForwardingProcessor.h"

namespace tolmonet {
namespace http {

ForwardingProcessor::ForwardingProcessor(const boost::shared_ptr<RequestProcessor>& target) : mTarget(target) {}

ForwardingProcessor::~ForwardingProcessor() = default;

void ForwardingProcessor::TryToCancelRequest(const Guid& requestUID) { mTarget->TryToCancelRequest(requestUID); }

bool ForwardingProcessor::GET(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                              const HeaderList& headers, const Configuration& configuration)
{
    return mTarget->GET(requestUID, handler, url, headers, configuration);
}

bool ForwardingProcessor::HEAD(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                               const HeaderList& headers, const Configuration& configuration)
{
    return mTarget->HEAD(requestUID, handler, url, headers, configuration);
}

bool ForwardingProcessor::PUT(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                              const Body& body, const HeaderList& headers, const Configuration& configuration)
{
    return mTarget->PUT(requestUID, handler, url, body, headers, configuration);
}

bool ForwardingProcessor::PUTForm(const Guid& requestUID, const ResponseHandler& handler,
                                  const ImmutableString& url, const FormList& form, const HeaderList& headers,
                                  const Configuration& configuration)
{
    return mTarget->PUTForm(requestUID, handler, url, form, headers, configuration);
}

bool ForwardingProcessor::POST(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                               const Body& body, const HeaderList& headers, const Configuration& configuration)
{
    return mTarget->POST(requestUID, handler, url, body, headers, configuration);
}

bool ForwardingProcessor::POSTForm(const Guid& requestUID, const ResponseHandler& handler,
                                   const ImmutableString& url, const FormList& form, const HeaderList& headers,
                                   const Configuration& configuration)
{
    return mTarget->POSTForm(requestUID, handler, url, form, headers, configuration);
}

bool ForwardingProcessor::PATCH(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                                const Body& body, const HeaderList& headers, const Configuration& configuration)
{
    return mTarget->PATCH(requestUID, handler, url, body, headers, configuration);
}

bool ForwardingProcessor::DEL(const Guid& requestUID, const ResponseHandler& handler, const ImmutableString& url,
                              const HeaderList& headers, const Configuration& configuration)
{
    return mTarget->DEL(requestUID, handler, url, headers, configuration);
}

void ForwardingProcessor::CallAsynchronously(const boost::function<void()>& function,
                                             const int& delayMilliseconds) const
{
    mTarget->CallAsynchronously(function, delayMilliseconds);
}

bool ForwardingProcessor::CurrentThreadIsCompletionThread() const
{
    return mTarget->CurrentThreadIsCompletionThread();
}

Guid ForwardingProcessor::GetProcessUniqueID() const { return mTarget->GetProcessUniqueID(); }

}  // namespace http
}  // namespace tolmonet
