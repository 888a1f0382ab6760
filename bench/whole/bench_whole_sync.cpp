// Whole syncs through the library against the local service on loopback:
// seconds, requests per second beside the floor of a plain libcurl loop for
// the same requests, and the client's peak memory. The service runs in a
// process of its own and every scenario in a child process of this one, so
// that each peak is the client's alone and its own.
//
//   tolmonetsync_whole_bench [RAW_FIGURES_FILE]

#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <map>
#include <mutex>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

#include <curl/curl.h>
#include <boost/json.hpp>
#include <boost/make_shared.hpp>

#include "bench/whole/FloorLoop.h"
#include "cli/SyncRun.h"
#include "foundation/core/Dir.h"
#include "foundation/core/HostConfig.h"
#include "foundation/net/ForwardingProcessor.h"
#include "foundation/net/HeaderConstants.h"
#include "sync/SyncFilesService.h"

namespace {

namespace fs = std::filesystem;
using namespace tolmonetsync;
using tolmocore::utility::ToUTF16;

const char kToken[] = "bench-token";
const int kSmallFiles = 1000;
const int kSmallSize = 4 * 1024;
const int kChanged = 100;
const int kLargeFiles = 10;
const std::uint64_t kLargeSize = 16ull * 1024 * 1024;
const std::uint64_t kLargeLimit = kLargeSize + 1;  // a file of exactly this size is not uploaded
const long kParallel = 6;                          // the processor's connections per host

// ---- the service, in a process of its own ----

class ServeProcess {
public:
    explicit ServeProcess(const fs::path& data)
    {
        int fds[2];
        if (pipe(fds) != 0) throw std::runtime_error("pipe");
        mPid = fork();
        if (mPid == 0) {
            dup2(fds[1], 1);
            close(fds[0]);
            const std::string dataDir = data.string();
            const std::string token = std::string("bench:") + kToken;
            execl(TOLMONETSYNC_CLI, TOLMONETSYNC_CLI, "serve", "--data", dataDir.c_str(), "--listen", "127.0.0.1:0",
                  "--token", token.c_str(), static_cast<char*>(nullptr));
            _exit(127);
        }
        close(fds[1]);
        FILE* output = fdopen(fds[0], "r");
        char line[256] = {};
        if (fgets(line, sizeof line, output) == nullptr) throw std::runtime_error("serve did not start");
        std::string base = std::string(line).substr(std::string("listening on ").size());
        while (!base.empty() && base.back() == '\n') base.pop_back();
        mApi = base + "/api";
        fclose(output);
    }
    ~ServeProcess()
    {
        kill(mPid, SIGTERM);
        waitpid(mPid, nullptr, 0);
    }
    const std::string& Api() const { return mApi; }

private:
    pid_t mPid = -1;
    std::string mApi;
};

// ---- the library's side, in a child process per scenario ----

// Counts the requests the library sends, by kind.
class CountingProcessor : public tolmonet::http::ForwardingProcessor {
public:
    using ForwardingProcessor::ForwardingProcessor;

    bool GET(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override
    {
        const std::string text = url.ToStdString();
        if (text.find("/assets/") != std::string::npos && text.find("/metadata") == std::string::npos)
            Count(tolmonet::FindHeader(headers, tolmonet::kHEADER_IF_NONE_MATCH) ? "conditional" : "download");
        else
            Count("small");
        return ForwardingProcessor::GET(id, handler, url, headers, configuration);
    }
    bool POST(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
              const Body& body, const tolmonet::HeaderList& headers,
              const tolmonet::Configuration& configuration) override
    {
        Count(url.ToStdString().find("/assets?") != std::string::npos ? "upload" : "small");
        return ForwardingProcessor::POST(id, handler, url, body, headers, configuration);
    }
    bool PUT(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const Body& body, const tolmonet::HeaderList& headers,
             const tolmonet::Configuration& configuration) override
    {
        Count("small");
        return ForwardingProcessor::PUT(id, handler, url, body, headers, configuration);
    }
    bool DEL(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override
    {
        Count("small");
        return ForwardingProcessor::DEL(id, handler, url, headers, configuration);
    }

    std::map<std::string, long> Counts()
    {
        std::lock_guard<std::mutex> lock(mMutex);
        return mCounts;
    }

private:
    void Count(const char* kind)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        ++mCounts[kind];
    }
    std::mutex mMutex;
    std::map<std::string, long> mCounts;
};

struct Setup {
    std::string mApi;
    fs::path mFolder;
    fs::path mPrefDir;
    std::string mGroup;
    std::uint64_t mMaxSize = kSmallSize * 16;
    fs::path mItemsFile;  // when set, the group's id and each item's id and tag are written here
    // The host's name: each name has a preferences root of its own, so the
    // large files' runs leave the small files' group alone.
    UTF16String mApp = u"WholeSync";
};

// One whole sync (prepare and pass) in this process; its figures as JSON.
boost::json::object SyncOnce(const Setup& setup)
{
    tolmocore::config::SetCompanyName(u"Bench");
    tolmocore::config::SetClientName(setup.mApp);
    tolmocore::config::SetClientInternalVersion(u"1.0");
    tolmocore::filesupport::Dir::SetPrefDir(tolmocore::filesupport::Dir(ToUTF16(setup.mPrefDir.string())));
    const auto counting = boost::make_shared<CountingProcessor>(tolmonet::http::GetGlobalRequestProcessor());
    tolmonet::http::SetGlobalRequestProcessor(counting);

    ParameterList parameters;
    parameters.emplace_back(tolmonet::kHEADER_LOCATION, UTF8String(setup.mApi.begin(), setup.mApi.end()));
    parameters.emplace_back(tolmonet::kHEADER_USER_AGENT, UTF8String(reinterpret_cast<const unsigned char*>("bench")));
    parameters.emplace_back(tolmonet::kHEADER_COOKIE, UTF8String(reinterpret_cast<const unsigned char*>(kToken)));
    const boost::shared_ptr<SyncFilesService> service = CreateSyncFilesService(SyncServiceType_Tarnvault, parameters);
    service->RegisterSyncDirectory(
        SyncDir(tolmocore::filesupport::Dir(ToUTF16(setup.mFolder.string())), u".bin", ToUTF16(setup.mGroup),
                ImmutableString::CreateStatic("application/octet-stream"), SyncMetadata_ModDate, setup.mMaxSize));

    const auto start = std::chrono::steady_clock::now();
    const cli::RunOutcome prepared = cli::RunPrepare(*service, ProgressCallback());
    if (!prepared.Ok()) throw std::runtime_error("prepare: " + prepared.mError);
    const cli::RunOutcome passed = cli::RunPass(*service, prepared.mCache, SyncMode_TwoWay);
    if (!passed.Ok()) throw std::runtime_error("pass: " + passed.mError);
    const double seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();

    boost::json::object counts;
    long requests = 0;
    for (const auto& count : counting->Counts()) {
        counts[count.first] = count.second;
        requests += count.second;
    }
    const SyncCache& cache = *prepared.mCache;
    if (!setup.mItemsFile.empty()) {
        std::ofstream items(setup.mItemsFile);
        for (const CachedSyncFile& record : cache.mFiles) {
            const boost::shared_ptr<Item> item = cache.GetItem(record);
            if (!item) continue;
            if (items.tellp() == 0) items << cache.GetCollection(record)->mId.ToStdString() << "\n";
            items << item->mId.ToStdString() << " " << record.mCachedServerEtag.ToStdString() << "\n";
        }
    }
    return boost::json::object{{"seconds", seconds},
                               {"requests", requests},
                               {"counts", counts},
                               {"uploaded", cache.mUploadCount},
                               {"downloaded", cache.mDownloadCount}};
}

// Runs the sync in a child process; adds its peak memory.
boost::json::object SyncInChild(const Setup& setup)
{
    int fds[2];
    if (pipe(fds) != 0) throw std::runtime_error("pipe");
    const pid_t pid = fork();
    if (pid == 0) {
        close(fds[0]);
        std::string text;
        try {
            text = boost::json::serialize(SyncOnce(setup));
        } catch (const std::exception& e) {
            text = boost::json::serialize(boost::json::object{{"error", e.what()}});
        }
        if (write(fds[1], text.data(), text.size()) < 0) _exit(1);
        _exit(0);  // the library's threads are left to the exit, as a host's are
    }
    close(fds[1]);
    std::string text;
    char buffer[4096];
    for (ssize_t got; (got = read(fds[0], buffer, sizeof buffer)) > 0;) text.append(buffer, static_cast<size_t>(got));
    close(fds[0]);
    int status = 0;
    rusage usage{};
    wait4(pid, &status, 0, &usage);
    boost::json::object result = boost::json::parse(text.empty() ? "{\"error\":\"no result\"}" : text).as_object();
    if (result.contains("error")) throw std::runtime_error(std::string(result["error"].as_string()));
    result["peakMiB"] = static_cast<double>(usage.ru_maxrss) / 1024.0;
    return result;
}

// ---- the floor ----

struct ItemList {
    std::string mGroupId;
    std::vector<std::pair<std::string, std::string> > mItems;  // id, quoted tag
};

ItemList ReadItems(const fs::path& path)
{
    ItemList list;
    std::ifstream stream(path);
    std::getline(stream, list.mGroupId);
    std::string id, etag;
    while (stream >> id >> etag) list.mItems.emplace_back(id, etag);
    return list;
}

std::string Bearer()
{
    return std::string("Authorization: Bearer ") + kToken;
}

// Downloads write each body to a file of its own in `saveIn`, as the library must.
double FloorGets(const std::string& api, const ItemList& list, bool conditional, const fs::path& saveIn)
{
    fs::create_directories(saveIn);
    std::vector<wholebench::FloorRequest> requests;
    for (const auto& item : list.mItems) {
        wholebench::FloorRequest request{"GET", api + "/assets/" + item.first, {Bearer()}, nullptr,
                                         200,   (saveIn / item.first).string()};
        if (conditional) {
            request.mHeaders.push_back("If-None-Match: " + item.second);
            request.mExpectStatus = 304;
            request.mSaveAs.clear();
        }
        requests.push_back(request);
    }
    return wholebench::RunFloor(requests, kParallel);
}

double FloorSmall(const std::string& api, const ItemList& list)
{
    std::vector<wholebench::FloorRequest> requests;
    for (const auto& item : list.mItems)
        requests.push_back({"GET", api + "/assets/" + item.first + "/metadata", {Bearer()}, nullptr, 200, ""});
    return wholebench::RunFloor(requests, kParallel);
}

double FloorUploads(const std::string& api, const std::string& groupId, const std::string& body, int count,
                    const std::string& prefix)
{
    // collections=["/api/collections/ID"], quoted
    const std::string collections = "%5B%22%2Fapi%2Fcollections%2F" + groupId + "%22%5D";
    std::vector<wholebench::FloorRequest> requests;
    for (int i = 0; i < count; ++i)
        requests.push_back({"POST",
                            api + "/assets?name=" + prefix + std::to_string(i) + ".floor&collections=" + collections,
                            {Bearer(), "Content-Type: application/octet-stream"},
                            &body,
                            201,
                            ""});
    return wholebench::RunFloor(requests, kParallel);
}

// ---- the run ----

void WriteFiles(const fs::path& folder, int count, std::uint64_t size, const std::string& salt)
{
    fs::create_directories(folder);
    for (int i = 0; i < count; ++i) {
        std::string bytes(size, '\0');
        for (std::uint64_t at = 0; at < size; at += 64)
            bytes[at] = static_cast<char>((i * 131 + at / 64 + salt.size()) & 0xff);
        bytes.replace(0, std::min<std::size_t>(bytes.size(), salt.size()), salt.substr(0, bytes.size()));
        std::ofstream(folder / ("f" + std::to_string(10000 + i) + ".bin"), std::ios::binary) << bytes;
    }
}

struct Row {
    std::string mName;
    boost::json::object mLibrary;
    double mFloorSeconds = 0;  // the floor's time for the same requests
    double mGoalSeconds = 0;   // 0: none
    double mGoalMiB = 0;
    double mBytes = 0;  // for MB/s rows
    double mGoalMBps = 0;
};

double Seconds(const boost::json::object& figures)
{
    return figures.at("seconds").as_double();
}
double Requests(const boost::json::object& figures)
{
    return static_cast<double>(figures.at("requests").as_int64());
}
long Count(const boost::json::object& figures, const char* kind)
{
    const auto& counts = figures.at("counts").as_object();
    return counts.contains(kind) ? static_cast<long>(counts.at(kind).as_int64()) : 0;
}

}  // namespace

int main(int argc, char** argv)
{
    const fs::path raw = argc > 1 ? fs::path(argv[1]) : fs::path("bench-whole-sync.json");
    char pattern[] = "/tmp/tolmonetsync-whole-bench-XXXXXX";
    if (mkdtemp(pattern) == nullptr) return 1;
    const fs::path work = pattern;
    int status = 0;
    try {
        ServeProcess serve(work / "service");
        const std::string& api = serve.Api();
        std::vector<Row> rows;

        // The library's runs.
        WriteFiles(work / "a", kSmallFiles, kSmallSize, "first");
        Setup small{api, work / "a", work / "pref-a", "Small", kSmallSize * 16, {}};
        Row first{"first upload, 1,000 x 4 KiB", SyncInChild(small)};
        first.mGoalSeconds = 1.6;
        first.mGoalMiB = 100;
        Row unchanged{"two-way, nothing changed", SyncInChild(small)};
        unchanged.mGoalSeconds = 0.25;
        unchanged.mGoalMiB = 100;
        for (int i = 0; i < kChanged; ++i)
            std::ofstream(work / "a" / ("f" + std::to_string(10000 + i * (kSmallFiles / kChanged)) + ".bin"),
                          std::ios::binary)
                << std::string(kSmallSize, 'c');
        Row changed{"after 100 local changes", SyncInChild(small)};
        changed.mGoalSeconds = 0.3;
        changed.mGoalMiB = 100;
        Setup download{api, work / "b", work / "pref-b", "Small", kSmallSize * 16, work / "small-items.txt"};
        fs::create_directories(work / "b");
        Row downloaded{"download 1,000 into an empty folder", SyncInChild(download)};
        downloaded.mGoalSeconds = 0.6;
        downloaded.mGoalMiB = 100;

        WriteFiles(work / "c", kLargeFiles, kLargeSize, "large");
        WriteFiles(work / "c-limit", 1, kLargeLimit, "limit");
        fs::rename(work / "c-limit" / "f10000.bin", work / "c" / "limit.bin");
        Setup large{api, work / "c", work / "pref-c", "Large", kLargeLimit, {}, u"WholeSyncLarge"};
        Row up{"10 x 16 MiB up", SyncInChild(large)};
        Setup largeDown{
            api, work / "d", work / "pref-d", "Large", kLargeLimit, work / "large-items.txt", u"WholeSyncLarge"};
        fs::create_directories(work / "d");
        Row down{"10 x 16 MiB down", SyncInChild(largeDown)};
        const double largeBytes = static_cast<double>(kLargeFiles * kLargeSize);
        up.mBytes = down.mBytes = largeBytes;
        up.mGoalMBps = 229;
        down.mGoalMBps = 352;
        up.mGoalMiB = down.mGoalMiB = 3 * largeBytes / (1024 * 1024);
        if (up.mLibrary.at("uploaded").as_int64() != kLargeFiles || fs::exists(work / "d" / "limit.bin"))
            throw std::runtime_error("the file at the size limit was uploaded");

        // The floor, per kind of request, on the same service.
        const ItemList smallItems = ReadItems(work / "small-items.txt");
        const ItemList largeItems = ReadItems(work / "large-items.txt");
        const double n = static_cast<double>(smallItems.mItems.size());
        const double conditionalRate = n / FloorGets(api, smallItems, true, work / "floor-conditional");
        const double downloadRate = n / FloorGets(api, smallItems, false, work / "floor-small");
        const double smallRate = n / FloorSmall(api, smallItems);
        const std::string smallBody(kSmallSize, 'f');
        const double uploadRate = kSmallFiles / FloorUploads(api, smallItems.mGroupId, smallBody, kSmallFiles, "s");
        const double largeDownRate =
            static_cast<double>(largeItems.mItems.size()) / FloorGets(api, largeItems, false, work / "floor-large");
        const std::string largeBody(kLargeSize, 'F');
        const double largeUpRate = kLargeFiles / FloorUploads(api, largeItems.mGroupId, largeBody, kLargeFiles, "l");

        rows = {first, unchanged, changed, downloaded, up, down};
        for (Row& row : rows) {
            const bool isLarge = row.mBytes > 0;
            row.mFloorSeconds = Count(row.mLibrary, "conditional") / conditionalRate +
                                Count(row.mLibrary, "download") / (isLarge ? largeDownRate : downloadRate) +
                                Count(row.mLibrary, "upload") / (isLarge ? largeUpRate : uploadRate) +
                                Count(row.mLibrary, "small") / smallRate;
        }

        // The table, and the raw figures.
        boost::json::array figures;
        std::printf("%-38s %8s %8s %9s %11s %7s %9s  %s\n", "whole sync", "seconds", "requests", "req/s", "floor req/s",
                    "ratio", "peak MiB", "goals");
        for (const Row& row : rows) {
            const double seconds = Seconds(row.mLibrary);
            const double requests = Requests(row.mLibrary);
            const double ratio = row.mFloorSeconds / seconds;
            const double peak = row.mLibrary.at("peakMiB").as_double();
            std::ostringstream goals;
            goals << (ratio >= 0.8 ? "floor ok" : "floor MISSED");
            if (row.mGoalSeconds > 0)
                goals << (seconds <= row.mGoalSeconds ? ", time ok" : ", time MISSED") << " (<= " << row.mGoalSeconds
                      << " s)";
            if (row.mGoalMBps > 0) {
                const double rate = row.mBytes / (1024 * 1024) / seconds;
                goals << ", " << static_cast<int>(rate) << " MiB/s" << (rate >= row.mGoalMBps ? " ok" : " MISSED")
                      << " (>= " << row.mGoalMBps << ")";
            }
            goals << (peak < row.mGoalMiB ? ", memory ok" : ", memory MISSED");
            std::printf("%-38s %8.3f %8.0f %9.0f %11.0f %6.0f%% %9.1f  %s\n", row.mName.c_str(), seconds, requests,
                        requests / seconds, requests / row.mFloorSeconds, 100 * ratio, peak, goals.str().c_str());
            boost::json::object entry = row.mLibrary;
            entry["name"] = row.mName;
            entry["floorSeconds"] = row.mFloorSeconds;
            figures.push_back(entry);
        }
        boost::json::object floors{
            {"conditional", conditionalRate}, {"download", downloadRate},       {"small", smallRate},
            {"upload", uploadRate},           {"largeDownload", largeDownRate}, {"largeUpload", largeUpRate}};
        std::ofstream(raw) << boost::json::serialize(
                                  boost::json::object{{"runs", figures}, {"floorRequestsPerSecond", floors}})
                           << "\n";
        std::printf(
            "floor req/s by kind: conditional %.0f, download %.0f, upload %.0f, small JSON %.0f, "
            "16 MiB download %.1f, 16 MiB upload %.1f\nraw figures: %s\n",
            conditionalRate, downloadRate, uploadRate, smallRate, largeDownRate, largeUpRate,
            fs::absolute(raw).string().c_str());
    } catch (const std::exception& e) {
        std::fprintf(stderr, "whole-sync bench: %s\n", e.what());
        status = 1;
    }
    std::error_code error;
    if (!std::getenv("WHOLE_BENCH_KEEP")) fs::remove_all(work, error);
    return status;
}
