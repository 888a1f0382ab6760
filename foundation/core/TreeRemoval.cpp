#include "foundation/core/TreeRemoval.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <stdexcept>
#include <string>
#include <vector>

#include "foundation/core/FileSystemError.h"
#include "foundation/core/PathNames.h"

namespace tolmocore {
namespace filesupport {
namespace detail {
namespace {

// Opening with O_NOFOLLOW and working relative to the opened descriptor is
// what makes this safe: a link in place of a directory fails to open as one
// and is then unlinked as the link it is.
constexpr int kOpenDirFlags = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;

void EmptyDirectory(int directoryFd, const std::string& shownPath);

void RemoveEntry(int parentFd, const std::string& name, const std::string& shownPath)
{
    if (::unlinkat(parentFd, name.c_str(), 0) == 0 || errno == ENOENT) return;
    // Linux answers EISDIR for a directory; POSIX allows EPERM.
    if (errno != EISDIR && errno != EPERM) ThrowFileSystemError("Cannot delete", utility::ToUTF16(shownPath));
    const int fd = ::openat(parentFd, name.c_str(), kOpenDirFlags);
    if (fd < 0) {
        // A link swapped in for the directory since the unlink above.
        if ((errno == ELOOP || errno == ENOTDIR) && ::unlinkat(parentFd, name.c_str(), 0) == 0) return;
        ThrowFileSystemError("Cannot delete", utility::ToUTF16(shownPath));
    }
    EmptyDirectory(fd, shownPath);  // takes the descriptor
    if (::unlinkat(parentFd, name.c_str(), AT_REMOVEDIR) != 0 && errno != ENOENT)
        ThrowFileSystemError("Cannot delete", utility::ToUTF16(shownPath));
}

void EmptyDirectory(int directoryFd, const std::string& shownPath)
{
    DIR* stream = ::fdopendir(directoryFd);
    if (!stream) {
        const int error = errno;
        ::close(directoryFd);
        ThrowFileSystemError("Cannot delete", utility::ToUTF16(shownPath), error);
    }
    // Names are read in full before any goes, as removing while reading may
    // make readdir skip entries.
    std::vector<std::string> names;
    for (;;) {
        errno = 0;
        const dirent* entry = ::readdir(stream);
        if (!entry) break;
        const std::string name(entry->d_name);
        if (name != "." && name != "..") names.push_back(name);
    }
    const int readError = errno;
    try {
        if (readError != 0) ThrowFileSystemError("Cannot delete", utility::ToUTF16(shownPath), readError);
        for (const std::string& name : names) RemoveEntry(::dirfd(stream), name, shownPath + "/" + name);
    } catch (...) {
        ::closedir(stream);
        throw;
    }
    ::closedir(stream);
}

}  // namespace

bool RemoveTree(const UTF16String& path)
{
    // A slip that empties the whole disk is not worth the generality.
    if (path.empty() || path == u"/")
        throw std::invalid_argument("Refusing to delete the directory \"" + utility::ToNarrow(path) + "\"");
    const std::string native = NativePath(path);
    struct stat info;
    if (::lstat(native.c_str(), &info) != 0) {
        if (errno == ENOENT) return false;
        ThrowFileSystemError("Cannot delete", path);
    }
    if (S_ISLNK(info.st_mode)) {
        if (::unlink(native.c_str()) != 0 && errno != ENOENT) ThrowFileSystemError("Cannot delete", path);
        return true;
    }
    if (!S_ISDIR(info.st_mode)) ThrowFileSystemError("Cannot delete", path, ENOTDIR);
    const int fd = ::open(native.c_str(), kOpenDirFlags);
    if (fd < 0) ThrowFileSystemError("Cannot delete", path);
    EmptyDirectory(fd, native);
    if (::rmdir(native.c_str()) != 0 && errno != ENOENT) ThrowFileSystemError("Cannot delete", path);
    return true;
}

}  // namespace detail
}  // namespace filesupport
}  // namespace tolmocore
