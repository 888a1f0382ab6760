// Where the host's preference and application directories are: Dir::PrefDir,
// Dir::AppDir and their setters.

#include <pwd.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <mutex>
#include <stdexcept>
#include <vector>

#include "foundation/core/Dir.h"
#include "foundation/core/HostConfig.h"

namespace tolmocore {
namespace filesupport {
namespace {

struct Locations {
    std::mutex mMutex;
    Dir mPrefDir;  // empty: the default
    Dir mAppDir;
};

Locations& TheLocations()
{
    static Locations* sLocations = new Locations;  // outlives static destructors
    return *sLocations;
}

UTF16String HomeDirectory()
{
    const char* home = std::getenv("HOME");
    if (home && home[0] == '/') return utility::ToUTF16(home);
    std::vector<char> buffer(16384);
    struct passwd entry;
    struct passwd* found = nullptr;
    if (::getpwuid_r(::getuid(), &entry, buffer.data(), buffer.size(), &found) == 0 && found && found->pw_dir &&
        found->pw_dir[0] == '/')
        return utility::ToUTF16(found->pw_dir);
    throw std::runtime_error("Cannot find the preference directory: HOME is not set and the user has no home");
}

// The XDG rule: a relative XDG_CONFIG_HOME is to be ignored.
Dir ConfigHome()
{
    const char* config = std::getenv("XDG_CONFIG_HOME");
    if (config && config[0] == '/') return Dir(utility::ToUTF16(config));
    return Dir(Dir(HomeDirectory()), u".config");
}

// A host name is text for people; it must still be one plain component.
Dir AppendHostName(const Dir& directory, UTF16String name)
{
    for (char16_t& c : name)
        if (c == u'/' || c == u'\0') c = u'_';
    if (name.empty() || name == u"." || name == u"..") return directory;
    return Dir(directory, name);
}

}  // namespace

Dir Dir::PrefDir()
{
    {
        std::lock_guard<std::mutex> lock(TheLocations().mMutex);
        if (!TheLocations().mPrefDir.FullPath().empty()) return TheLocations().mPrefDir;
    }
    const UTF16String company = config::GetCompanyName();
    const UTF16String client = config::GetClientName();
    return AppendHostName(AppendHostName(ConfigHome(), company), client);
}

void Dir::SetPrefDir(const Dir& directory)
{
    std::lock_guard<std::mutex> lock(TheLocations().mMutex);
    TheLocations().mPrefDir = directory;
}

Dir Dir::AppDir()
{
    {
        std::lock_guard<std::mutex> lock(TheLocations().mMutex);
        if (!TheLocations().mAppDir.FullPath().empty()) return TheLocations().mAppDir;
    }
    std::vector<char> buffer(4096);
    const ssize_t length = ::readlink("/proc/self/exe", buffer.data(), buffer.size());
    if (length <= 0 || static_cast<size_t>(length) >= buffer.size())
        ThrowFileSystemError("Cannot read", utility::ToUTF16("/proc/self/exe"), length < 0 ? errno : ENAMETOOLONG);
    return Dir(utility::ToUTF16(std::string(buffer.data(), static_cast<size_t>(length)))).Parent();
}

void Dir::SetAppDir(const Dir& directory)
{
    std::lock_guard<std::mutex> lock(TheLocations().mMutex);
    TheLocations().mAppDir = directory;
}

}  // namespace filesupport
}  // namespace tolmocore
