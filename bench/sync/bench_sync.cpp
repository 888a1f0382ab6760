// Whole syncs against the local service in this process over loopback, and
// the content checksum against the xxh128sum command on the same file.
//
// Scale: prepare and pass over 1,000 and 10,000 files of one group should
// cost about ten times as much, not a hundred: compare the two figures of
// each benchmark (the goal is a ratio of at most 11).

#include <benchmark/benchmark.h>

#include <condition_variable>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <mutex>
#include <stdexcept>

#include "foundation/net/HeaderConstants.h"
#include "server/LocalService.h"
#include "sync/SyncFilesService.h"
#include "tarnvault/Tarnvault.h"

using namespace tolmonetsync;
namespace fs = std::filesystem;

namespace {

const char kToken[] = "bench-token";

// A directory of its own under /tmp, removed with the object.
class ScratchDir {
public:
    ScratchDir()
    {
        char pattern[] = "/tmp/tolmonetsync-sync-bench-XXXXXX";
        if (mkdtemp(pattern) == nullptr) throw std::runtime_error("mkdtemp failed");
        mPath = pattern;
    }
    ~ScratchDir()
    {
        std::error_code ignored;
        fs::remove_all(mPath, ignored);
    }
    const fs::path& Path() const { return mPath; }

private:
    fs::path mPath;
};

// The local service on a free port, with one user holding kToken.
class Service {
public:
    Service()
    {
        server::LocalServiceOptions options;
        options.mDataDirectory = mData.Path().string();
        options.mTokens.push_back({"bench", kToken});
        mService.reset(new server::LocalService(options));
        mService->Start();
    }
    ~Service() { mService->Stop(); }

    boost::shared_ptr<SyncServer> Client() const
    {
        ParameterList parameters;
        parameters.emplace_back(tolmonet::kHEADER_LOCATION, UTF8String(mService->AssetServiceUrl()));
        parameters.emplace_back(tolmonet::kHEADER_USER_AGENT, UTF8String("bench"));
        parameters.emplace_back(tolmonet::kHEADER_COOKIE, UTF8String(kToken));
        return boost::shared_ptr<SyncServer>(new tarnvault::Tarnvault(parameters));
    }

private:
    ScratchDir mData;
    std::unique_ptr<server::LocalService> mService;
};

class BenchCache final : public SyncCache {
public:
    BenchCache(const boost::shared_ptr<SyncServer>& server, const std::vector<SyncFile>& files,
               const std::vector<SyncDir>& dirs)
        : SyncCache(files, dirs, ProgressCallback(), ItemToFileCallback()), mServer(server)
    {
    }
    const boost::shared_ptr<SyncServer>& GetApi() const override { return mServer; }

private:
    boost::shared_ptr<SyncServer> mServer;
};

class BenchService final : public SyncFilesService {
public:
    explicit BenchService(const boost::shared_ptr<SyncServer>& server)
        : SyncFilesService(ParameterList()), mServer(server)
    {
    }
    const boost::shared_ptr<SyncServer>& GetApi() const override { return mServer; }
    SyncServiceType GetType() const override { return SyncServiceType_Tarnvault; }
    boost::shared_ptr<SyncCache> CreateCache(const std::vector<SyncFile>& files, const std::vector<SyncDir>& dirs,
                                             const ProgressCallback&, const ItemToFileCallback&) override
    {
        return boost::shared_ptr<SyncCache>(new BenchCache(mServer, files, dirs));
    }

private:
    boost::shared_ptr<SyncServer> mServer;
};

// Runs prepare and pass to the end; aborts the benchmark on failure.
void SyncOnce(BenchService& service, benchmark::State& state)
{
    std::mutex mutex;
    std::condition_variable done;
    bool finished = false;
    std::string failure;
    auto fail = [&](const UTF16String& text) {
        std::lock_guard<std::mutex> lock(mutex);
        failure = tolmocore::utility::ToNarrow(text);
        finished = true;
        done.notify_all();
    };
    service.PrepareSync(
        [&](const boost::shared_ptr<SyncCache>& cache) {
            service.DoSync(
                cache,
                [&](int) {
                    std::lock_guard<std::mutex> lock(mutex);
                    finished = true;
                    done.notify_all();
                },
                fail, SyncMode_TwoWay);
        },
        fail, ProgressCallback(), ItemToFileCallback());
    std::unique_lock<std::mutex> lock(mutex);
    done.wait(lock, [&] { return finished; });
    if (!failure.empty()) state.SkipWithError(failure.c_str());
}

struct Desk {
    ScratchDir mPrefs;
    ScratchDir mFiles;
    Service mServer;
    std::unique_ptr<BenchService> mService;

    explicit Desk(int count)
    {
        Dir::SetPrefDir(Dir(tolmocore::utility::ToUTF16(mPrefs.Path().string())));
        for (int i = 0; i < count; ++i)
            std::ofstream(mFiles.Path() / ("preset-" + std::to_string(i) + ".xmp")) << "content " << i;
        mService.reset(new BenchService(mServer.Client()));
        mService->RegisterSyncDirectory(SyncDir(Dir(tolmocore::utility::ToUTF16(mFiles.Path().string())), u".xmp",
                                                u"Presets", ImmutableString::CreateStatic("text/xml"),
                                                SyncMetadata_ModDate, 1 << 20));
    }
};

// The first sync: every file goes up.
void BM_FirstSync(benchmark::State& state)
{
    for (auto _ : state) {
        state.PauseTiming();
        Desk desk(static_cast<int>(state.range(0)));
        state.ResumeTiming();
        SyncOnce(*desk.mService, state);
        state.PauseTiming();
        desk.mService.reset();
        state.ResumeTiming();
    }
    state.SetItemsProcessed(state.iterations() * state.range(0));
}

// A sync with nothing changed: one conditional download per file.
void BM_Resync(benchmark::State& state)
{
    Desk desk(static_cast<int>(state.range(0)));
    SyncOnce(*desk.mService, state);
    for (auto _ : state) SyncOnce(*desk.mService, state);
    state.SetItemsProcessed(state.iterations() * state.range(0));
}

// The engine's checksum of a 64 MiB file, and the xxh128sum command on it.
struct BigFile {
    ScratchDir mDir;
    fs::path mPath = mDir.Path() / "big.bin";
    BigFile()
    {
        std::ofstream out(mPath, std::ios::binary);
        std::string block(1 << 20, '\0');
        for (int mib = 0; mib < 64; ++mib) {
            for (std::size_t i = 0; i < block.size(); ++i) block[i] = static_cast<char>(i * 7 + mib);
            out.write(block.data(), static_cast<std::streamsize>(block.size()));
        }
    }
};

void BM_ChecksumEngine(benchmark::State& state)
{
    BigFile big;
    CachedSyncFile record;
    record.mFile = File(tolmocore::utility::ToUTF16(big.mPath.string()));
    for (auto _ : state) benchmark::DoNotOptimize(record.ComputeChecksum());
    state.SetBytesProcessed(state.iterations() * (64ll << 20));
}

void BM_ChecksumXxh128sum(benchmark::State& state)
{
    BigFile big;
    const std::string command = "xxh128sum '" + big.mPath.string() + "' > /dev/null";
    if (std::system("command -v xxh128sum > /dev/null") != 0) {
        state.SkipWithError("xxh128sum is not installed (Debian package xxhash)");
        return;
    }
    for (auto _ : state) {
        if (std::system(command.c_str()) != 0) state.SkipWithError("xxh128sum failed");
    }
    state.SetBytesProcessed(state.iterations() * (64ll << 20));
}

}  // namespace

BENCHMARK(BM_FirstSync)->Arg(1000)->Arg(10000)->Unit(benchmark::kMillisecond)->UseRealTime()->Iterations(2);
BENCHMARK(BM_Resync)->Arg(1000)->Arg(10000)->Unit(benchmark::kMillisecond)->UseRealTime()->Iterations(2);
BENCHMARK(BM_ChecksumEngine)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(BM_ChecksumXxh128sum)->Unit(benchmark::kMillisecond)->UseRealTime();
