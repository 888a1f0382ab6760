// Whether the preference directory is the user's alone: Dir::CheckPrefDir and
// its setter. The directory holds the stored sign-in and the files a sync
// trusts, so one that another user can change is refused.

#include <grp.h>
#include <pwd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstring>
#include <sstream>
#include <vector>

#include "foundation/core/Dir.h"
#include "foundation/core/PathNames.h"

namespace tolmocore {
namespace filesupport {
namespace {

std::atomic<bool>& AllowShared()
{
    static std::atomic<bool> sAllowShared{false};
    return sAllowShared;
}

std::string ModeText(mode_t mode)
{
    std::ostringstream text;
    text << "mode 0" << std::oct << (mode & 0777);
    return text.str();
}

// A group of the owner's own name with no other member: what systems that
// give every user a group of their own make, and where a umask of 002 leaves
// directories group-writable without sharing them.
bool IsOwnersOwnGroup(uid_t owner, gid_t group)
{
    std::vector<char> userBuffer(16384), groupBuffer(65536);
    struct passwd user;
    struct passwd* foundUser = nullptr;
    struct group entry;
    struct group* foundGroup = nullptr;
    if (::getpwuid_r(owner, &user, userBuffer.data(), userBuffer.size(), &foundUser) != 0 || !foundUser) return false;
    if (::getgrgid_r(group, &entry, groupBuffer.data(), groupBuffer.size(), &foundGroup) != 0 || !foundGroup)
        return false;
    if (std::strcmp(foundUser->pw_name, foundGroup->gr_name) != 0) return false;
    for (char** member = foundGroup->gr_mem; member && *member; ++member)
        if (std::strcmp(*member, foundUser->pw_name) != 0) return false;
    return true;
}

}  // namespace

void Dir::SetAllowSharedPrefDir(bool allow)
{
    AllowShared() = allow;
}

void Dir::CheckPrefDir()
{
    if (AllowShared()) return;
    const Dir directory = PrefDir();
    struct stat info;
    if (::stat(detail::NativePath(directory.FullPath()).c_str(), &info) != 0) {
        if (errno == ENOENT) return;
        ThrowFileSystemError("Cannot check the preference directory", directory.FullPath());
    }
    // Something that is no directory fails later, where it is used.
    if (!S_ISDIR(info.st_mode)) return;

    const char* const action = "Refusing the preference directory";
    if (info.st_uid != ::geteuid()) {
        throw FileSystemError(action, directory.FullPath(), EACCES,
                              "it belongs to another user (uid " + std::to_string(info.st_uid) + ")");
    }
    if (info.st_mode & S_IWOTH) {
        throw FileSystemError(action, directory.FullPath(), EACCES,
                              "it is writable by other users (" + ModeText(info.st_mode) + ")");
    }
    if ((info.st_mode & S_IWGRP) && !IsOwnersOwnGroup(info.st_uid, info.st_gid)) {
        throw FileSystemError(action, directory.FullPath(), EACCES,
                              "it is writable by group " + std::to_string(info.st_gid) +
                                  ", which is not its owner's own (" + ModeText(info.st_mode) + ")");
    }
}

}  // namespace filesupport
}  // namespace tolmocore
