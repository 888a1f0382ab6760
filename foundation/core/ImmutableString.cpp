#include "foundation/core/ImmutableString.h"

#include <algorithm>

const ImmutableString sNullString;

ImmutableString ImmutableString::CreateStatic(const char* text)
{
    if (!text) return ImmutableString();
    return ImmutableString(text, std::strlen(text), nullptr);
}

ImmutableString ImmutableString::Copy(const char* data, std::size_t size)
{
    std::shared_ptr<char> owner(new char[size + 1], std::default_delete<char[]>());
    if (size) std::memcpy(owner.get(), data, size);
    owner.get()[size] = '\0';
    const char* text = owner.get();
    return ImmutableString(text, size, std::move(owner));
}

ImmutableString ImmutableString::CreateDynamic(const char* text)
{
    return Copy(text ? text : "", text ? std::strlen(text) : 0);
}

ImmutableString ImmutableString::CreateDynamic(const UTF8String& text)
{
    return Copy(text.Chars(), text.size());
}

ImmutableString ImmutableString::CreateDynamic(const UTF16String& text)
{
    return CreateDynamic(tolmocore::utility::UTF16to8(text));
}

ImmutableString ImmutableString::CreateDynamic(const std::string& text)
{
    return Copy(text.data(), text.size());
}

UTF16String ImmutableString::ToString() const
{
    return tolmocore::utility::UTF8to16(ToUTF8String());
}

int ImmutableString::Compare(const ImmutableString& other) const noexcept
{
    const int byBytes = std::memcmp(mData, other.mData, std::min(mSize, other.mSize));
    if (byBytes != 0) return byBytes;
    return mSize < other.mSize ? -1 : (mSize > other.mSize ? 1 : 0);
}

std::ostream& operator<<(std::ostream& stream, const ImmutableString& text)
{
    return stream.write(text.c_str(), static_cast<std::streamsize>(text.size()));
}
