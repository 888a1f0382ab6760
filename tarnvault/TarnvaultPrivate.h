#pragma once
// Helpers shared by the client's sources; not installed.

#include <cstdint>
#include <stdexcept>
#include <string>
#include <vector>

#include <boost/shared_ptr.hpp>

#include "assets/RestException.h"
#include "foundation/core/Redaction.h"
#include "foundation/core/Trace.h"
#include "foundation/json/JSON.h"
#include "foundation/net/Response.h"
#include "tarnvault/Tarnvault.h"

namespace tolmonetsync {
namespace tarnvault {

// The largest answer that is parsed: its tree takes several times its size.
// The processor stops a longer answer while it arrives, as every request but
// a download keeps the default bound; the check before parsing stays for a
// processor that does not.
constexpr std::size_t kMaxJSONAnswer = std::size_t(64) << 20;
static_assert(kMaxJSONAnswer == tolmonet::kDefaultMaxResponseBody, "JSON answers keep the processor's default bound");

// Raised for an answer of more than kMaxJSONAnswer bytes, so that the caller
// can say so instead of calling it a parsing problem.
class OversizedAnswer : public std::runtime_error {
public:
    OversizedAnswer() : std::runtime_error("JSON answer is larger than 64 MiB") {}
};

// Raised where an answer holds a collection where an item belongs, or the
// reverse.
class WrongAssetClass : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

// The migration decision for a missing preferences root: leaves `next` as
// it is when no migration was asked for, or makes it the migration step and
// clears both switches. False: `error` has been called, and no root is to be
// made.
bool DecideMigration(const boost::shared_ptr<Tarnvault>& client, const boost::shared_ptr<Collection>& root,
                     const CollectionCallback& success, const ErrorCallback& error, const Guid& guid,
                     CollectionCallback& next);

namespace {

// What trace lines may show of a URL or a body: secret values blanked.
inline std::string RedactedForTrace(const UTF8String& text)
{
    return tolmocore::debug::RedactSecrets(text.ToStdString());
}

inline std::string HeaderTraceText(const boost::shared_ptr<tolmonet::Response>& response)
{
    std::string text;
    for (const auto& header : response->headers)
        text += ", " + tolmocore::debug::RedactSecrets(header.first.ToStdString() + ": " + header.second.ToStdString());
    return text;
}

// Every handler starts here: the body as text, and the response's trace line.
inline UTF8String _HandleBody(const char* name, const Guid& requestUID,
                              const boost::shared_ptr<tolmonet::Response>& response)
{
    UTF8String body;
    if (response->body && response->body->Data())
        body.assign(response->body->Data(), response->body->Size());
    // Two statements, so that each level keeps a guard of its own.
    if (response->status >= 200 && response->status <= 299) {
        TOLMO_TRACE("Tarnvault", 8, name << ", status_code: " << response->status << ", body: "
                                          << RedactedForTrace(body)
                                          << ", requestUID: " << requestUID << HeaderTraceText(response));
    } else {
        TOLMO_TRACE("Tarnvault", 1, name << ", status_code: " << response->status << ", body: "
                                          << RedactedForTrace(body)
                                          << ", requestUID: " << requestUID << HeaderTraceText(response));
    }
    return body;
}

inline boost::any ParseAnswer(const UTF8String& body)
{
    if (body.size() > kMaxJSONAnswer) throw OversizedAnswer();
    return tolmocore::serialization::JSONParse(body);
}

// An answer that is a JSON array of assets, read whole or not at all.
inline std::vector<boost::shared_ptr<AssetBase> > ParseAssetList(const UTF8String& body)
{
    return tolmocore::serialization::JSONConvert<std::vector<boost::shared_ptr<AssetBase> > >::FromJSON(
        ParseAnswer(body));
}

// The error a handler reports for an exception out of its parsing: the
// handler's own text, or a plain refusal of an oversized answer or of an
// asset of the wrong class.
inline void ReportParseFailure(const char* handler, const ErrorCallback& error, const Guid& requestUID,
                               const std::exception& exception)
{
    TOLMO_TRACE("Tarnvault", 1, "Warning: " << handler << ": " << requestUID << ": " << exception.what());
    std::string text = std::string(handler) + ": JSON parsing problem";
    if (dynamic_cast<const OversizedAnswer*>(&exception) || dynamic_cast<const WrongAssetClass*>(&exception))
        text = std::string(handler) + ": " + exception.what();
    error(requestUID, MakeErrorResponse(tolmocore::utility::ToUTF16(text)));
}

// A JSON answer that the processor stopped at its bound is reported as one
// refused before parsing. True: `error` has been called.
inline bool ReportStoppedAnswer(const char* handler, const ErrorCallback& error, const Guid& requestUID,
                                const boost::shared_ptr<tolmonet::Response>& response)
{
    if (!tolmonet::IsResponseTooLarge(*response)) return false;
    ReportParseFailure(handler, error, requestUID, OversizedAnswer());
    return true;
}

// The last value of a response header, or empty.
inline UTF8String LastHeader(const boost::shared_ptr<tolmonet::Response>& response, const ImmutableString& name)
{
    const ImmutableString* value = tolmonet::FindHeader(response->headers, name);
    return value ? value->ToUTF8String() : UTF8String();
}

inline boost::shared_ptr<RecycledMemory const> BodyOf(const UTF8String& text)
{
    boost::shared_ptr<std::vector<unsigned char> > bytes(new std::vector<unsigned char>(text.begin(), text.end()));
    return RecycledMemory::AdaptAsRecycledMemory(bytes);
}

inline Guid Sent(bool taken, const Guid& requestUID) { return taken ? requestUID : Guid(); }

}  // namespace
}  // namespace tarnvault
}  // namespace tolmonetsync
