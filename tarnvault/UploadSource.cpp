#include "tarnvault/UploadSourcePrivate.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <stdexcept>

#include "foundation/core/FileSystemError.h"
#include "foundation/core/PathNames.h"

namespace tolmonetsync {
namespace tarnvault {

using tolmocore::filesupport::FileSystemError;
using tolmocore::filesupport::ThrowFileSystemError;

const char kUploadChangedText[] = "Upload: the file changed while it was being sent";

namespace {

// The 32-bit size argument of the block calls bounds one transfer.
constexpr std::uint64_t kMaxBlock = std::uint64_t(1) << 32;

// Opens for reading and describes what was opened; throws as the input byte
// stream does. O_NONBLOCK so that a FIFO in the file's place cannot hang the
// open; it is refused like any other non-file.
int OpenForReading(const tolmocore::filesupport::File& file, struct stat& info)
{
    const int fd =
        ::open(tolmocore::filesupport::detail::NativePath(file.FullPath()).c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    if (fd < 0) ThrowFileSystemError("Cannot open for reading", file.FullPath());
    int error = 0;
    if (::fstat(fd, &info) != 0)
        error = errno;
    else if (!S_ISREG(info.st_mode))
        error = S_ISDIR(info.st_mode) ? EISDIR : EINVAL;
    else if (::fcntl(fd, F_SETFL, O_RDONLY) != 0)
        error = errno;
    if (error == 0) return fd;
    ::close(fd);
    if (error == EINVAL) throw FileSystemError("Cannot open for reading", file.FullPath(), error, "Not a regular file");
    ThrowFileSystemError("Cannot open for reading", file.FullPath(), error);
}

bool SameFile(const struct stat& a, const struct stat& b)
{
    return a.st_dev == b.st_dev && a.st_ino == b.st_ino && a.st_size == b.st_size &&
           a.st_mtim.tv_sec == b.st_mtim.tv_sec && a.st_mtim.tv_nsec == b.st_mtim.tv_nsec;
}

}  // namespace

UploadSource::UploadSource(const tolmocore::filesupport::File& file) : mFile(file)
{
    ::close(OpenForReading(file, mSnapshot));
    if (static_cast<std::uint64_t>(mSnapshot.st_size) >= kMaxBlock)
        throw std::runtime_error("File size beyond the limitation!");
}

UploadSource::~UploadSource()
{
    if (mFd >= 0) ::close(mFd);
}

std::size_t UploadSource::Read(unsigned char* buffer, std::size_t max)
{
    try {
        return ReadNext(buffer, max);
    } catch (const std::exception& e) {
        mFailure = e.what();
        throw;
    }
}

bool UploadSource::Rewind()
{
    mOffset = 0;
    return true;
}

std::size_t UploadSource::ReadNext(unsigned char* buffer, std::size_t max)
{
    if (mFd < 0) {
        struct stat now;
        mFd = OpenForReading(mFile, now);
        if (!SameFile(now, mSnapshot)) throw std::runtime_error(kUploadChangedText);
    }
    const std::size_t wanted = static_cast<std::size_t>(std::min<std::uint64_t>(max, Size() - mOffset));
    if (wanted == 0) return 0;
    ssize_t count = 0;
    do {
        count = ::pread(mFd, buffer, wanted, static_cast<off_t>(mOffset));
    } while (count < 0 && errno == EINTR);
    if (count < 0) ThrowFileSystemError("Cannot read", mFile.FullPath());
    if (count == 0) throw std::runtime_error(kUploadChangedText);  // it ended early
    mOffset += static_cast<std::uint64_t>(count);
    // The last bytes leave only while the file is still the one whose
    // length went out.
    if (mOffset == Size()) CheckUnchanged();
    return static_cast<std::size_t>(count);
}

void UploadSource::CheckUnchanged() const
{
    struct stat now;
    if (::fstat(mFd, &now) != 0) ThrowFileSystemError("Cannot read", mFile.FullPath());
    if (!SameFile(now, mSnapshot)) throw std::runtime_error(kUploadChangedText);
}

}  // namespace tarnvault
}  // namespace tolmonetsync
