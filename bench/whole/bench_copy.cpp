// Copy of a tree of 500 items in 50 collections, three levels deep, from one
// collection to another on the local service: seconds, requests per second
// and the peak disk use of the copy's temporary files.
//
//   tolmonetsync_copy_bench

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <mutex>
#include <thread>

#include <boost/make_shared.hpp>

#include "foundation/net/ForwardingProcessor.h"
#include "foundation/net/HeaderConstants.h"
#include "server/LocalService.h"
#include "server/TreeSeeder.h"
#include "tarnvault/Tarnvault.h"

namespace {

namespace fs = std::filesystem;
using namespace tolmonetsync;

const int kTopCollections = 5;       // 5 at the top, 3 levels: 5 + 15 + 30 = 50 collections
const int kItemsPerCollection = 10;  // 500 items
const std::size_t kItemSize = 16 * 1024;

// Counts every request the client sends.
class CountingProcessor : public tolmonet::http::ForwardingProcessor {
public:
    using ForwardingProcessor::ForwardingProcessor;
    bool GET(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override
    {
        ++mRequests;
        return ForwardingProcessor::GET(id, handler, url, headers, configuration);
    }
    bool POST(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
              const Body& body, const tolmonet::HeaderList& headers,
              const tolmonet::Configuration& configuration) override
    {
        ++mRequests;
        return ForwardingProcessor::POST(id, handler, url, body, headers, configuration);
    }
    bool PUT(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const Body& body, const tolmonet::HeaderList& headers,
             const tolmonet::Configuration& configuration) override
    {
        ++mRequests;
        return ForwardingProcessor::PUT(id, handler, url, body, headers, configuration);
    }
    std::atomic<long> mRequests{0};
};

void SeedLevel(server::TreeSeeder& seed, const std::string& parent, int depth, int collections, int& made)
{
    for (int c = 0; c < collections; ++c) {
        const std::string collection =
            seed.Collection(parent, "level" + std::to_string(depth) + "-" + std::to_string(c));
        ++made;
        for (int i = 0; i < kItemsPerCollection; ++i)
            seed.Item(collection, "item" + std::to_string(i) + ".bin",
                      std::string(kItemSize, static_cast<char>('a' + i)));
        if (depth < 3) SeedLevel(seed, collection, depth + 1, depth == 1 ? 3 : 2, made);
    }
}

std::uintmax_t DirectoryBytes(const fs::path& directory)
{
    std::uintmax_t bytes = 0;
    std::error_code error;
    for (fs::directory_iterator it(directory, error), end; !error && it != end; it.increment(error)) {
        std::error_code sizeError;
        const std::uintmax_t size = it->file_size(sizeError);
        if (!sizeError) bytes += size;
    }
    return bytes;
}

}  // namespace

int main()
{
    char pattern[] = "/tmp/tolmonetsync-copy-bench-XXXXXX";
    if (mkdtemp(pattern) == nullptr) return 1;
    const fs::path work = pattern;
    fs::create_directories(work / "tmp");
    setenv("TMPDIR", (work / "tmp").c_str(), 1);
    int status = 0;
    try {
        server::LocalServiceOptions options;
        options.mDataDirectory = (work / "service").string();
        options.mTokens.push_back({"bench", "tok"});
        server::LocalService service(options);
        service.Start();
        server::TreeSeeder seed(service, "bench");
        const std::string clientRoot = seed.ClientRoot("bench");
        const std::string source = seed.Collection(clientRoot, "source");
        const std::string target = seed.Collection(clientRoot, "target");
        int collections = 0;
        SeedLevel(seed, source, 1, kTopCollections, collections);

        const auto counting = boost::make_shared<CountingProcessor>(tolmonet::http::GetGlobalRequestProcessor());
        tolmonet::http::SetGlobalRequestProcessor(counting);
        ParameterList parameters;
        const std::string url = service.AssetServiceUrl();
        parameters.emplace_back(tolmonet::kHEADER_LOCATION, UTF8String(url.begin(), url.end()));
        parameters.emplace_back(tolmonet::kHEADER_USER_AGENT,
                                UTF8String(reinterpret_cast<const unsigned char*>("bench")));
        parameters.emplace_back(tolmonet::kHEADER_COOKIE, UTF8String(reinterpret_cast<const unsigned char*>("tok")));
        const boost::shared_ptr<tarnvault::Tarnvault> client(new tarnvault::Tarnvault(parameters));
        const auto sourceCollection = boost::make_shared<Collection>();
        sourceCollection->mId = UTF8String(source.begin(), source.end());
        const auto targetCollection = boost::make_shared<Collection>();
        targetCollection->mId = UTF8String(target.begin(), target.end());

        std::mutex mutex;
        std::condition_variable ended;
        bool done = false;
        std::string error;
        std::atomic<std::uintmax_t> peak{0};
        std::atomic<bool> sampling{true};
        std::thread sampler([&] {
            while (sampling) {
                const std::uintmax_t now = DirectoryBytes(work / "tmp");
                if (now > peak) peak = now;
                std::this_thread::sleep_for(std::chrono::milliseconds(1));
            }
        });
        const auto start = std::chrono::steady_clock::now();
        client->CopyAsync(
            [&](const Guid&) {
                std::lock_guard<std::mutex> lock(mutex);
                done = true;
                ended.notify_all();
            },
            [&](const Guid&, const boost::shared_ptr<tolmonet::Response>& response) {
                std::lock_guard<std::mutex> lock(mutex);
                error = response ? response->BodyText().ToStdString() : "no response";
                done = true;
                ended.notify_all();
            },
            sourceCollection, targetCollection, Guid::CreateUnique(), tarnvault::Tarnvault::NameMap());
        {
            std::unique_lock<std::mutex> lock(mutex);
            ended.wait(lock, [&] { return done; });
        }
        const double seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
        sampling = false;
        sampler.join();
        if (!error.empty()) throw std::runtime_error("the copy failed: " + error);
        if (seed.Describe(source) != seed.Describe(target))
            throw std::runtime_error("the copy differs from its source");
        std::printf(
            "copy of %d items in %d collections, 3 levels: %.3f s, %ld requests, %.0f req/s, "
            "peak temporary disk use %.1f MiB (%.1f MiB of content)\n",
            collections * kItemsPerCollection, collections, seconds, counting->mRequests.load(),
            counting->mRequests.load() / seconds, peak.load() / 1048576.0,
            collections * kItemsPerCollection * kItemSize / 1048576.0);
        service.Stop();
    } catch (const std::exception& e) {
        std::fprintf(stderr, "copy bench: %s\n", e.what());
        status = 1;
    }
    std::error_code ignored;
    fs::remove_all(work, ignored);
    return status;
}
