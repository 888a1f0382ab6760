// The read calls: search, search for one, and one asset's description.

#include <boost/bind/bind.hpp>

#include "assets/AssetJSON.h"
#include "foundation/net/QuoteURL.h"
#include "tarnvault/AssetListReader.h"
#include "tarnvault/TarnvaultPrivate.h"

namespace tolmonetsync {
namespace tarnvault {

namespace json = tolmocore::serialization;
using boost::placeholders::_1;
using boost::placeholders::_2;

namespace {

void _HandleSearch(const AssetsCallback& success, const ErrorCallback& error, const Guid& requestUID,
                   const boost::shared_ptr<tolmonet::Response>& response)
{
    std::vector<boost::shared_ptr<AssetBase> > assets;
    {
        // The text goes before the callback runs: a whole scan may run
        // inside it, and a large group's answer is megabytes long.
        const UTF8String body = _HandleBody("Search", requestUID, response);
        if (ReportStoppedAnswer("_HandleSearch", error, requestUID, response)) return;
        if (response->status != 200) {
            error(requestUID, response);
            return;
        }
        try {
            assets = ReadAssetList(body);
        } catch (const std::exception& e) {
            ReportParseFailure("_HandleSearch", error, requestUID, e);
            return;
        }
    }
    try {
        success(requestUID, assets);
    } catch (const std::exception& e) {
        ReportParseFailure("_HandleSearch", error, requestUID, e);
    }
}

void _HandleSearchOne(const AssetCallback& success, const ErrorCallback& error, const Guid& requestUID,
                      const std::vector<boost::shared_ptr<AssetBase> >& assets)
{
    if (assets.size() >= 2) {
        error(requestUID, MakeErrorResponse(tolmocore::utility::ToUTF16("SearchOne: too many results")));
    } else if (assets.size() == 1) {
        success(requestUID, assets.front());
    } else {
        success(requestUID, boost::shared_ptr<AssetBase>());
    }
}

void _HandleHeader(const UTF8String& uid, const AssetCallback& success, const ErrorCallback& error,
                   const Guid& requestUID, const boost::shared_ptr<tolmonet::Response>& response)
{
    const UTF8String body = _HandleBody("Header", requestUID, response);
    if (ReportStoppedAnswer("_HandleHeader", error, requestUID, response)) return;
    if (response->status != 200) {
        error(requestUID, response);
        return;
    }
    try {
        const boost::shared_ptr<AssetBase> asset =
            json::JSONConvert<boost::shared_ptr<AssetBase> >::FromJSON(ParseAnswer(body));
        asset->mId = uid;
        success(requestUID, asset);
    } catch (const std::exception& e) {
        ReportParseFailure("_HandleHeader", error, requestUID, e);
    }
}

}  // namespace

Guid Tarnvault::SearchAsync(const AssetsCallback& success, const ErrorCallback& error, const SearchQuery& query,
                            const Guid& requestUID)
{
    // A bad modifier throws here, on the caller's thread.
    const UTF8String q = json::GetJSONUTF8String(json::JSONConvert<SearchQuery>::ToJSON(query), false);
    tolmonet::FormList pairs;
    pairs.push_back(std::make_pair(kQ, q));
    pairs.push_back(std::make_pair(kMetadata, UTF8String("true")));
    UTF8String scope;
    if (!query.mScopes.empty()) {
        boost::any scopes = json::JSONArray();
        for (const UTF8String& path : query.mScopes) json::AppendToArray(scopes, boost::any(path));
        scope = json::GetJSONUTF8String(scopes, false);
        pairs.push_back(std::make_pair(kScope, scope));
    }
    const UTF8String url = mServerURL + "/search?" + tolmonet::QuoteURL(pairs);
    TOLMO_TRACE("Tarnvault", 8,
                "Search"
                    << ", q: " << q << ", scope: " << scope << ", url: " << RedactedForTrace(url)
                    << ", requestUID: " << requestUID);
    const bool taken = mProcessor->POST(requestUID, boost::bind(&_HandleSearch, success, error, _1, _2),
                                        ImmutableString::CreateDynamic(url), tolmonet::http::RequestProcessor::Body(),
                                        tolmonet::HeaderList(), tolmonet::Configuration());
    return Sent(taken, requestUID);
}

Guid Tarnvault::SearchOneAsync(const AssetCallback& success, const ErrorCallback& error, const SearchQuery& query,
                               const Guid& requestUID)
{
    return SearchAsync(boost::bind(&_HandleSearchOne, success, error, _1, _2), error, query, requestUID);
}

Guid Tarnvault::HeaderAsync(const AssetCallback& success, const ErrorCallback& error, const UTF8String& uid,
                            bool isCollection, const Guid& requestUID)
{
    const UTF8String url =
        mServerURL + (isCollection ? "/collections/" : "/assets/") + uid + (isCollection ? "/header" : "/metadata");
    TOLMO_TRACE("Tarnvault", 8,
                "Header"
                    << ", uid: " << uid << ", url: " << RedactedForTrace(url) << ", requestUID: " << requestUID);
    const bool taken =
        mProcessor->GET(requestUID, boost::bind(&_HandleHeader, uid, success, error, _1, _2),
                        ImmutableString::CreateDynamic(url), tolmonet::HeaderList(), tolmonet::Configuration());
    return Sent(taken, requestUID);
}

}  // namespace tarnvault
}  // namespace tolmonetsync
