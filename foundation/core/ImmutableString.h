#pragma once
// A cheap, copyable handle on text that never changes. Copies share the text;
// copying and destruction are safe on any thread.
//
// Two comparisons exist on purpose:
//  - `==`, `<` compare the text (header names in a header list, for instance);
//  - `IsSameAs` compares identity: two handles are the same only if they
//    point at the same text, which is how the keys of a parameter list are told
//    apart (a caller must pass the constant itself, not equal text).

#include <cstddef>
#include <cstring>
#include <memory>
#include <ostream>
#include <string>

#include "foundation/core/Strings.h"

class ImmutableString {
public:
    // The empty value; equal in text to every other empty handle.
    ImmutableString() noexcept : mData(""), mSize(0) {}

    // Wraps a literal of static lifetime: no copy, no allocation.
    static ImmutableString CreateStatic(const char* text);
    // These copy the text.
    static ImmutableString CreateDynamic(const char* text);
    static ImmutableString CreateDynamic(const UTF8String& text);
    static ImmutableString CreateDynamic(const UTF16String& text);
    static ImmutableString CreateDynamic(const std::string& text);

    const char* c_str() const noexcept { return mData; }
    std::size_t size() const noexcept { return mSize; }
    bool empty() const noexcept { return mSize == 0; }

    UTF16String ToString() const;
    UTF8String ToUTF8String() const { return UTF8String(mData, mSize); }
    std::string ToStdString() const { return std::string(mData, mSize); }

    bool IsSameAs(const ImmutableString& other) const noexcept
    {
        return mData == other.mData && mSize == other.mSize;
    }

    int Compare(const ImmutableString& other) const noexcept;
    bool operator==(const ImmutableString& other) const noexcept
    {
        return mSize == other.mSize && std::memcmp(mData, other.mData, mSize) == 0;
    }
    bool operator!=(const ImmutableString& other) const noexcept { return !(*this == other); }
    bool operator<(const ImmutableString& other) const noexcept { return Compare(other) < 0; }

private:
    ImmutableString(const char* data, std::size_t size, std::shared_ptr<const char> owner)
        : mData(data), mSize(size), mOwner(std::move(owner))
    {
    }
    static ImmutableString Copy(const char* data, std::size_t size);

    const char* mData;   // NUL-terminated
    std::size_t mSize;
    std::shared_ptr<const char> mOwner;  // null for static text
};

// The empty value that absent constants are made from.
extern const ImmutableString sNullString;

std::ostream& operator<<(std::ostream& stream, const ImmutableString& text);
