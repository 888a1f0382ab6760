#pragma once
// A few threads kept for downloads' last file work (making, writing and
// syncing a ".temp" file), so that the syncs of several downloads overlap: a
// journaling file system commits syncs that wait at the same time together,
// where one thread would wait for each commit in turn. Not installed.
//
// Jobs start in the order given but may run at the same time and end in any
// order; each runs once. The threads live as long as the process. A job must
// not throw and must not wait for another job. Any thread.

#include <functional>

namespace tolmonetsync {
namespace tarnvault {

void RunOnDownloadWorker(std::function<void()> job);

}  // namespace tarnvault
}  // namespace tolmonetsync
