// Process-lifetime allocations of libraries loaded at run time: see
// support/LeakSuppressions.h. Our own allocations stay checked.

#include "support/LeakSuppressions.h"

#if defined(__SANITIZE_ADDRESS__)
extern "C" const char* __lsan_default_suppressions()
{
    return testsupport::kLeakSuppressions;
}
#endif
