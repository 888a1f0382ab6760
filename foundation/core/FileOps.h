#pragma once
// The seam through which the engine's writes reach the disk: the output
// stream's atomic write, a download's ".temp" file, the download swap and
// its backup copy, the cache file, directory syncs and the permission
// changes that go with them.
//
// Each operation is the system call of the same name and reports the same
// way: -1 (or a negative count) with errno set on failure, so that callers
// keep one way of turning failures into FileSystemError. Paths are as the
// system takes them (UTF-8).
//
// The process-wide instance is the real one unless SetFileOps replaced it.
// Tests derive from FileOps, override what they watch or fail, and call the
// base for the real work, as a wrapper in front of the real thing. An
// instance may be called from any thread at once; a replacement must bear
// that too.

#include <sys/types.h>

#include <string>

#include <boost/shared_ptr.hpp>

namespace tolmocore {
namespace filesupport {

class FileOps {
public:
    virtual ~FileOps();

    // open(2): a descriptor, or -1.
    virtual int Open(const std::string& path, int flags, mode_t mode);
    // write(2) once: the count written (possibly short), or -1.
    virtual ssize_t Write(int fd, const void* data, size_t size);
    // fsync(2) of a descriptor.
    virtual int Fsync(int fd);
    // close(2); the descriptor is gone whatever the result.
    virtual int Close(int fd);
    // rename(2): replaces `to` in one step (a link at `to` is replaced, never
    // followed).
    virtual int Rename(const std::string& from, const std::string& to);
    // unlink(2): removes the name (a link itself, never what it points to).
    virtual int Unlink(const std::string& path);
    // Opens the directory, fsyncs it and closes it: entries renamed or made
    // in it are durable afterwards. Some file systems cannot sync a directory
    // and say EINVAL; callers decide what that means.
    virtual int SyncDirectory(const std::string& path);
    // fchmod(2) and fchown(2).
    virtual int Fchmod(int fd, mode_t mode);
    virtual int Fchown(int fd, uid_t owner, gid_t group);
};

// The process-wide instance. Never null.
boost::shared_ptr<FileOps> GetFileOps();

// Replaces the process-wide instance (null brings back the real one) and
// returns the previous one. Operations already under way finish on the
// instance they started with.
boost::shared_ptr<FileOps> SetFileOps(const boost::shared_ptr<FileOps>& ops);

}  // namespace filesupport
}  // namespace tolmocore
