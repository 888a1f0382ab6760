#include "foundation/core/FileOps.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <mutex>

namespace tolmocore {
namespace filesupport {
namespace {

struct FileOpsSlot {
    std::mutex mMutex;  // guards mOps, for the copy of the pointer
    boost::shared_ptr<FileOps> mOps{new FileOps};
};

FileOpsSlot& Slot()
{
    static FileOpsSlot* sSlot = new FileOpsSlot;  // outlives static destructors
    return *sSlot;
}

}  // namespace

FileOps::~FileOps() = default;

int FileOps::Open(const std::string& path, int flags, mode_t mode)
{
    int fd;
    do {
        fd = ::open(path.c_str(), flags, mode);
    } while (fd < 0 && errno == EINTR);
    return fd;
}

ssize_t FileOps::Write(int fd, const void* data, size_t size)
{
    return ::write(fd, data, size);
}

int FileOps::Fsync(int fd)
{
    return ::fsync(fd);
}

int FileOps::Close(int fd)
{
    return ::close(fd);
}

int FileOps::Rename(const std::string& from, const std::string& to)
{
    return ::rename(from.c_str(), to.c_str());
}

int FileOps::Unlink(const std::string& path)
{
    return ::unlink(path.c_str());
}

int FileOps::SyncDirectory(const std::string& path)
{
    // The system calls directly: a wrapper sees one operation, not three.
    const int fd = ::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0) return -1;
    const int result = ::fsync(fd);
    const int error = errno;
    ::close(fd);
    errno = error;
    return result;
}

int FileOps::Fchmod(int fd, mode_t mode)
{
    return ::fchmod(fd, mode);
}

int FileOps::Fchown(int fd, uid_t owner, gid_t group)
{
    return ::fchown(fd, owner, group);
}

boost::shared_ptr<FileOps> GetFileOps()
{
    std::lock_guard<std::mutex> lock(Slot().mMutex);
    return Slot().mOps;
}

boost::shared_ptr<FileOps> SetFileOps(const boost::shared_ptr<FileOps>& ops)
{
    std::lock_guard<std::mutex> lock(Slot().mMutex);
    boost::shared_ptr<FileOps> previous = Slot().mOps;
    Slot().mOps = ops ? ops : boost::shared_ptr<FileOps>(new FileOps);
    return previous;
}

}  // namespace filesupport
}  // namespace tolmocore
