#pragma once
// A value naming a directory, which need not exist, and the operations on it.
//
// Constructing, copying and comparing never touch the disk. Every operation
// that does throws a std::exception subclass whose text names the path:
// FileSystemError for failures of the system, std::invalid_argument for a
// name that is not one plain component. An object is used by one thread at a
// time; PrefDir/AppDir and their setters may be called from any thread.

#include <cstdint>

#include <boost/date_time/posix_time/posix_time_types.hpp>
#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/core/DirIterator.h"
#include "foundation/core/FileSystemError.h"
#include "foundation/core/Strings.h"

namespace tolmocore {
namespace filesupport {

class File;

class Dir {
public:
    using FileIterator = DirIterator<File>;
    using SubdirIterator = DirIterator<Dir>;
    // The types of the walks' reserved parameters (see BeginFiles).
    using AbortCheck = boost::function<bool()>;
    using NameFilter = boost::function<bool(const UTF16String&, const UTF16String&)>;

    // Names nothing; FullPath() is empty.
    Dir();
    // The path as given, with repeated and trailing "/" dropped.
    explicit Dir(const UTF16String& path);
    // `name` inside `parent`. A name that is empty, "." or "..", or that holds
    // "/" or NUL, throws std::invalid_argument.
    Dir(const Dir& parent, const UTF16String& name);

    // True if a directory (or a symbolic link to one) of this name exists.
    bool Exists() const;
    // Makes the directory and any missing parents. Gives true if it made it,
    // false if it existed already; throws if something else is in the way or
    // the system refuses.
    bool Create() const;
    // The same, but the directory itself is made readable by its owner alone
    // (0700); missing parents get the usual mode. A directory that exists
    // keeps its mode.
    bool CreatePrivate() const;
    // Makes the directory's entries durable: a rename into it, or a file made
    // in it, survives a crash from then on. Goes through FileOps (FileOps.h).
    // Throws on failure; a file system that cannot sync a directory (EINVAL)
    // has nothing more to offer and counts as done.
    void Sync() const;
    // Removes the directory with everything in it. Symbolic links inside are
    // removed as links and their targets are left alone; if this Dir itself
    // names a link, only the link goes. Gives false if nothing was there;
    // throws if a file that is not a directory is.
    // Throws at the first entry that cannot be removed; what was removed
    // before it stays removed.
    bool Delete() const;

    // The modification time as a UTC ptime, to the microsecond. Throws if the
    // directory is missing.
    boost::posix_time::ptime Modified() const;
    // Sets the modification time (to the microsecond). Throws on failure.
    void SetModified(const boost::posix_time::ptime& time) const;

    const UTF16String& FullPath() const { return mPath; }
    // The last component ("" for "/").
    UTF16String GetName() const;
    // The directory holding this one ("/" for "/", "." for a bare name).
    Dir Parent() const;

    // Walks the regular files (and links to them) directly in this directory,
    // sorted by the bytes of their UTF-8 names, so every file system gives the
    // same order. Names that are not valid UTF-8 cannot be named by a File and
    // are left out. A directory that cannot be read throws: an empty walk
    // always means an empty directory, never a failure.
    // The four parameters are reserved: the only accepted values are false,
    // null, false and an empty pointer; any other throws
    // std::invalid_argument rather than being quietly ignored.
    FileIterator BeginFiles(bool reservedFlag = false, const AbortCheck* reservedCheck = nullptr,
                            bool reservedFlag2 = false, const boost::shared_ptr<NameFilter>& reservedFilter = {}) const;
    FileIterator EndFiles() const { return FileIterator(); }
    // The same over subdirectories (and links to them); the parameters are
    // reserved in the same way.
    SubdirIterator BeginSubdirs(bool reservedFlag = false, const AbortCheck* reservedCheck = nullptr,
                                const boost::shared_ptr<NameFilter>& reservedFilter = {}) const;
    SubdirIterator EndSubdirs() const { return SubdirIterator(); }

    // The user's preference directory of the host: what SetPrefDir set, or
    // else $XDG_CONFIG_HOME (when absolute; otherwise $HOME/.config) followed
    // by the company and the application names of HostConfig, leaving out
    // empty ones; "/" and NUL in those names become "_", and "." or ".." is
    // left out. Worked out on every call, so a host that sets its identity
    // late still gets its own directory. Not created here. Throws if no home
    // directory can be found.
    static Dir PrefDir();
    // Replaces the default; an empty Dir() restores it.
    static void SetPrefDir(const Dir& directory);
    // Refuses a preference directory that someone else could change under the
    // library: throws FileSystemError (EACCES) naming it if it belongs to
    // another user, is writable by others, or is writable by its group while
    // that group is not its owner's own (a group of the owner's name with no
    // other member, as a umask of 002 leaves directories on systems that give
    // each user a group). A missing directory passes: what the library makes
    // there is 0700. Runs before the library touches a file there; never in
    // the loading of stored credentials, whose failure would sign the user out.
    static void CheckPrefDir();
    // True lets any preference directory pass CheckPrefDir, for a host that
    // shares one deliberately. False (the default) restores the check.
    static void SetAllowSharedPrefDir(bool allow);
    // The directory of the host application: what SetAppDir set, or else the
    // directory of the running executable. Throws if that cannot be read.
    static Dir AppDir();
    // Replaces the default; an empty Dir() restores it.
    static void SetAppDir(const Dir& directory);

private:
    UTF16String mPath;
};

// Compare the named paths as text; no link or "." is resolved.
bool operator==(const Dir& left, const Dir& right);
bool operator!=(const Dir& left, const Dir& right);
bool operator<(const Dir& left, const Dir& right);

}  // namespace filesupport
}  // namespace tolmocore

// Walks yield Files, so a user of Dir gets File with it.
#include "foundation/core/File.h"
