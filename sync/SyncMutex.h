#pragma once

#include <boost/thread/recursive_mutex.hpp>

namespace tolmonetsync {

// The one process-wide recursive mutex of the engine, made on first use.
// Held for the whole of SyncFilesService::PrepareSync and ::DoSync, and of
// SyncCache::CancelAll and ::Progress, and by nothing else.
boost::recursive_mutex& SyncMutex();

}  // namespace tolmonetsync
