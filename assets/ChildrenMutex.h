#pragma once
// The one process-wide recursive mutex over the mChildren of every
// collection, the cached root and the naming of temporary files. Held only
// around the change itself (a cached root is delivered with it held).

#include <boost/thread/recursive_mutex.hpp>

namespace tolmonetsync {

// Made on first use, never destroyed: handlers may still run while the
// process exits.
boost::recursive_mutex& ChildrenMutex();

}  // namespace tolmonetsync
