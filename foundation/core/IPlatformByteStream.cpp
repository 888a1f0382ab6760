#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/PathNames.h"

namespace tolmocore {
namespace filesupport {

IPlatformByteStream::IPlatformByteStream(const File& file, Flags<unsigned int>) : mFile(file), mFd(-1), mLength(0)
{
    // O_NONBLOCK so that a FIFO in the file's place cannot hang the open; it
    // is refused below like any other non-file.
    mFd = ::open(detail::NativePath(file.FullPath()).c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    if (mFd < 0) ThrowFileSystemError("Cannot open for reading", file.FullPath());
    struct stat info;
    int error = 0;
    if (::fstat(mFd, &info) != 0)
        error = errno;
    else if (!S_ISREG(info.st_mode))
        error = S_ISDIR(info.st_mode) ? EISDIR : EINVAL;
    else if (::fcntl(mFd, F_SETFL, O_RDONLY) != 0)
        error = errno;
    if (error != 0) {
        ::close(mFd);
        if (error == EINVAL)
            throw FileSystemError("Cannot open for reading", file.FullPath(), error, "Not a regular file");
        ThrowFileSystemError("Cannot open for reading", file.FullPath(), error);
    }
    mLength = static_cast<std::uint64_t>(info.st_size);
}

IPlatformByteStream::~IPlatformByteStream()
{
    ::close(mFd);
}

void IPlatformByteStream::ReadBlock(unsigned char* buffer, unsigned int size)
{
    unsigned int done = 0;
    while (done < size) {
        const ssize_t count = ::read(mFd, buffer + done, size - done);
        if (count > 0) {
            done += static_cast<unsigned int>(count);
        } else if (count == 0) {
            throw FileSystemError("Cannot read " + std::to_string(size) + " bytes from", mFile.FullPath(), EIO,
                                  "the file ends after " + std::to_string(done) + " of them");
        } else if (errno != EINTR) {
            ThrowFileSystemError("Cannot read", mFile.FullPath());
        }
    }
}

}  // namespace filesupport
}  // namespace tolmocore
