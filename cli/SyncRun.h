#pragma once
// Blocking runs of a service's asynchronous calls, for a program that has
// nothing else to do while they run.
//
// Each run waits until every request it started has finished, whatever the
// callbacks said: its callbacks are shared by every handler of the run, so
// the run is over when the last copy of them is gone. The first error is
// kept; an error makes the run a failure even if success follows (requests
// that could not be queued report at once while the rest go on).

#include <functional>
#include <string>

#include <boost/shared_ptr.hpp>

#include "sync/SyncFilesService.h"
#include "sync/SyncPreview.h"

namespace tolmonetsync {
namespace cli {

struct RunOutcome {
    bool mStarted = false;    // false: the call could not send its first request
    bool mSucceeded = false;  // the success callback came
    std::string mError;       // the first error, in UTF-8
    int mMoved = 0;           // a pass's count of files moved
    boost::shared_ptr<SyncCache> mCache;
    boost::shared_ptr<SyncPreview> mPreview;

    bool Ok() const { return mStarted && mSucceeded && mError.empty(); }
};

// Called on the waiting thread about ten times a second while a run lasts.
using WhileWaiting = std::function<void()>;

RunOutcome RunPreview(SyncFilesService& service, SyncMode mode, const WhileWaiting& tick = {});
RunOutcome RunPrepare(SyncFilesService& service, const ProgressCallback& progress, const WhileWaiting& tick = {});
// Waits for the state a connection call (SetCredentials, CheckConnection,
// Logout) reports; SyncServer_Unknown if the call could not start.
using ConnectionCall = std::function<bool(const ConnectionStateCallback&)>;
SyncServer_ConnectionState WaitForConnectionState(const ConnectionCall& call);

RunOutcome RunPass(SyncFilesService& service, const boost::shared_ptr<SyncCache>& cache, SyncMode mode,
                   const WhileWaiting& tick = {});

}  // namespace cli
}  // namespace tolmonetsync
