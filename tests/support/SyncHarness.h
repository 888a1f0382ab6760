#pragma once
// Drives whole syncs from a test: a service over any SyncServer, and blocking
// wrappers around the asynchronous prepare, pass and preview that wait, as the
// command does, until the last handler has let go of the run's callbacks.
//
// Threads: call from one test thread; callbacks may come on any thread.

#include <filesystem>
#include <string>

#include "support/TestScopes.h"
#include "sync/SyncFilesService.h"
#include "sync/SyncPreview.h"

namespace synctest {

using namespace tolmonetsync;
using testsupport::PrefDirScope;
using testsupport::TraceCapture;

inline UTF16String Path(const std::filesystem::path& path)
{
    return tolmocore::utility::ToUTF16(path.string());
}
inline File FileAt(const std::filesystem::path& path)
{
    return File(Path(path));
}
inline Dir DirAt(const std::filesystem::path& path)
{
    return Dir(Path(path));
}
// The bytes of the cache file in `prefDir`, or "<none>".
std::string CacheFileIn(const std::filesystem::path& prefDir);

// A plan over `server`; without one, a plan whose server is never asked (for
// the scan, the cache file and the local file operations).
class TestCache final : public SyncCache {
public:
    TestCache(const std::vector<SyncFile>& files, const std::vector<SyncDir>& dirs,
              const boost::shared_ptr<SyncServer>& server = boost::shared_ptr<SyncServer>(),
              const ProgressCallback& progress = ProgressCallback(),
              const ItemToFileCallback& itemToFile = ItemToFileCallback())
        : SyncCache(files, dirs, progress, itemToFile), mServer(server)
    {
    }
    const boost::shared_ptr<SyncServer>& GetApi() const override { return mServer; }

private:
    boost::shared_ptr<SyncServer> mServer;
};

class HarnessService final : public SyncFilesService {
public:
    explicit HarnessService(const boost::shared_ptr<SyncServer>& server)
        : SyncFilesService(ParameterList()), mServer(server)
    {
    }
    const boost::shared_ptr<SyncServer>& GetApi() const override { return mServer; }
    SyncServiceType GetType() const override { return SyncServiceType_Tarnvault; }
    boost::shared_ptr<SyncCache> CreateCache(const std::vector<SyncFile>& files, const std::vector<SyncDir>& dirs,
                                             const ProgressCallback& progress,
                                             const ItemToFileCallback& itemToFile) override
    {
        return boost::shared_ptr<SyncCache>(new TestCache(files, dirs, mServer, progress, itemToFile));
    }

private:
    boost::shared_ptr<SyncServer> mServer;
};

// Everything one run's callbacks said, gathered once the run is over.
struct RunResult {
    bool mStarted = false;
    bool mFinished = false;  // success came (it may follow an error)
    std::string mError;      // the first error, if any came
    int mErrorCount = 0;
    int mMoved = -1;  // the pass's count
    boost::shared_ptr<SyncCache> mCache;
    boost::shared_ptr<SyncPreview> mPreview;

    bool Ok() const { return mStarted && mFinished && mErrorCount == 0; }
};

class SyncHarness {
public:
    explicit SyncHarness(const boost::shared_ptr<SyncServer>& server) : mService(server) {}

    HarnessService& Service() { return mService; }

    // Exceptions of PrepareSync pass out.
    RunResult Prepare(const ProgressCallback& progress = ProgressCallback(),
                      const ItemToFileCallback& itemToFile = ItemToFileCallback());
    RunResult Pass(const boost::shared_ptr<SyncCache>& cache, SyncMode mode);
    RunResult Preview(SyncMode mode);
    // Prepare, then the pass; the result of whichever failed first.
    RunResult Sync(SyncMode mode, const ProgressCallback& progress = ProgressCallback(),
                   const ItemToFileCallback& itemToFile = ItemToFileCallback());

private:
    HarnessService mService;
};

}  // namespace synctest
