#pragma once
// The exception that every failed file, directory and stream operation throws.
// Callers usually catch std::exception; those that must tell "missing" from
// other failures look at Code().

#include <stdexcept>
#include <string>

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace filesupport {

class FileSystemError : public std::runtime_error {
public:
    // what() reads "<action> <path>: <reason>", for instance
    // "Cannot open /home/u/a.xmp for reading: No such file or directory".
    // A non-empty `reason` replaces the system's text for `code`.
    FileSystemError(const std::string& action, const UTF16String& path, int code,
                    const std::string& reason = std::string());

    // The errno value behind the failure (ENOENT, EACCES, ...).
    int Code() const noexcept { return mCode; }
    const UTF16String& Path() const noexcept { return mPath; }

private:
    UTF16String mPath;
    int mCode;
};

// Throws FileSystemError for `path` with `code` (errno when not given).
[[noreturn]] void ThrowFileSystemError(const std::string& action, const UTF16String& path, int code);
[[noreturn]] void ThrowFileSystemError(const std::string& action, const UTF16String& path);

}  // namespace filesupport
}  // namespace tolmocore
