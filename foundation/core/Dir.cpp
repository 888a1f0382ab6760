#include "foundation/core/Dir.h"

#include <sys/stat.h>

#include <cerrno>
#include <filesystem>
#include <stdexcept>
#include <system_error>

#include "foundation/core/DirListing.h"
#include "foundation/core/FileOps.h"
#include "foundation/core/FileTimes.h"
#include "foundation/core/PathNames.h"
#include "foundation/core/TreeRemoval.h"

namespace tolmocore {
namespace filesupport {
namespace {

void CheckReservedWalkArguments(bool flag, const Dir::AbortCheck* check, bool flag2,
                                const boost::shared_ptr<Dir::NameFilter>& filter)
{
    if (flag || check || flag2 || filter)
        throw std::invalid_argument("Directory walks take no options: pass false, null, false and an empty filter");
}

}  // namespace

Dir::Dir() = default;

Dir::Dir(const UTF16String& path) : mPath(detail::NormalizePath(path)) {}

Dir::Dir(const Dir& parent, const UTF16String& name)
{
    detail::CheckPlainName(name);
    mPath = detail::JoinPath(parent.mPath, name);
}

bool Dir::Exists() const
{
    struct stat info;
    return ::stat(detail::NativePath(mPath).c_str(), &info) == 0 && S_ISDIR(info.st_mode);
}

bool Dir::Create() const
{
    std::error_code error;
    const bool made = std::filesystem::create_directories(detail::NativePath(mPath), error);
    if (error) ThrowFileSystemError("Cannot create the directory", mPath, error.value());
    return made;
}

bool Dir::CreatePrivate() const
{
    const std::string native = detail::NativePath(mPath);
    if (::mkdir(native.c_str(), 0700) == 0) return true;
    if (errno == ENOENT) {
        Parent().Create();
        if (::mkdir(native.c_str(), 0700) == 0) return true;
    }
    if (errno == EEXIST && Exists()) return false;
    ThrowFileSystemError("Cannot create the directory", mPath);
}

void Dir::Sync() const
{
    if (GetFileOps()->SyncDirectory(detail::NativePath(mPath)) != 0 && errno != EINVAL)
        ThrowFileSystemError("Cannot sync the directory", mPath);
}

bool Dir::Delete() const
{
    return detail::RemoveTree(mPath);
}

boost::posix_time::ptime Dir::Modified() const
{
    return detail::ModifiedTime(mPath);
}

void Dir::SetModified(const boost::posix_time::ptime& time) const
{
    detail::SetModifiedTime(mPath, time);
}

UTF16String Dir::GetName() const
{
    return detail::LastComponent(mPath);
}

Dir Dir::Parent() const
{
    return Dir(detail::ParentPath(mPath));
}

Dir::FileIterator Dir::BeginFiles(bool reservedFlag, const AbortCheck* reservedCheck, bool reservedFlag2,
                                  const boost::shared_ptr<NameFilter>& reservedFilter) const
{
    CheckReservedWalkArguments(reservedFlag, reservedCheck, reservedFlag2, reservedFilter);
    return FileIterator(detail::ListEntries(mPath, detail::EntryKind_File));
}

Dir::SubdirIterator Dir::BeginSubdirs(bool reservedFlag, const AbortCheck* reservedCheck,
                                      const boost::shared_ptr<NameFilter>& reservedFilter) const
{
    CheckReservedWalkArguments(reservedFlag, reservedCheck, false, reservedFilter);
    return SubdirIterator(detail::ListEntries(mPath, detail::EntryKind_Directory));
}

bool operator==(const Dir& left, const Dir& right)
{
    return left.FullPath() == right.FullPath();
}
bool operator!=(const Dir& left, const Dir& right)
{
    return !(left == right);
}
bool operator<(const Dir& left, const Dir& right)
{
    return left.FullPath() < right.FullPath();
}

}  // namespace filesupport
}  // namespace tolmocore
