#pragma once
// Content bytes as one file per item under <data>/content. A write lands in
// a temporary sibling that is synced and renamed, and the directory is
// synced after the rename: once Incoming::Keep returns, the bytes survive a crash,
// and a crash before that leaves no file under the item's name.
//
// Threads: any. Errors: Read and Incoming throw std::runtime_error
// with the system's message; Remove ignores a missing file.

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace tolmonetsync {
namespace server {

class ContentFiles {
public:
    // Content arriving in pieces, as an upload's body does: it goes to a
    // temporary file, and Keep makes it durable under an item's id. Until
    // then (a refused or broken upload) the destructor removes it.
    class Incoming {
    public:
        explicit Incoming(ContentFiles& files);
        ~Incoming();
        Incoming(const Incoming&) = delete;
        Incoming& operator=(const Incoming&) = delete;

        void Append(const char* data, std::size_t size);
        std::uint64_t Size() const { return mSize; }
        // Syncs the bytes, renames them to the id and syncs the directory.
        void Keep(const std::string& id);

    private:
        void Discard();

        ContentFiles& mFiles;
        std::string mTemporary;
        int mFd = -1;
        std::uint64_t mSize = 0;
    };

    // Makes the directory; removes temporaries a crash may have left.
    explicit ContentFiles(const std::string& dataDirectory);

    // An item's bytes opened for reading. The descriptor keeps them readable
    // while they are sent, even if the item is removed meanwhile.
    class Opened {
    public:
        Opened(int fd, std::uint64_t size) : mFd(fd), mSize(size) {}
        ~Opened();
        Opened(const Opened&) = delete;
        Opened& operator=(const Opened&) = delete;

        // Up to `size` bytes from `offset`; 0 at the end (or if the file shrank).
        std::size_t ReadAt(std::uint64_t offset, char* buffer, std::size_t size) const;
        std::uint64_t Size() const { return mSize; }

    private:
        int mFd;
        std::uint64_t mSize;
    };

    std::shared_ptr<const Opened> Open(const std::string& id) const;
    std::string Read(const std::string& id) const;
    void Remove(const std::string& id);
    // Every item id that has a file, temporaries left out.
    std::vector<std::string> Ids() const;
    // Leftover temporaries in the directory; for tests.
    std::size_t TemporaryCount() const;
    std::string PathOf(const std::string& id) const;

private:
    std::string mDirectory;
};

}  // namespace server
}  // namespace tolmonetsync
