#pragma once
// Byte streams on files.
//
// An output stream never writes its file in place. It writes a temporary
// sibling, ".<name>.tmsw-XXXXXX" (a hidden name that no registered extension
// and no ".temp" matches), and Close() syncs it to the disk and renames it
// over the target. A crash therefore leaves the old bytes or the new ones,
// never an empty or torn file. A stream destroyed without Close() deletes its
// temporary and leaves the target as it was.
//
// Every write, sync, rename and permission change goes through the
// process-wide FileOps (FileOps.h), which tests replace to watch the order of
// operations or to fail one.
//
// Failures throw FileSystemError (a std::runtime_error) naming the path. A
// stream is used by one thread at a time. The flags are reserved: callers
// pass 1, and no bit changes anything.

#include <cstdint>
#include <string>
#include <vector>

#include <sys/types.h>

#include <boost/shared_ptr.hpp>

#include "foundation/core/File.h"
#include "foundation/core/SmallBlockAllocator.h"

namespace tolmocore {
namespace filesupport {

class FileOps;

class IPlatformByteStream {
public:
    // Opens the file for reading; throws if it is missing, not a regular file
    // or unreadable.
    IPlatformByteStream(const File& file, Flags<unsigned int> flags);
    ~IPlatformByteStream();
    IPlatformByteStream(const IPlatformByteStream&) = delete;
    IPlatformByteStream& operator=(const IPlatformByteStream&) = delete;

    // The length when the stream was opened.
    std::uint64_t Length() const { return mLength; }
    // Reads exactly `size` bytes into `buffer`, or throws (a file that ends
    // first included).
    void ReadBlock(unsigned char* buffer, unsigned int size);

private:
    File mFile;
    int mFd;
    std::uint64_t mLength;
};

class OPlatformByteStream {
public:
    // Opens for writing by making the temporary in the target's directory.
    // The result keeps the permission bits (and, where allowed, the owner and
    // group) of the file it replaces; a new file gets 0666 less the umask. If
    // the target is a symbolic link, the file it points to is replaced and the
    // link stays. Throws if the target is a directory or the temporary cannot
    // be made (a missing directory included).
    OPlatformByteStream(const File& file, Flags<unsigned int> flags);
    // For private files (the cache file, the last-user file, the keychain
    // store, backup copies): the temporary is made with O_EXCL|O_NOFOLLOW and
    // exactly these permission bits (never wider, whatever the umask or the
    // old file) before a byte is written, and the rename replaces whatever is
    // at the file's name. A symbolic link planted there is replaced, never
    // written through, and what it points to is left alone.
    OPlatformByteStream(const File& file, Flags<unsigned int> flags, mode_t permissions);
    // Without a successful Close(): deletes the temporary; the target keeps
    // its old bytes. Never throws.
    ~OPlatformByteStream();
    OPlatformByteStream(const OPlatformByteStream&) = delete;
    OPlatformByteStream& operator=(const OPlatformByteStream&) = delete;

    // Throws on failure, and after Close().
    void WriteBlock(const unsigned char* buffer, unsigned int size);
    // Flushes, syncs the temporary, renames it over the target and syncs the
    // directory. Throws on any failure; the temporary is gone afterwards
    // either way, and unless the rename was done the target keeps its old
    // bytes. A second Close() does nothing.
    void Close();

private:
    void Open(mode_t permissions, bool permissionsGiven);
    void Flush();
    void Discard() noexcept;

    boost::shared_ptr<FileOps> mOps;  // the one instance this stream uses throughout
    File mFile;                       // what the caller named
    UTF16String mTarget;              // what is replaced: mFile, or the file a link points to
    std::string mTemporary;           // as the system names it; empty once gone
    int mFd;
    std::vector<unsigned char> mBuffer;
    bool mClosed;
};

}  // namespace filesupport
}  // namespace tolmocore
