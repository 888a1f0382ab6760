#pragma once
// Internal to File and Dir: the text of paths. Nothing here touches the disk.

#include <string>

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace filesupport {
namespace detail {

// Runs of "/" become one and a trailing "/" goes (the root stays "/"), so that
// two spellings of a directory name the same path. "." and ".." are kept:
// resolving them would need the disk.
UTF16String NormalizePath(const UTF16String& path);

// Throws std::invalid_argument unless `name` is one plain component: not
// empty, not "." or "..", without "/" or NUL. This is what keeps a name that
// came from the server inside the directory it is joined to.
void CheckPlainName(const UTF16String& name);

// `directory` + "/" + `name`; an empty directory gives `name` alone.
UTF16String JoinPath(const UTF16String& directory, const UTF16String& name);

// The text after the last "/" of a normalized path ("" for "/").
UTF16String LastComponent(const UTF16String& path);
// The path without its last component: "/a/b" gives "/a", "/a" gives "/",
// "a" gives ".".
UTF16String ParentPath(const UTF16String& path);

// The name the operating system takes: the path as UTF-8. A path holding
// NUL throws std::invalid_argument.
std::string NativePath(const UTF16String& path);

}  // namespace detail
}  // namespace filesupport
}  // namespace tolmocore
