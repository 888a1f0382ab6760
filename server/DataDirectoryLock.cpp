#include "server/DataDirectoryLock.h"

#include <cerrno>
#include <cstring>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

namespace tolmonetsync {
namespace server {

DataDirectoryInUse::DataDirectoryInUse(const std::string& directory)
    : std::runtime_error("data directory " + directory + " is in use by another tolmonetsync serve")
{
}

DataDirectoryLock::DataDirectoryLock(const std::string& directory)
{
    if (::mkdir(directory.c_str(), 0700) != 0 && errno != EEXIST)
        throw std::runtime_error("cannot create the data directory " + directory + ": " + std::strerror(errno));
    const std::string path = directory + "/service.lock";
    // CLOEXEC: a child the process starts must not keep the directory locked.
    mFd = ::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600);
    if (mFd < 0) throw std::runtime_error("cannot open " + path + ": " + std::strerror(errno));
    if (::flock(mFd, LOCK_EX | LOCK_NB) != 0) {
        const int error = errno;
        ::close(mFd);
        if (error == EWOULDBLOCK) throw DataDirectoryInUse(directory);
        throw std::runtime_error("cannot lock " + path + ": " + std::strerror(error));
    }
}

DataDirectoryLock::~DataDirectoryLock()
{
    ::close(mFd);  // closing the last descriptor of the description releases the lock
}

}  // namespace server
}  // namespace tolmonetsync
