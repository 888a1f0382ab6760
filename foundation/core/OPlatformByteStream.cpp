#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <random>
#include <string>
#include <system_error>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/FileOps.h"
#include "foundation/core/PathNames.h"

namespace tolmocore {
namespace filesupport {
namespace {

constexpr size_t kBufferSize = 64 * 1024;
constexpr int kNameAttempts = 100;
// Keeps ".<name>.tmsw-XXXXXX" within the 255 bytes a name may have.
constexpr size_t kMaxNamePartBytes = 200;
const char kSuffixAlphabet[] = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789";

// The name starts with "." and ends in ".tmsw-" and six random characters: a
// scan for ".xmp" or a sweep of ".temp" files never takes it for one of its own.
std::string TemporaryName(const std::string& targetName)
{
    thread_local std::mt19937 generator([] {
        std::random_device device;
        std::seed_seq seed{device(), device(), device(), device()};
        return std::mt19937(seed);
    }());
    std::uniform_int_distribution<size_t> pick(0, sizeof(kSuffixAlphabet) - 2);
    std::string name = "." + targetName.substr(0, kMaxNamePartBytes) + ".tmsw-";
    for (int i = 0; i < 6; ++i) name += kSuffixAlphabet[pick(generator)];
    return name;
}

// The file a write to `path` must replace: the final target of a link, so
// that replacing keeps the user's link.
UTF16String ReplacedPath(const UTF16String& path)
{
    struct stat info;
    const std::string native = detail::NativePath(path);
    if (::lstat(native.c_str(), &info) != 0 || !S_ISLNK(info.st_mode)) return path;
    std::error_code error;
    const std::filesystem::path resolved = std::filesystem::weakly_canonical(native, error);
    if (error) ThrowFileSystemError("Cannot follow the link", path, error.value());
    return utility::ToUTF16(resolved.string());
}

void WriteAll(FileOps& ops, int fd, const unsigned char* data, size_t size, const UTF16String& shownPath)
{
    while (size > 0) {
        const ssize_t count = ops.Write(fd, data, size);
        if (count > 0) {
            data += count;
            size -= static_cast<size_t>(count);
        } else if (count < 0 && errno != EINTR) {
            ThrowFileSystemError("Cannot write", shownPath);
        }
    }
}

// Some file systems cannot sync a file (EINVAL); that is all they offer.
bool SyncFailed(int result)
{
    return result != 0 && errno != EINVAL;
}

}  // namespace

OPlatformByteStream::OPlatformByteStream(const File& file, Flags<unsigned int>)
    : mOps(GetFileOps()), mFile(file), mFd(-1), mClosed(false)
{
    Open(0, false);
}

OPlatformByteStream::OPlatformByteStream(const File& file, Flags<unsigned int>, mode_t permissions)
    : mOps(GetFileOps()), mFile(file), mFd(-1), mClosed(false)
{
    Open(permissions & 07777, true);
}

void OPlatformByteStream::Open(mode_t permissions, bool permissionsGiven)
{
    // A private file replaces a link planted at its name instead of writing
    // through it; any other write replaces what the user's link points to.
    mTarget = permissionsGiven ? mFile.FullPath() : ReplacedPath(mFile.FullPath());
    const std::string nativeTarget = detail::NativePath(mTarget);
    struct stat old;
    const bool exists =
        (permissionsGiven ? ::lstat(nativeTarget.c_str(), &old) : ::stat(nativeTarget.c_str(), &old)) == 0;
    if (exists && S_ISDIR(old.st_mode)) ThrowFileSystemError("Cannot open for writing", mFile.FullPath(), EISDIR);
    const bool replacing = exists && S_ISREG(old.st_mode);
    // The umask narrows the mode at creation; fchmod below sets exactly what
    // is wanted, which for given permissions is never wider than created.
    const mode_t createMode = permissionsGiven ? permissions : replacing ? (old.st_mode & 07777) : 0666;

    const std::string targetName = detail::NativePath(detail::LastComponent(mTarget));
    std::string prefix = detail::NativePath(detail::ParentPath(mTarget));
    if (prefix.back() != '/') prefix += '/';
    for (int attempt = 0; mFd < 0; ++attempt) {
        const std::string candidate = prefix + TemporaryName(targetName);
        mFd = mOps->Open(candidate, O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, createMode);
        if (mFd >= 0) {
            mTemporary = candidate;
        } else if (errno != EEXIST || attempt + 1 >= kNameAttempts) {
            ThrowFileSystemError("Cannot open for writing", mFile.FullPath());
        }
    }

    int result = 0;
    if (permissionsGiven) {
        result = mOps->Fchmod(mFd, permissions);
    } else if (replacing) {
        // Only a privileged process may give a file away (EPERM otherwise).
        // The mode goes after, as a change of owner clears set-id bits.
        if ((old.st_uid != ::geteuid() || old.st_gid != ::getegid()) &&
            mOps->Fchown(mFd, old.st_uid, old.st_gid) != 0 && errno != EPERM)
            result = -1;
        if (result == 0) result = mOps->Fchmod(mFd, old.st_mode & 07777);
    }
    if (result != 0) {
        const int error = errno;
        Discard();
        ThrowFileSystemError("Cannot set the permissions for", mFile.FullPath(), error);
    }
    mBuffer.reserve(kBufferSize);
}

OPlatformByteStream::~OPlatformByteStream()
{
    if (!mClosed) Discard();
}

void OPlatformByteStream::WriteBlock(const unsigned char* buffer, unsigned int size)
{
    if (mClosed || mFd < 0) ThrowFileSystemError("Cannot write to a closed stream on", mFile.FullPath(), EBADF);
    try {
        if (mBuffer.size() + size > kBufferSize) Flush();
        if (size >= kBufferSize)
            WriteAll(*mOps, mFd, buffer, size, mFile.FullPath());
        else
            mBuffer.insert(mBuffer.end(), buffer, buffer + size);
    } catch (...) {
        Discard();
        throw;
    }
}

void OPlatformByteStream::Flush()
{
    WriteAll(*mOps, mFd, mBuffer.data(), mBuffer.size(), mFile.FullPath());
    mBuffer.clear();
}

void OPlatformByteStream::Close()
{
    if (mClosed) return;
    if (mFd < 0) ThrowFileSystemError("Cannot close a failed stream on", mFile.FullPath(), EBADF);
    try {
        Flush();
        if (SyncFailed(mOps->Fsync(mFd))) ThrowFileSystemError("Cannot write", mFile.FullPath());
        const int fd = mFd;
        mFd = -1;
        if (mOps->Close(fd) != 0) ThrowFileSystemError("Cannot write", mFile.FullPath());
        if (mOps->Rename(mTemporary, detail::NativePath(mTarget)) != 0)
            ThrowFileSystemError("Cannot replace", mFile.FullPath());
    } catch (...) {
        Discard();
        throw;
    }
    mClosed = true;
    mTemporary.clear();
    // The rename is only durable once the directory entry is on the disk.
    Dir(detail::ParentPath(mTarget)).Sync();
}

void OPlatformByteStream::Discard() noexcept
{
    if (mFd >= 0) mOps->Close(mFd);
    mFd = -1;
    if (!mTemporary.empty()) ::unlink(mTemporary.c_str());
    mTemporary.clear();
    mBuffer.clear();
}

}  // namespace filesupport
}  // namespace tolmocore
