#include "server/AssetRoutes.h"

#include <algorithm>
#include <memory>
#include <vector>

#include "server/AssetJson.h"
#include "server/AssetStore.h"
#include "server/RequestParsing.h"

namespace tolmonetsync {
namespace server {

namespace {

const char kJsonMediaType[] = "application/json";
// How much of an item's content is read for one write to the connection.
constexpr std::size_t kSendChunk = 256 * 1024;

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
    const std::string& id = exchange.mParams.at(0);
    const AssetRecord item = exchange.mAssets.Item(exchange.mUser, id);
    exchange.Header("ETag", item.mEtag);
    exchange.Header("Last-Modified", HttpDate(item.mModified));
    const std::string wanted = exchange.mRequest.get_header_value("If-None-Match");
    if (!wanted.empty() && wanted == item.mEtag) {
        exchange.mResponse.status = 304;
        return;
    }
    // The bytes go out from their file as the connection takes them, so a
    // large item costs the service no more memory than a small one.
    const std::shared_ptr<const ContentFiles::Opened> content = exchange.mAssets.OpenContent(id);
    const std::uint64_t size = content->Size();
    exchange.mResponse.status = 200;
    if (size == 0) {
        exchange.mResponse.set_content(std::string(), item.mMediaType.c_str());
        return;
    }
    const auto buffer = std::make_shared<std::vector<char> >(std::min<std::uint64_t>(size, kSendChunk));
    exchange.mResponse.set_content_provider(
        static_cast<std::size_t>(size), item.mMediaType.c_str(),
        [content, buffer](std::size_t offset, std::size_t length, httplib::DataSink& sink) {
            const std::size_t got = content->ReadAt(offset, buffer->data(), std::min(length, buffer->size()));
            // A file that shrank cannot give what was announced: the connection ends.
            return got > 0 && sink.write(buffer->data(), got);
        });
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
