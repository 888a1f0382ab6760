#include "foundation/core/File.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <vector>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/FileOps.h"
#include "foundation/core/FileTimes.h"
#include "foundation/core/PathNames.h"

namespace tolmocore {
namespace filesupport {
namespace {

constexpr unsigned int kCopyBlockSize = 64 * 1024;

// The process's umask, read without changing it (umask(2) would, for a moment,
// for every thread). The kernel reports it since 4.7; older ones get the
// common 022.
mode_t CurrentUmask()
{
    if (FILE* status = std::fopen("/proc/self/status", "re")) {
        char line[256];
        unsigned int mask = 0;
        bool found = false;
        while (!found && std::fgets(line, sizeof line, status))
            found = std::sscanf(line, "Umask: %o", &mask) == 1;
        std::fclose(status);
        if (found) return static_cast<mode_t>(mask & 0777);
    }
    return 022;
}

}  // namespace

File::File() = default;

File::File(const UTF16String& path) : mPath(detail::NormalizePath(path)) {}

File::File(const Dir& directory, const UTF16String& name)
{
    detail::CheckPlainName(name);
    mPath = detail::JoinPath(directory.FullPath(), name);
}

bool File::Exists() const
{
    struct stat info;
    return ::stat(detail::NativePath(mPath).c_str(), &info) == 0 && S_ISREG(info.st_mode);
}

void File::Create(bool createEmptyNow) const
{
    const Dir parent = Parent();
    if (!parent.Exists()) ThrowFileSystemError("Cannot create", mPath, ENOENT);
    if (!createEmptyNow) return;
    const int fd = ::open(detail::NativePath(mPath).c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666);
    if (fd >= 0) {
        ::close(fd);
    } else if (errno != EEXIST) {
        ThrowFileSystemError("Cannot create", mPath);
    } else if (!Exists()) {
        ThrowFileSystemError("Cannot create", mPath, EEXIST);
    }
}

bool File::Delete() const
{
    if (::unlink(detail::NativePath(mPath).c_str()) == 0) return true;
    if (errno == ENOENT) return false;
    ThrowFileSystemError("Cannot delete", mPath);
}

void File::Rename(const UTF16String& newName)
{
    detail::CheckPlainName(newName);
    const UTF16String newPath = detail::JoinPath(detail::ParentPath(mPath), newName);
    struct stat info;
    if (::lstat(detail::NativePath(mPath).c_str(), &info) != 0) ThrowFileSystemError("Cannot rename", mPath);
    if (S_ISDIR(info.st_mode)) ThrowFileSystemError("Cannot rename", mPath, EISDIR);
    if (newPath == mPath) return;
    if (GetFileOps()->Rename(detail::NativePath(mPath), detail::NativePath(newPath)) != 0)
        ThrowFileSystemError("Cannot rename " + utility::ToNarrow(mPath) + " to", newPath);
    mPath = newPath;
}

void File::PrepareToReplace(const File& target) const
{
    struct stat old;
    const bool replacing = ::stat(detail::NativePath(target.mPath).c_str(), &old) == 0 && S_ISREG(old.st_mode);
    const boost::shared_ptr<FileOps> ops = GetFileOps();
    const int fd = ops->Open(detail::NativePath(mPath), O_RDONLY | O_NOFOLLOW | O_CLOEXEC, 0);
    if (fd < 0) ThrowFileSystemError("Cannot open", mPath);
    int result = 0;
    if (replacing) {
        // The owner goes first, as a change of owner clears set-id bits.
        if ((old.st_uid != ::geteuid() || old.st_gid != ::getegid()) && ops->Fchown(fd, old.st_uid, old.st_gid) != 0 &&
            errno != EPERM)
            result = -1;
        if (result == 0) result = ops->Fchmod(fd, old.st_mode & 07777);
    } else {
        // Downloads arrive private; a new file gets what any new file gets.
        result = ops->Fchmod(fd, 0666 & ~CurrentUmask());
    }
    const int error = errno;
    ops->Close(fd);
    if (result != 0)
        ThrowFileSystemError("Cannot ready " + utility::ToNarrow(mPath) + " to replace", target.mPath, error);
}

void File::CopyTo(const File& target) const
{
    struct stat info;
    if (::stat(detail::NativePath(mPath).c_str(), &info) != 0) ThrowFileSystemError("Cannot copy", mPath);
    IPlatformByteStream in(*this, 1);
    // The copy is as private as the original from its first byte on.
    OPlatformByteStream out(target, 1, info.st_mode & 07777);
    std::vector<unsigned char> block(kCopyBlockSize);
    for (std::uint64_t left = in.Length(); left > 0;) {
        const unsigned int size = left < kCopyBlockSize ? static_cast<unsigned int>(left) : kCopyBlockSize;
        in.ReadBlock(block.data(), size);
        out.WriteBlock(block.data(), size);
        left -= size;
    }
    out.Close();
    target.SetModified(detail::ModifiedTime(mPath));
}

UTF16String File::GetName() const
{
    return detail::LastComponent(mPath);
}

UTF16String File::GetExtension(bool withDot) const
{
    const UTF16String name = GetName();
    const size_t dot = name.rfind(u'.');
    if (dot == UTF16String::npos || dot == 0) return UTF16String();
    return UTF16String(name.substr(withDot ? dot : dot + 1));
}

Dir File::Parent() const
{
    return Dir(detail::ParentPath(mPath));
}

boost::posix_time::ptime File::Modified() const
{
    return detail::ModifiedTime(mPath);
}

void File::SetModified(const boost::posix_time::ptime& time) const
{
    detail::SetModifiedTime(mPath, time);
}

std::uint64_t File::Size(FileSizeSelector) const
{
    struct stat info;
    if (::stat(detail::NativePath(mPath).c_str(), &info) != 0) ThrowFileSystemError("Cannot read the size of", mPath);
    if (S_ISDIR(info.st_mode)) ThrowFileSystemError("Cannot read the size of", mPath, EISDIR);
    return static_cast<std::uint64_t>(info.st_size);
}

bool operator==(const File& left, const File& right)
{
    return left.FullPath() == right.FullPath();
}
bool operator!=(const File& left, const File& right)
{
    return !(left == right);
}
bool operator<(const File& left, const File& right)
{
    return left.FullPath() < right.FullPath();
}

}  // namespace filesupport
}  // namespace tolmocore
