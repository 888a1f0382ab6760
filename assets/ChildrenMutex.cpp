#include "assets/ChildrenMutex.h"

namespace tolmonetsync {

boost::recursive_mutex& ChildrenMutex()
{
    static boost::recursive_mutex* mutex = new boost::recursive_mutex;
    return *mutex;
}

}  // namespace tolmonetsync
