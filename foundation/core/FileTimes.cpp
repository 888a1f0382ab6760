#include "foundation/core/FileTimes.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <stdexcept>

#include "foundation/core/FileSystemError.h"
#include "foundation/core/PathNames.h"

namespace tolmocore {
namespace filesupport {
namespace detail {
namespace {

const boost::posix_time::ptime kEpoch(boost::gregorian::date(1970, 1, 1));

}  // namespace

boost::posix_time::ptime ModifiedTime(const UTF16String& path)
{
    struct stat info;
    if (::stat(NativePath(path).c_str(), &info) != 0) ThrowFileSystemError("Cannot read the date of", path);
    return kEpoch + boost::posix_time::seconds(static_cast<long>(info.st_mtim.tv_sec)) +
           boost::posix_time::microseconds(info.st_mtim.tv_nsec / 1000);
}

void SetModifiedTime(const UTF16String& path, const boost::posix_time::ptime& time)
{
    if (time.is_special())
        throw std::invalid_argument("Cannot set the date of " + utility::ToNarrow(path) + " to a special value");
    const long long micros = (time - kEpoch).total_microseconds();
    // Floor division, so that times before 1970 keep a non-negative fraction.
    long long seconds = micros / 1000000;
    long long fraction = micros % 1000000;
    if (fraction < 0) {
        fraction += 1000000;
        --seconds;
    }
    struct timespec times[2];
    times[0].tv_sec = 0;
    times[0].tv_nsec = UTIME_OMIT;
    times[1].tv_sec = static_cast<time_t>(seconds);
    times[1].tv_nsec = static_cast<long>(fraction * 1000);
    if (::utimensat(AT_FDCWD, NativePath(path).c_str(), times, 0) != 0)
        ThrowFileSystemError("Cannot set the date of", path);
}

}  // namespace detail
}  // namespace filesupport
}  // namespace tolmocore
