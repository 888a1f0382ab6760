#pragma once
// Internal to Dir: removing a directory tree without following links.

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace filesupport {
namespace detail {

// Removes what `path` names: a link by unlinking it, a directory with
// everything in it; anything else throws FileSystemError (ENOTDIR). Nothing is ever reached through a symbolic link,
// even one swapped in while the removal runs. Gives false if nothing was
// there. Throws FileSystemError naming the entry that could not be removed,
// and std::invalid_argument for "/" or an empty path.
bool RemoveTree(const UTF16String& path);

}  // namespace detail
}  // namespace filesupport
}  // namespace tolmocore
