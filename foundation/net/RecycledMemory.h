#pragma once
// A block of bytes held by a shared pointer: the bodies of requests and
// responses travel as these.

#include <cstddef>
#include <memory>
#include <vector>

#include <boost/shared_ptr.hpp>

// Hands out and takes back blocks of memory; the process-wide one forwards to the heap.
class MemoryRecycler {
public:
    static void* Allocate(std::size_t size, std::size_t& actualSize);
    static void Recycle(void* pointer, std::size_t size) noexcept;
};

class RecycledMemory {
public:
    // Allocates `size` bytes through MemoryRecycler.
    explicit RecycledMemory(std::size_t size);
    // Points at bytes that `owner` keeps alive; nothing is copied.
    RecycledMemory(const unsigned char* data, std::size_t size, boost::shared_ptr<const void> owner);
    ~RecycledMemory();
    RecycledMemory(const RecycledMemory&) = delete;
    RecycledMemory& operator=(const RecycledMemory&) = delete;

    // A null data pointer counts as size 0.
    const unsigned char* Data() const noexcept { return mData; }
    unsigned char* MutableData() noexcept { return mData; }
    std::size_t Size() const noexcept { return mData ? mSize : 0; }

    // Wraps the vector without copying it; the vector lives as long as the
    // block. A null pointer or an empty vector gives a null pointer, so that an
    // empty body travels as no body.
    static boost::shared_ptr<RecycledMemory const> AdaptAsRecycledMemory(
        const boost::shared_ptr<std::vector<unsigned char> >& bytes);
    // Copies the bytes into a new block; no bytes give a null pointer.
    static boost::shared_ptr<RecycledMemory const> CopyOf(const void* data, std::size_t size);

private:
    unsigned char* mData;
    std::size_t mSize;
    std::size_t mAllocatedSize;  // non-zero only when the recycler owns mData
    boost::shared_ptr<const void> mOwner;
};
