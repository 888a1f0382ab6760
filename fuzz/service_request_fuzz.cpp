// The service's request handling on arbitrary requests: the route table,
// query and path values, and the JSON bodies of search, create, add and
// upload, answered as JSON in every answer style. A request may be refused
// (StoreFailure, one line), never crash the service or fail otherwise.
//
// Input: a byte choosing the method and the answer style, then the path,
// the query text and the body, separated by line feeds.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <string>

#include <httplib.h>
#include <stdlib.h>

#include "server/Accounts.h"
#include "server/AssetRoutes.h"
#include "server/AssetStore.h"
#include "server/ContentFiles.h"
#include "server/Database.h"
#include "server/Router.h"

using namespace tolmonetsync::server;

namespace {

struct Service {
    Service()
    {
        // Memory-backed where there is one: every write syncs.
        char pattern[] = "/dev/shm/service_request_fuzz.XXXXXX";
        char fallback[] = "/tmp/service_request_fuzz.XXXXXX";
        const char* directory = ::mkdtemp(pattern);
        if (!directory) directory = ::mkdtemp(fallback);
        if (!directory) std::abort();
        mDirectory = directory;
        mContent = std::make_unique<ContentFiles>(directory);
        mDatabase = std::make_unique<Database>(std::string(directory) + "/service.sqlite3");
        mAssets = std::make_unique<AssetStore>(*mDatabase, *mContent);
        mRouter = std::make_unique<Router>(AssetRoutes());
        mUser = Accounts(*mDatabase).EnsureUser("fuzz");
    }
    ~Service()
    {
        mAssets.reset();
        mDatabase.reset();
        std::error_code ignored;
        std::filesystem::remove_all(mDirectory, ignored);
    }

    std::string mDirectory;
    std::int64_t mUser = 0;
    std::unique_ptr<ContentFiles> mContent;
    std::unique_ptr<Database> mDatabase;
    std::unique_ptr<AssetStore> mAssets;
    std::unique_ptr<Router> mRouter;
};

std::string NextField(const std::string& text, std::size_t& at)
{
    const std::size_t end = text.find('\n', at);
    const std::string field = text.substr(at, end == std::string::npos ? std::string::npos : end - at);
    at = end == std::string::npos ? text.size() : end + 1;
    return field;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    static Service service;
    if (size == 0) return 0;
    static const char* const kMethods[] = {"GET", "POST", "PUT", "DELETE"};
    const std::string text(reinterpret_cast<const char*>(data) + 1, size - 1);
    std::size_t at = 0;

    httplib::Request request;
    request.method = kMethods[data[0] % 4];
    request.path = NextField(text, at);
    request.target = request.path + "?" + NextField(text, at);
    httplib::detail::parse_query_text(request.target.substr(request.path.size() + 1), request.params);
    request.body = text.substr(at);
    request.set_header("Content-Type", (data[0] & 4) ? "application/json" : "text/plain");
    httplib::Response response;

    AnswerStyle style;
    style.mIdForm = static_cast<IdForm>((data[0] >> 3) % 4);
    style.mAbsoluteLocation = data[0] & 32;
    style.mHeaderCase = static_cast<HeaderCase>((data[0] >> 6) % 3);
    style.mSizeAsString = data[0] & 64;
    style.mFractionalSeconds = data[0] & 128;
    Exchange exchange{request, response, {}, service.mUser, style, *service.mAssets, 8080};
    try {
        service.mRouter->Dispatch(exchange);
    } catch (const StoreFailure& refused) {
        if (refused.Status() < 400 || refused.Status() > 499) std::abort();
    }
    // Any other exception escapes, and the fuzzer reports it.
    return 0;
}
