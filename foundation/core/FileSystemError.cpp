#include "foundation/core/FileSystemError.h"

#include <cerrno>
#include <system_error>

namespace tolmocore {
namespace filesupport {
namespace {

std::string Describe(const std::string& action, const UTF16String& path, int code, const std::string& reason)
{
    // system_category's message is thread-safe, unlike strerror.
    return action + " " + utility::ToNarrow(path) + ": " +
           (reason.empty() ? std::system_category().message(code) : reason);
}

}  // namespace

FileSystemError::FileSystemError(const std::string& action, const UTF16String& path, int code,
                                 const std::string& reason)
    : std::runtime_error(Describe(action, path, code, reason)), mPath(path), mCode(code)
{
}

void ThrowFileSystemError(const std::string& action, const UTF16String& path, int code)
{
    throw FileSystemError(action, path, code);
}

void ThrowFileSystemError(const std::string& action, const UTF16String& path)
{
    ThrowFileSystemError(action, path, errno);
}

}  // namespace filesupport
}  // namespace tolmocore
