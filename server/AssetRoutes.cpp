#include "server/AssetRoutes.h"

#include "server/AssetJson.h"
#include "server/AssetStore.h"
#include "server/RequestParsing.h"

namespace tolmonetsync {
namespace server {

namespace {

const char kJsonMediaType[] = "application/json";

std::string Required(const Exchange& exchange, const char* key)
{
    bool present = false;
    std::string value = exchange.Query(key, &present);
    if (!present) throw StoreFailure(400, std::string("the query needs \"") + key + "\"");
    return value;
}

void Search(Exchange& exchange)
{
    const SearchFilter filter = ParseSearchQuery(Required(exchange, "q"));
    bool scoped = false;
    const std::string scopeText = exchange.Query("scope", &scoped);
    const std::vector<std::string> scopes = scoped ? ParseScopes(scopeText) : std::vector<std::string>();
    const std::vector<AssetRecord> found = exchange.mAssets.Search(exchange.mUser, filter, scopes);
    exchange.Json(200, AssetListText(found, exchange.mStyle));
}

void ClientRoot(Exchange& exchange)
{
    const std::string name = Required(exchange, "name");
    if (name.empty()) throw StoreFailure(400, "a client root needs a name");
    const AssetRecord root = exchange.mAssets.ClientRoot(exchange.mUser, name);
    exchange.Json(200, AssetListText(std::vector<AssetRecord>(1, root), exchange.mStyle));
}

void CreateCollection(Exchange& exchange)
{
    if (exchange.mRequest.get_header_value("Content-Type").compare(0, sizeof(kJsonMediaType) - 1, kJsonMediaType) !=
        0) {
        throw StoreFailure(400, "a create takes a JSON body");
    }
    const CreateRequest request = ParseCreateBody(exchange.mRequest.body);
    const AssetRecord created = exchange.mAssets.CreateCollection(exchange.mUser, request.mName, request.mType);
    exchange.Header("Location", exchange.Location(true, created.mId));
    exchange.Json(201, AssetText(created, exchange.mStyle));
}

void Header(Exchange& exchange)
{
    exchange.Json(200, AssetText(exchange.mAssets.Get(exchange.mUser, exchange.mParams.at(0)), exchange.mStyle));
}

void ListMembers(Exchange& exchange)
{
    exchange.Json(200,
                  AssetListText(exchange.mAssets.Members(exchange.mUser, exchange.mParams.at(0)), exchange.mStyle));
}

void AddMembers(Exchange& exchange)
{
    const std::vector<std::string> ids = ParseMemberPaths(exchange.mRequest.body);
    exchange.mAssets.Add(exchange.mUser, exchange.mParams.at(0), ids);
    exchange.Json(200, "{}");
}

void Delete(Exchange& exchange)
{
    bool present = false;
    const std::string flag = exchange.Query("recursive", &present);
    exchange.mAssets.Delete(exchange.mUser, exchange.mParams.at(0), ParseRecursive(flag, present));
    exchange.Json(200, "{}");
}

void Upload(Exchange& exchange)
{
    const std::string name = Required(exchange, "name");
    if (name.empty()) throw StoreFailure(400, "an upload needs a name");
    const std::vector<std::string> collections = ParseUploadCollections(Required(exchange, "collections"));
    const std::string type = exchange.mRequest.get_header_value("Content-Type");
    const AssetRecord item =
        exchange.mUpload ? exchange.mAssets.Upload(exchange.mUser, collections, name, type, *exchange.mUpload)
                         : exchange.mAssets.Upload(exchange.mUser, collections, name, type, exchange.mRequest.body);
    exchange.Header("Location", exchange.Location(false, item.mId));
    exchange.Header("ETag", item.mEtag);
    exchange.Json(201, AssetText(item, exchange.mStyle));
}

void Download(Exchange& exchange)
{
    AssetRecord item;
    std::string bytes = exchange.mAssets.Content(exchange.mUser, exchange.mParams.at(0), item);
    exchange.Header("ETag", item.mEtag);
    exchange.Header("Last-Modified", HttpDate(item.mModified));
    const std::string wanted = exchange.mRequest.get_header_value("If-None-Match");
    if (!wanted.empty() && wanted == item.mEtag) {
        exchange.mResponse.status = 304;
        return;
    }
    exchange.mResponse.status = 200;
    exchange.mResponse.set_content(std::move(bytes), item.mMediaType.c_str());
}

}  // namespace

std::vector<Route> AssetRoutes()
{
    return {
        {"POST", "/api/search", Search},
        {"GET", "/api/collections", ClientRoot},
        {"POST", "/api/collections", CreateCollection},
        {"GET", "/api/collections/([^/]+)/header", Header},
        {"GET", "/api/assets/([^/]+)/metadata", Header},
        {"GET", "/api/collections/([^/]+)/members", ListMembers},
        {"PUT", "/api/collections/([^/]+)/members", AddMembers},
        {"DELETE", "/api/collections/([^/]+)", Delete},
        {"DELETE", "/api/assets/([^/]+)", Delete},
        {"POST", "/api/assets", Upload},
        {"GET", "/api/assets/([^/]+)", Download},
    };
}

}  // namespace server
}  // namespace tolmonetsync
