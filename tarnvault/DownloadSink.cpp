#include "tarnvault/DownloadSinkPrivate.h"

#include <fcntl.h>

#include <algorithm>
#include <cerrno>
#include <stdexcept>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/FileSystemError.h"

namespace tolmonetsync {
namespace tarnvault {

using tolmocore::filesupport::ThrowFileSystemError;

namespace {

// Bodies up to this size are held until Finish(); larger ones are written as
// they come, in blocks of about this size.
constexpr std::size_t kHeldBytes = 64 * 1024;
// One block call of the output stream takes at most this much.
constexpr std::size_t kMaxBlock = std::size_t(1) << 30;

}  // namespace

DownloadSink::DownloadSink(const tolmocore::filesupport::File& file)
    : mOps(tolmocore::filesupport::GetFileOps()), mFile(file), mPath(tolmocore::utility::ToNarrow(file.FullPath()))
{
}

DownloadSink::~DownloadSink()
{
    Discard();
}

bool DownloadSink::Write(const unsigned char* data, std::size_t size)
{
    try {
        Take(data, size);
        return true;
    } catch (const std::exception& e) {
        mFailure = *e.what() ? e.what() : "Download: the file could not be written";
        Discard();
        return false;
    }
}

void DownloadSink::Append(const UTF8String& body)
{
    Take(body.data(), body.size());
}

void DownloadSink::Finish()
{
    try {
        if (mFd < 0 && !mStream) MakeFile();
        WriteAll(mHeld.data(), mHeld.size());
        mHeld.clear();
        if (mStream) {
            mStream->Close();
            mStream.reset();
            return;
        }
        // Some file systems cannot sync a file (EINVAL); that is all they offer.
        if (mOps->Fsync(mFd) != 0 && errno != EINVAL) ThrowFileSystemError("Cannot write", mFile.FullPath());
        const int fd = mFd;
        mFd = -1;
        if (mOps->Close(fd) != 0) ThrowFileSystemError("Cannot write", mFile.FullPath());
    } catch (...) {
        Discard();
        throw;
    }
    mMade = false;  // finished: the file is no longer ours to remove
}

void DownloadSink::Discard() noexcept
{
    mStream.reset();
    if (mFd >= 0) mOps->Close(mFd);
    mFd = -1;
    if (mMade) mOps->Unlink(mPath);
    mMade = false;
    mHeld.clear();
    mHeld.shrink_to_fit();
}

void DownloadSink::Take(const unsigned char* data, std::size_t size)
{
    mSize += size;
    if (mHeld.size() + size <= kHeldBytes) {
        mHeld.insert(mHeld.end(), data, data + size);
        return;
    }
    if (mFd < 0 && !mStream) MakeFile();
    WriteAll(mHeld.data(), mHeld.size());
    mHeld.clear();
    if (size >= kHeldBytes)
        WriteAll(data, size);
    else
        mHeld.insert(mHeld.end(), data, data + size);
}

void DownloadSink::MakeFile()
{
    // Where nothing is, the file is made and written in place: a failure
    // removes it and leaves things as they were. Whatever is already there (a
    // leftover of an earlier run, a link someone planted) keeps its bytes
    // until the stream replaces it, whole, at Finish(); never written through.
    mFd = mOps->Open(mPath, O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600);
    if (mFd >= 0) {
        mMade = true;
    } else if (errno == EEXIST) {
        mStream.reset(new tolmocore::filesupport::OPlatformByteStream(mFile, 0, 0600));
    } else {
        ThrowFileSystemError("Cannot open for writing", mFile.FullPath());
    }
    mHeld.reserve(kHeldBytes);
}

void DownloadSink::WriteAll(const unsigned char* data, std::size_t size)
{
    while (mStream && size > 0) {
        const std::size_t part = std::min(size, kMaxBlock);
        mStream->WriteBlock(data, static_cast<unsigned int>(part));
        data += part;
        size -= part;
    }
    while (size > 0) {
        const ssize_t count = mOps->Write(mFd, data, size);
        if (count > 0) {
            data += count;
            size -= static_cast<std::size_t>(count);
        } else if (count < 0 && errno != EINTR) {
            ThrowFileSystemError("Cannot write", mFile.FullPath());
        }
    }
}

}  // namespace tarnvault
}  // namespace tolmonetsync
