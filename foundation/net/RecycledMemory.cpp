#include "foundation/net/RecycledMemory.h"

#include <cstring>
#include <new>

void* MemoryRecycler::Allocate(std::size_t size, std::size_t& actualSize)
{
    actualSize = size;
    return ::operator new(size == 0 ? 1 : size);
}

void MemoryRecycler::Recycle(void* pointer, std::size_t) noexcept { ::operator delete(pointer); }

RecycledMemory::RecycledMemory(std::size_t size) : mData(nullptr), mSize(size), mAllocatedSize(0)
{
    mData = static_cast<unsigned char*>(MemoryRecycler::Allocate(size, mAllocatedSize));
}

RecycledMemory::RecycledMemory(const unsigned char* data, std::size_t size,
                               boost::shared_ptr<const void> owner)
    : mData(const_cast<unsigned char*>(data)), mSize(size), mAllocatedSize(0), mOwner(std::move(owner))
{
}

RecycledMemory::~RecycledMemory()
{
    if (mAllocatedSize != 0 || (!mOwner && mData)) MemoryRecycler::Recycle(mData, mAllocatedSize);
}

boost::shared_ptr<RecycledMemory const> RecycledMemory::AdaptAsRecycledMemory(
    const boost::shared_ptr<std::vector<unsigned char> >& bytes)
{
    if (!bytes || bytes->empty()) return boost::shared_ptr<RecycledMemory const>();
    return boost::shared_ptr<RecycledMemory const>(new RecycledMemory(bytes->data(), bytes->size(), bytes));
}

boost::shared_ptr<RecycledMemory const> RecycledMemory::CopyOf(const void* data, std::size_t size)
{
    if (size == 0) return boost::shared_ptr<RecycledMemory const>();
    boost::shared_ptr<RecycledMemory> block(new RecycledMemory(size));
    std::memcpy(block->MutableData(), data, size);
    return block;
}
