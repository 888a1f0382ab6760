#pragma once
// The foundation's two string types. Network text is UTF8String; file names
// and text for people are UTF16String (host byte order). Plain std::string
// stays for narrow-stream text such as trace lines.

#include <ostream>
#include <sstream>
#include <string>

#include "foundation/core/SmallBlockAllocator.h"

using UTF8StringBase = std::basic_string<unsigned char, std::char_traits<unsigned char>,
                                         SmallBlockAllocator::STLAllocator<unsigned char> >;
using UTF16StringBase = std::basic_string<char16_t, std::char_traits<char16_t>,
                                          SmallBlockAllocator::STLAllocator<char16_t> >;

class UTF8String : public UTF8StringBase {
public:
    using UTF8StringBase::UTF8StringBase;
    using UTF8StringBase::append;
    using UTF8StringBase::operator+=;
    using UTF8StringBase::operator=;

    UTF8String() = default;
    UTF8String(const UTF8StringBase& other) : UTF8StringBase(other) {}
    UTF8String(UTF8StringBase&& other) noexcept : UTF8StringBase(std::move(other)) {}
    // NUL-terminated narrow text; a null pointer gives the empty string.
    UTF8String(const char* text);
    UTF8String(const char* text, size_type length);
    explicit UTF8String(const std::string& text) : UTF8String(text.data(), text.size()) {}

    UTF8String& append(const char* text);
    UTF8String& append(const char* text, size_type length);
    UTF8String& append(const std::string& text) { return append(text.data(), text.size()); }
    UTF8String& operator+=(const char* text) { return append(text); }
    UTF8String& operator+=(const std::string& text) { return append(text); }

    // The bytes as narrow text, and a narrow view of the NUL-terminated buffer.
    std::string ToStdString() const { return std::string(Chars(), size()); }
    const char* Chars() const { return reinterpret_cast<const char*>(c_str()); }
};

class UTF16String : public UTF16StringBase {
public:
    using UTF16StringBase::UTF16StringBase;
    using UTF16StringBase::operator=;

    UTF16String() = default;
    UTF16String(const UTF16StringBase& other) : UTF16StringBase(other) {}
    UTF16String(UTF16StringBase&& other) noexcept : UTF16StringBase(std::move(other)) {}
    explicit UTF16String(const std::u16string& text) : UTF16StringBase(text.data(), text.size()) {}
};

UTF8String operator+(const UTF8String& left, const char* right);
UTF8String operator+(const char* left, const UTF8String& right);
UTF8String operator+(const UTF8String& left, const UTF8String& right);
UTF16String operator+(const UTF16String& left, const UTF16String& right);
UTF16String operator+(const UTF16String& left, const char16_t* right);
bool operator==(const UTF8String& left, const char* right);
bool operator!=(const UTF8String& left, const char* right);

// Writes the bytes as they are.
std::ostream& operator<<(std::ostream& stream, const UTF8String& text);
// Writes the text as UTF-8.
std::ostream& operator<<(std::ostream& stream, const UTF16String& text);

// An output stream whose result is a UTF8String.
class oUTF8StringStream : public std::ostringstream {
public:
    UTF8String GetString() const { return UTF8String(str()); }
};

// An input stream over a UTF16String, read as UTF-8 text.
class iUTF16StringStream : public std::istringstream {
public:
    explicit iUTF16StringStream(const UTF16String& text);
};

namespace tolmocore {
namespace utility {

// What went wrong in a conversion; bad sequences become U+FFFD either way.
enum UnicodeErrorCode {
    UnicodeErrorCode_None = 0,
    UnicodeErrorCode_InvalidSequence = 1,
};

// Widens plain ASCII (each byte becomes one unit).
UTF16String AsciiToUTF16(const char* text, unsigned long length);
UTF16String AsciiToUTF16(const char* text);

// Malformed input never throws: each bad sequence becomes U+FFFD, `error`
// (when given) is set and `errorOffset` gets the offset of the first one.
UTF16String UTF8to16(const UTF8String& text, UnicodeErrorCode* error = nullptr,
                     unsigned long* errorOffset = nullptr);
// An unpaired surrogate becomes U+FFFD.
UTF8String UTF16to8(const UTF16String& text);

// Shorthands for the common narrow <-> UTF-16 paths.
UTF16String ToUTF16(const std::string& text);
std::string ToNarrow(const UTF16String& text);

// Reads the leading decimal number of the text ("9.0.1" gives 9.0, "8" gives
// 8); leading blanks are skipped. Text with no leading number gives 0.
// Independent of the C locale. No flag bits change the result.
double StringToNumber(const UTF16String& text, Flags<unsigned short> flags = 1);

}  // namespace utility
}  // namespace tolmocore
