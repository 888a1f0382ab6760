#pragma once
// Drives a whole sync from a test: a service over any SyncServer, and
// blocking wrappers around the asynchronous prepare, pass and preview.

#include <condition_variable>
#include <mutex>
#include <string>

#include "sync/SyncFilesService.h"
#include "sync/SyncPreview.h"

namespace synctest {

using namespace tolmonetsync;

// The plan of a service over a given server.
class ServerCache final : public SyncCache {
public:
    ServerCache(const boost::shared_ptr<SyncServer>& server, const std::vector<SyncFile>& files,
                const std::vector<SyncDir>& dirs, const ProgressCallback& progress, const ItemToFileCallback& itemToFile)
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
        return boost::shared_ptr<SyncCache>(new ServerCache(mServer, files, dirs, progress, itemToFile));
    }

private:
    boost::shared_ptr<SyncServer> mServer;
};

// What one asynchronous run ended with. Waits are bounded so a lost
// callback fails the test instead of hanging it.
struct RunResult {
    bool mStarted = false;
    bool mFinished = false;     // success came
    std::string mError;         // the first error, if any came
    int mErrorCount = 0;
    int mMoved = -1;            // the pass's count
    boost::shared_ptr<SyncCache> mCache;
    boost::shared_ptr<SyncPreview> mPreview;

    bool Ok() const { return mStarted && mFinished && mErrorCount == 0; }
};

class SyncHarness {
public:
    explicit SyncHarness(const boost::shared_ptr<SyncServer>& server) : mService(server) {}

    HarnessService& Service() { return mService; }

    RunResult Prepare(const ItemToFileCallback& itemToFile = ItemToFileCallback());
    RunResult Pass(const boost::shared_ptr<SyncCache>& cache, SyncMode mode);
    RunResult Preview(SyncMode mode);
    // Prepare, then the pass; the result of whichever failed first.
    RunResult Sync(SyncMode mode);

private:
    HarnessService mService;
};

}  // namespace synctest
