#include <algorithm>
#include <atomic>
#include <charconv>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include <boost/json/basic_parser_impl.hpp>
#include <boost/make_shared.hpp>

#include "foundation/json/JSONText.h"
#include "foundation/json/JSONTextPieces.h"
#include "foundation/json/JSONTree.h"

namespace tolmocore {
namespace serialization {
namespace {

using boost::json::error_code;
using boost::json::string_view;

// Storage for the nodes of one parsed document. Each node's shared count and
// boost::any come from a few large blocks instead of a heap block apiece:
// allocating and freeing those blocks one by one was most of the cost of
// parsing and dropping a large tree. The storage goes when the document's
// last node goes, on whichever thread drops it, so a value kept from a parsed
// tree keeps this storage (some 50 bytes per value of the document) alive.
class NodeArena {
public:
    NodeArena() = default;
    NodeArena(const NodeArena&) = delete;
    NodeArena& operator=(const NodeArena&) = delete;

    // Called only while the document is being built, on the parsing thread.
    void* Allocate(std::size_t size)
    {
        size = (size + kAlignment - 1) & ~(kAlignment - 1);
        if (size > mLeft) Grow(size);
        mLive.fetch_add(1, std::memory_order_relaxed);
        void* const place = mNext;
        mNext += size;
        mLeft -= size;
        return place;
    }

    // Once for each Allocate, and once for the builder's own hold.
    void Release()
    {
        if (mLive.fetch_sub(1, std::memory_order_acq_rel) == 1) delete this;
    }

private:
    static constexpr std::size_t kAlignment = alignof(std::max_align_t);
    static constexpr std::size_t kLargestBlock = std::size_t(256) << 10;

    struct alignas(kAlignment) Block {
        Block* mNext;
    };

    ~NodeArena()
    {
        while (mBlocks) {
            Block* const next = mBlocks->mNext;
            ::operator delete(mBlocks);
            mBlocks = next;
        }
    }

    void Grow(std::size_t size)
    {
        const std::size_t capacity = std::max(mBlockSize, size);
        Block* const block = static_cast<Block*>(::operator new(sizeof(Block) + capacity));
        block->mNext = mBlocks;
        mBlocks = block;
        mNext = reinterpret_cast<char*>(block + 1);
        mLeft = capacity;
        mBlockSize = std::min(mBlockSize * 2, kLargestBlock);
    }

    std::atomic<std::size_t> mLive{1};
    Block* mBlocks = nullptr;
    char* mNext = nullptr;
    std::size_t mLeft = 0;
    std::size_t mBlockSize = 1024;
};

// Hands the arena to boost::allocate_shared. Every copy points at the same
// arena; what keeps it alive is the count of live nodes, not the copies.
template <class T>
class NodeAllocator {
public:
    using value_type = T;

    explicit NodeAllocator(NodeArena* arena) noexcept : mArena(arena) {}
    template <class U>
    NodeAllocator(const NodeAllocator<U>& other) noexcept : mArena(other.mArena)
    {
    }

    T* allocate(std::size_t count) { return static_cast<T*>(mArena->Allocate(count * sizeof(T))); }
    void deallocate(T*, std::size_t) noexcept { mArena->Release(); }

    template <class U>
    bool operator==(const NodeAllocator<U>& other) const noexcept
    {
        return mArena == other.mArena;
    }
    template <class U>
    bool operator!=(const NodeAllocator<U>& other) const noexcept
    {
        return mArena != other.mArena;
    }

    NodeArena* mArena;
};

// Builds the tree straight from the parser's events, without an intermediate
// DOM. A container is linked into its parent as soon as it opens, so no value
// moves once made, and the open containers sit on an explicit stack: building
// never recurses, however deep the text.
class TreeBuilder {
public:
    static constexpr std::size_t max_object_size = std::size_t(-1);
    static constexpr std::size_t max_array_size = std::size_t(-1);
    static constexpr std::size_t max_key_size = std::size_t(-1);
    static constexpr std::size_t max_string_size = std::size_t(-1);

    TreeBuilder() { mOpen.reserve(16); }
    ~TreeBuilder()
    {
        // After the nodes made so far, which may still be in mRoot.
        mRoot = boost::any();
        if (mArena) mArena->Release();
    }
    TreeBuilder(const TreeBuilder&) = delete;
    TreeBuilder& operator=(const TreeBuilder&) = delete;

    boost::any TakeRoot() { return std::move(mRoot); }

    bool on_document_begin(error_code&) { return true; }
    bool on_document_end(error_code&) { return true; }

    bool on_object_begin(error_code&)
    {
        mOpen.push_back(Frame{boost::any_cast<JSONObject>(Put(JSONObject())), nullptr});
        return true;
    }
    bool on_object_end(std::size_t, error_code&)
    {
        mOpen.pop_back();
        return true;
    }
    bool on_array_begin(error_code&)
    {
        mOpen.push_back(Frame{nullptr, boost::any_cast<JSONArray>(Put(JSONArray()))});
        return true;
    }
    bool on_array_end(std::size_t, error_code&)
    {
        mOpen.pop_back();
        return true;
    }

    // A string or key comes whole when it fits the parser's buffer, else in
    // parts that end with the last one.
    bool on_string_part(string_view part, std::size_t, error_code&)
    {
        mText.Add(part);
        return true;
    }
    bool on_string(string_view last, std::size_t, error_code&)
    {
        Put(mText.Take(last));
        return true;
    }
    bool on_key_part(string_view part, std::size_t, error_code&)
    {
        mText.Add(part);
        return true;
    }
    bool on_key(string_view last, std::size_t, error_code&)
    {
        mKey = mText.Take(last);
        return true;
    }

    bool on_number_part(string_view part, error_code&)
    {
        mNumber.append(part.data(), part.size());
        return true;
    }
    bool on_int64(std::int64_t value, string_view, error_code&)
    {
        mNumber.clear();
        Put(static_cast<long long>(value));
        return true;
    }
    bool on_uint64(std::uint64_t value, string_view, error_code&)
    {
        mNumber.clear();
        Put(static_cast<unsigned long long>(value));
        return true;
    }
    bool on_double(double approximate, string_view last, error_code&)
    {
        Put(ExactDouble(approximate, last));
        return true;
    }

    bool on_bool(bool value, error_code&)
    {
        Put(value);
        return true;
    }
    bool on_null(error_code&)
    {
        Put(boost::any());
        return true;
    }

    // Comments are off in the options; these only complete the interface.
    bool on_comment_part(string_view, error_code&) { return true; }
    bool on_comment(string_view, error_code&) { return true; }

private:
    struct Frame {
        JSONObject* mObject;  // exactly one of these is set
        JSONArray* mArray;
    };

    // Stores a value at the current place and returns where it now lives.
    template <class T>
    boost::any* Put(T&& value)
    {
        if (mOpen.empty()) {
            mRoot = std::forward<T>(value);
            return &mRoot;
        }
        if (!mArena) mArena = new NodeArena();
        boost::shared_ptr<boost::any> node = boost::allocate_shared<boost::any>(
            NodeAllocator<boost::any>(mArena), std::forward<T>(value));
        boost::any* const placed = node.get();
        const Frame& top = mOpen.back();
        if (top.mArray) {
            top.mArray->push_back(std::move(node));
        } else {
            // The last of duplicate keys wins.
            const auto inserted = top.mObject->try_emplace(std::move(mKey), std::move(node));
            if (!inserted.second) inserted.first->second = std::move(node);
        }
        return placed;
    }


    // The parser's own conversion can be off by a unit in the last place;
    // reading the digits again gives the correctly rounded value, so that
    // printing and parsing a double is stable. Out of range, the parser's
    // infinity or zero stands.
    double ExactDouble(double approximate, string_view last)
    {
        const char* first = last.data();
        const char* end = first + last.size();
        if (!mNumber.empty()) {
            mNumber.append(last.data(), last.size());
            first = mNumber.data();
            end = first + mNumber.size();
        }
        double exact = approximate;
        const std::from_chars_result result = std::from_chars(first, end, exact);
        mNumber.clear();
        return result.ec == std::errc() ? exact : approximate;
    }

    NodeArena* mArena = nullptr;
    boost::any mRoot;
    std::vector<Frame> mOpen;
    UTF8String mKey;
    JSONTextPieces mText;
    std::string mNumber;
};

}  // namespace

boost::any JSONParse(const UTF8String& text)
{
    const char* const data = text.Chars();
    const void* const nul = std::memchr(data, 0, text.size());
    const std::size_t size =
        nul ? static_cast<std::size_t>(static_cast<const char*>(nul) - data) : text.size();
    if (size > kJSONMaxTextSize) {
        throw JSONError("JSON text of " + std::to_string(size) + " bytes exceeds the limit of " +
                        std::to_string(kJSONMaxTextSize) + " bytes");
    }

    boost::json::parse_options options;
    options.max_depth = kJSONMaxDepth;
    boost::json::basic_parser<TreeBuilder> parser(options);
    error_code error;
    const std::size_t used = parser.write_some(false, data, size, error);
    if (!error && used < size) error = boost::json::error::extra_data;
    if (error) {
        throw JSONError("malformed JSON at byte " + std::to_string(used) + ": " + error.message());
    }
    return parser.handler().TakeRoot();
}

}  // namespace serialization
}  // namespace tolmocore
