#include "server/ContentFiles.h"

#include <cerrno>
#include <cstring>
#include <stdexcept>

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace tolmonetsync {
namespace server {

namespace {

const char kTemporaryPrefix[] = "incoming.";

[[noreturn]] void Fail(const std::string& what, const std::string& path)
{
    throw std::runtime_error(what + " " + path + ": " + std::strerror(errno));
}

void MakeDirectory(const std::string& path)
{
    if (::mkdir(path.c_str(), 0700) != 0 && errno != EEXIST) Fail("cannot create", path);
}

void SyncDirectory(const std::string& path)
{
    const int fd = ::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0) Fail("cannot open", path);
    const int rc = ::fsync(fd);
    ::close(fd);
    if (rc != 0) Fail("cannot sync", path);
}

bool IsTemporary(const char* name)
{
    return std::strncmp(name, kTemporaryPrefix, sizeof(kTemporaryPrefix) - 1) == 0;
}

}  // namespace

ContentFiles::ContentFiles(const std::string& dataDirectory) : mDirectory(dataDirectory + "/content")
{
    MakeDirectory(dataDirectory);
    MakeDirectory(mDirectory);
    DIR* dir = ::opendir(mDirectory.c_str());
    if (!dir) Fail("cannot list", mDirectory);
    while (dirent* entry = ::readdir(dir)) {
        if (IsTemporary(entry->d_name)) ::unlink((mDirectory + "/" + entry->d_name).c_str());
    }
    ::closedir(dir);
}

std::string ContentFiles::PathOf(const std::string& id) const
{
    return mDirectory + "/" + id;
}

ContentFiles::Incoming::Incoming(ContentFiles& files)
    : mFiles(files), mTemporary(files.mDirectory + "/" + kTemporaryPrefix + "XXXXXX")
{
    mFd = ::mkstemp(&mTemporary[0]);
    if (mFd < 0) Fail("cannot create", mTemporary);
}

ContentFiles::Incoming::~Incoming()
{
    Discard();
}

void ContentFiles::Incoming::Discard()
{
    if (mFd < 0) return;
    ::close(mFd);
    mFd = -1;
    ::unlink(mTemporary.c_str());
}

void ContentFiles::Incoming::Append(const char* data, std::size_t size)
{
    if (mFd < 0) throw std::runtime_error("content already kept or discarded");
    std::size_t written = 0;
    while (written < size) {
        const ssize_t n = ::write(mFd, data + written, size - written);
        if (n < 0) {
            if (errno == EINTR) continue;
            const int saved = errno;
            Discard();
            errno = saved;
            Fail("cannot write", mTemporary);
        }
        written += static_cast<std::size_t>(n);
    }
    mSize += size;
}

void ContentFiles::Incoming::Keep(const std::string& id)
{
    if (mFd < 0) throw std::runtime_error("content already kept or discarded");
    const int fd = mFd;
    mFd = -1;
    const bool synced = ::fsync(fd) == 0;
    const int syncError = errno;
    const bool closed = ::close(fd) == 0;
    if (!synced) errno = syncError;
    if (!synced || !closed) {
        const int saved = errno;
        ::unlink(mTemporary.c_str());
        errno = saved;
        Fail("cannot sync", mTemporary);
    }
    if (::rename(mTemporary.c_str(), mFiles.PathOf(id).c_str()) != 0) {
        const int saved = errno;
        ::unlink(mTemporary.c_str());
        errno = saved;
        Fail("cannot rename", mTemporary);
    }
    SyncDirectory(mFiles.mDirectory);
}

ContentFiles::Opened::~Opened()
{
    ::close(mFd);
}

std::size_t ContentFiles::Opened::ReadAt(std::uint64_t offset, char* buffer, std::size_t size) const
{
    for (;;) {
        const ssize_t n = ::pread(mFd, buffer, size, static_cast<off_t>(offset));
        if (n >= 0) return static_cast<std::size_t>(n);
        if (errno != EINTR) throw std::runtime_error(std::string("cannot read content: ") + std::strerror(errno));
    }
}

std::shared_ptr<const ContentFiles::Opened> ContentFiles::Open(const std::string& id) const
{
    const std::string path = PathOf(id);
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) Fail("cannot open", path);
    struct stat info;
    if (::fstat(fd, &info) != 0) {
        const int saved = errno;
        ::close(fd);
        errno = saved;
        Fail("cannot read", path);
    }
    return std::make_shared<const Opened>(fd, static_cast<std::uint64_t>(info.st_size));
}

std::string ContentFiles::Read(const std::string& id) const
{
    const std::shared_ptr<const Opened> opened = Open(id);
    std::string bytes(static_cast<std::size_t>(opened->Size()), '\0');
    std::size_t got = 0;
    while (got < bytes.size()) {
        const std::size_t n = opened->ReadAt(got, &bytes[got], bytes.size() - got);
        if (n == 0) break;
        got += n;
    }
    bytes.resize(got);
    return bytes;
}

void ContentFiles::Remove(const std::string& id)
{
    ::unlink(PathOf(id).c_str());
}

std::vector<std::string> ContentFiles::Ids() const
{
    std::vector<std::string> ids;
    DIR* dir = ::opendir(mDirectory.c_str());
    if (!dir) Fail("cannot list", mDirectory);
    while (dirent* entry = ::readdir(dir)) {
        if (entry->d_name[0] != '.' && !IsTemporary(entry->d_name)) ids.push_back(entry->d_name);
    }
    ::closedir(dir);
    return ids;
}

std::size_t ContentFiles::TemporaryCount() const
{
    std::size_t count = 0;
    DIR* dir = ::opendir(mDirectory.c_str());
    if (!dir) return 0;
    while (dirent* entry = ::readdir(dir)) {
        if (IsTemporary(entry->d_name)) ++count;
    }
    ::closedir(dir);
    return count;
}

}  // namespace server
}  // namespace tolmonetsync
