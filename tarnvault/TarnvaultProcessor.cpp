// The authorising layer in front of the process-wide processor, and the
// protocol's constants.

#include "tarnvault/Tarnvault.h"

namespace tolmonetsync {
namespace tarnvault {

const ImmutableString kQ = ImmutableString::CreateStatic("q");
const ImmutableString kMetadata = ImmutableString::CreateStatic("metadata");
const ImmutableString kScope = ImmutableString::CreateStatic("scope");
const ImmutableString kName = ImmutableString::CreateStatic("name");
const ImmutableString kCollections = ImmutableString::CreateStatic("collections");
const ImmutableString kRecursive = ImmutableString::CreateStatic("recursive");
const ImmutableString kAuthorization = ImmutableString::CreateStatic("Authorization");
const ImmutableString kRequestID = ImmutableString::CreateStatic("X-REQUEST-ID");
const ImmutableString kPersistencePolicy = ImmutableString::CreateStatic("X-Persistence-Policy");
const ImmutableString kEthereal = ImmutableString::CreateStatic("ethereal");
const ImmutableString kLastModified = ImmutableString::CreateStatic("LAST-MODIFIED");
const ImmutableString kProduction = ImmutableString::CreateStatic("https://vault.tolmonet.net/api");
const ImmutableString kStaging = ImmutableString::CreateStatic("https://vault-stage.tolmonet.net/api");

namespace {

tolmonet::Configuration Authorized(const tolmonet::Configuration& configuration)
{
    tolmonet::Configuration copy(configuration);
    copy.mAuthorized = true;
    return copy;
}

}  // namespace

TarnvaultProcessor::TarnvaultProcessor(const boost::shared_ptr<tolmonet::http::RequestProcessor>& target,
                                       const UTF8String* accessToken)
    : ForwardingProcessor(target), mAccessToken(accessToken)
{
}

TarnvaultProcessor::~TarnvaultProcessor() = default;

tolmonet::HeaderList TarnvaultProcessor::AddAuthorization(const Guid& requestUID,
                                                          const tolmonet::HeaderList& headers) const
{
    tolmonet::HeaderList result(headers);
    // Read now, not at construction: a token set later counts from the next request.
    result.insert(std::make_pair(kAuthorization, ImmutableString::CreateDynamic(UTF8String("Bearer ") + *mAccessToken)));
    if (!requestUID.IsNil())
        result.insert(std::make_pair(kRequestID, ImmutableString::CreateDynamic(requestUID.AsUTF8String())));
    return result;
}

void TarnvaultProcessor::TryToCancelRequest(const Guid& requestUID) { Target()->TryToCancelRequest(requestUID); }

bool TarnvaultProcessor::GET(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler,
                             const ImmutableString& url, const tolmonet::HeaderList& headers,
                             const tolmonet::Configuration& configuration)
{
    return Target()->GET(requestUID, handler, url, AddAuthorization(requestUID, headers), Authorized(configuration));
}

bool TarnvaultProcessor::HEAD(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler,
                              const ImmutableString& url, const tolmonet::HeaderList& headers,
                              const tolmonet::Configuration& configuration)
{
    return Target()->HEAD(requestUID, handler, url, AddAuthorization(requestUID, headers),
                          Authorized(configuration));
}

bool TarnvaultProcessor::PUT(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler,
                             const ImmutableString& url, const Body& body, const tolmonet::HeaderList& headers,
                             const tolmonet::Configuration& configuration)
{
    return Target()->PUT(requestUID, handler, url, body, AddAuthorization(requestUID, headers),
                         Authorized(configuration));
}

bool TarnvaultProcessor::PUTForm(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler,
                                 const ImmutableString& url, const tolmonet::FormList& form,
                                 const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration)
{
    return Target()->PUTForm(requestUID, handler, url, form, AddAuthorization(requestUID, headers),
                             Authorized(configuration));
}

bool TarnvaultProcessor::POST(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler,
                              const ImmutableString& url, const Body& body, const tolmonet::HeaderList& headers,
                              const tolmonet::Configuration& configuration)
{
    return Target()->POST(requestUID, handler, url, body, AddAuthorization(requestUID, headers),
                          Authorized(configuration));
}

bool TarnvaultProcessor::POSTForm(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler,
                                  const ImmutableString& url, const tolmonet::FormList& form,
                                  const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration)
{
    return Target()->POSTForm(requestUID, handler, url, form, AddAuthorization(requestUID, headers),
                              Authorized(configuration));
}

bool TarnvaultProcessor::DEL(const Guid& requestUID, const tolmonet::http::ResponseHandler& handler,
                             const ImmutableString& url, const tolmonet::HeaderList& headers,
                             const tolmonet::Configuration& configuration)
{
    return Target()->DEL(requestUID, handler, url, AddAuthorization(requestUID, headers), Authorized(configuration));
}

}  // namespace tarnvault
}  // namespace tolmonetsync
