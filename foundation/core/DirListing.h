#pragma once
// Internal to Dir: reading the names of a directory for a walk.

#include <boost/shared_ptr.hpp>

#include "foundation/core/DirIterator.h"

namespace tolmocore {
namespace filesupport {
namespace detail {

enum EntryKind { EntryKind_File, EntryKind_Directory };

// The names of the entries of `kind` directly in `path`, symbolic links
// followed (a dangling link is neither), sorted by their UTF-8 bytes. Names
// that are not valid UTF-8 are left out. Throws FileSystemError if the
// directory cannot be opened or read to its end.
boost::shared_ptr<const DirSnapshot> ListEntries(const UTF16String& path, EntryKind kind);

}  // namespace detail
}  // namespace filesupport
}  // namespace tolmocore
