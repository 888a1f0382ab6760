#pragma once
// A value naming a file, which need not exist, and the operations on it.
//
// Constructing, copying and comparing never touch the disk. Every operation
// that does throws a std::exception subclass whose text names the path:
// FileSystemError for failures of the system (Code() gives errno),
// std::invalid_argument for a name that is not one plain component. An
// object is used by one thread at a time.
//
// Bytes are written only through OPlatformByteStream (ByteStreams.h), which
// replaces a file atomically.

#include <cstdint>

#include <boost/date_time/posix_time/posix_time_types.hpp>

#include "foundation/core/Dir.h"
#include "foundation/core/FileSystemError.h"
#include "foundation/core/SmallBlockAllocator.h"
#include "foundation/core/Strings.h"

namespace tolmocore {
namespace filesupport {

class File {
public:
    // Names nothing; FullPath() is empty.
    File();
    // The path as given, with repeated and trailing "/" dropped.
    explicit File(const UTF16String& path);
    // `name` inside `directory`. A name that is empty, "." or "..", or that
    // holds "/" or NUL, throws std::invalid_argument: no name, wherever it came
    // from, places a file outside its directory.
    File(const Dir& directory, const UTF16String& name);

    // True if a regular file (or a symbolic link to one) of this name exists;
    // a directory does not count.
    bool Exists() const;
    // Prepares for writing. With false nothing visible changes: the file
    // appears, whole, when an output stream on it closes. With true an empty
    // file is made at once if there is none (an existing one is left as it
    // is). Either way, throws if the directory that should hold it is missing.
    void Create(bool createEmptyNow) const;
    // Removes the file (a link is removed as a link). Gives false if there was
    // none; throws if it cannot be removed, a directory included.
    bool Delete() const;
    // Renames the file within its directory; `newName` is a plain name, checked
    // as in File(Dir, name). A file already under `newName` is replaced in one
    // step, so that name never goes missing: callers back it up first. A
    // directory under `newName` is never replaced. Afterwards this object
    // names the new file. Throws if the file is missing or the system refuses.
    // Goes through FileOps (FileOps.h).
    void Rename(const UTF16String& newName);
    // Readies this file to be renamed over `target`: gives it the target's
    // permission bits and, where the process may, its owner and group (with
    // no target, the umask's default for a new file). Done before the rename,
    // the file under the target's name is never more open than it was. Not
    // synced: the change is durable once the rename's directory is synced,
    // and until then a crash leaves the file as private as it came (the
    // caller synced its bytes). Goes through FileOps;
    // a symbolic link in this file's place is refused. Throws on failure, a
    // refused change of owner (EPERM) aside.
    void PrepareToReplace(const File& target) const;
    // Makes `target` a copy of this file: the same bytes, permission bits and
    // modification time. The target is replaced atomically, as by
    // OPlatformByteStream; on failure it keeps its old bytes. Throws on any
    // failure.
    void CopyTo(const File& target) const;

    const UTF16String& FullPath() const { return mPath; }
    // The last component of the path.
    UTF16String GetName() const;
    // The text from the last "." of the name, with the dot if `withDot`:
    // "a.xmp" gives ".xmp", "a.b.c" gives ".c", "name." gives "." (or "").
    // A name without a dot, or whose only dot leads it (".profile"), has none.
    UTF16String GetExtension(bool withDot) const;
    // The directory that holds the file.
    Dir Parent() const;

    // The modification time as a UTC ptime, to the microsecond, so that it
    // round-trips exactly through text. Throws if the file is missing.
    boost::posix_time::ptime Modified() const;
    // Sets the modification time (to the microsecond). Throws on failure or on
    // a special value such as not-a-date-time.
    void SetModified(const boost::posix_time::ptime& time) const;
    // The size in bytes; there is only the data size to select. Throws if the
    // file is missing or is a directory.
    std::uint64_t Size(FileSizeSelector selector = FileSizeSelector_Data) const;

private:
    UTF16String mPath;
};

// Compare the named paths as text; no link or "." is resolved.
bool operator==(const File& left, const File& right);
bool operator!=(const File& left, const File& right);
bool operator<(const File& left, const File& right);

}  // namespace filesupport
}  // namespace tolmocore
