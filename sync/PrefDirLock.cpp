#include "sync/PrefDirLock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>

#include "foundation/core/Dir.h"
#include "foundation/core/File.h"
#include "foundation/core/FileSystemError.h"

namespace tolmonetsync {

using tolmocore::filesupport::Dir;
using tolmocore::filesupport::File;

PrefDirLock::PrefDirLock(Mode mode)
{
    const File file(Dir::PrefDir(), u"tolmonetsync.lock");
    const std::string path = tolmocore::utility::ToNarrow(file.FullPath());
    mFd = ::open(path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600);
    if (mFd < 0) tolmocore::filesupport::ThrowFileSystemError("Cannot open the lock file", file.FullPath());
    int result;
    do {
        result = ::flock(mFd, mode == Shared ? LOCK_SH : LOCK_EX | LOCK_NB);
    } while (result != 0 && errno == EINTR);
    if (result == 0) return;
    const int error = errno;
    ::close(mFd);
    if (error == EWOULDBLOCK)
        throw SyncRunning("a sync of this preference directory is running; try again when it has finished");
    errno = error;
    tolmocore::filesupport::ThrowFileSystemError("Cannot lock the lock file", file.FullPath());
}

PrefDirLock::~PrefDirLock()
{
    ::close(mFd);  // lets go of the lock
}

}  // namespace tolmonetsync
