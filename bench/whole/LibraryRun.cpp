#include "bench/whole/LibraryRun.h"

#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <fstream>
#include <map>
#include <mutex>
#include <stdexcept>

#include <boost/json.hpp>
#include <boost/make_shared.hpp>

#include "bench/whole/ServeProcess.h"
#include "cli/SyncRun.h"
#include "foundation/core/Dir.h"
#include "foundation/core/HostConfig.h"
#include "foundation/net/ForwardingProcessor.h"
#include "foundation/net/HeaderConstants.h"
#include "sync/SyncFilesService.h"

namespace wholebench {

namespace {

using namespace tolmonetsync;
using tolmocore::utility::ToUTF16;

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
    parameters.emplace_back(tolmonet::kHEADER_COOKIE, UTF8String(reinterpret_cast<const unsigned char*>(kBenchToken)));
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

}  // namespace

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

}  // namespace wholebench
