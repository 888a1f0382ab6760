#include "foundation/core/DirListing.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <string>
#include <vector>

#include <boost/make_shared.hpp>

#include "foundation/core/FileSystemError.h"
#include "foundation/core/PathNames.h"

namespace tolmocore {
namespace filesupport {
namespace detail {
namespace {

bool IsKind(DIR* stream, const dirent& entry, EntryKind kind)
{
    unsigned char type = entry.d_type;
    if (type == DT_LNK || type == DT_UNKNOWN) {
        struct stat info;
        if (::fstatat(::dirfd(stream), entry.d_name, &info, 0) != 0) return false;
        type = S_ISREG(info.st_mode) ? DT_REG : S_ISDIR(info.st_mode) ? DT_DIR : DT_UNKNOWN;
    }
    return kind == EntryKind_File ? type == DT_REG : type == DT_DIR;
}

struct DirCloser {
    void operator()(DIR* stream) const { ::closedir(stream); }
};

}  // namespace

boost::shared_ptr<const DirSnapshot> ListEntries(const UTF16String& path, EntryKind kind)
{
    std::unique_ptr<DIR, DirCloser> stream(::opendir(NativePath(path).c_str()));
    if (!stream) ThrowFileSystemError("Cannot list", path);

    std::vector<std::string> names;
    for (;;) {
        errno = 0;
        const dirent* entry = ::readdir(stream.get());
        if (!entry) {
            if (errno != 0) ThrowFileSystemError("Cannot list", path);
            break;
        }
        const std::string name(entry->d_name);
        if (name == "." || name == "..") continue;
        if (IsKind(stream.get(), *entry, kind)) names.push_back(name);
    }
    // char_traits<char> compares as unsigned char: this is UTF-8 byte order.
    std::sort(names.begin(), names.end());

    auto snapshot = boost::make_shared<DirSnapshot>();
    snapshot->mDirPath = path;
    snapshot->mNames.reserve(names.size());
    for (const std::string& name : names) {
        utility::UnicodeErrorCode error;
        UTF16String wide = utility::UTF8to16(UTF8String(name), &error);
        if (error == utility::UnicodeErrorCode_None) snapshot->mNames.push_back(std::move(wide));
    }
    return snapshot;
}

}  // namespace detail
}  // namespace filesupport
}  // namespace tolmocore
