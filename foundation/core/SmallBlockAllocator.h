#pragma once
// The allocator behind the foundation's strings and containers, and the
// small value types that public signatures share.

#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <new>
#include <utility>
#include <vector>

// Process-wide allocator for small blocks. Any thread may call it at once.
// It forwards to the global heap: the interface is kept so that containers
// declared over it keep their names, and so that a pooled allocator can be
// dropped in later without touching a signature.
class SmallBlockAllocator {
public:
    static void* Allocate(std::size_t size) { return ::operator new(size); }
    static void Dispose(void* pointer, std::size_t size) noexcept
    {
        (void)size;
        ::operator delete(pointer);
    }

    template <class T>
    class STLAllocator {
    public:
        using value_type = T;

        STLAllocator() noexcept = default;
        template <class U>
        STLAllocator(const STLAllocator<U>&) noexcept
        {
        }

        T* allocate(std::size_t count)
        {
            return static_cast<T*>(Allocate(count * sizeof(T)));
        }
        void deallocate(T* pointer, std::size_t count) noexcept
        {
            Dispose(pointer, count * sizeof(T));
        }

        template <class U>
        bool operator==(const STLAllocator<U>&) const noexcept
        {
            return true;
        }
        template <class U>
        bool operator!=(const STLAllocator<U>&) const noexcept
        {
            return false;
        }
    };

    template <class T>
    using vector = std::vector<T, STLAllocator<T> >;
    template <class K, class V, class Compare = std::less<K> >
    using map = std::map<K, V, Compare, STLAllocator<std::pair<const K, V> > >;
    template <class K, class V, class Compare = std::less<K> >
    using multimap = std::multimap<K, V, Compare, STLAllocator<std::pair<const K, V> > >;
};

// A set of bits passed by value.
template <class T>
class Flags {
public:
    constexpr Flags() noexcept : mBits(0) {}
    constexpr Flags(T bits) noexcept : mBits(bits) {}

    constexpr T Bits() const noexcept { return mBits; }
    constexpr bool Has(T bit) const noexcept { return (mBits & bit) == bit; }
    constexpr bool operator==(Flags other) const noexcept { return mBits == other.mBits; }
    constexpr bool operator!=(Flags other) const noexcept { return mBits != other.mBits; }

private:
    T mBits;
};

// Which size of a file to report; the library only ever asks for the data size.
enum FileSizeSelector { FileSizeSelector_Data = 0 };
