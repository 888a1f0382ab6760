#include "foundation/core/Strings.h"

#include <cstring>

namespace {

constexpr char32_t kReplacement = 0xFFFD;

void AppendUTF8(UTF8String& out, char32_t code)
{
    if (code < 0x80) {
        out.push_back(static_cast<unsigned char>(code));
    } else if (code < 0x800) {
        out.push_back(static_cast<unsigned char>(0xC0 | (code >> 6)));
        out.push_back(static_cast<unsigned char>(0x80 | (code & 0x3F)));
    } else if (code < 0x10000) {
        out.push_back(static_cast<unsigned char>(0xE0 | (code >> 12)));
        out.push_back(static_cast<unsigned char>(0x80 | ((code >> 6) & 0x3F)));
        out.push_back(static_cast<unsigned char>(0x80 | (code & 0x3F)));
    } else {
        out.push_back(static_cast<unsigned char>(0xF0 | (code >> 18)));
        out.push_back(static_cast<unsigned char>(0x80 | ((code >> 12) & 0x3F)));
        out.push_back(static_cast<unsigned char>(0x80 | ((code >> 6) & 0x3F)));
        out.push_back(static_cast<unsigned char>(0x80 | (code & 0x3F)));
    }
}

void AppendUTF16(UTF16String& out, char32_t code)
{
    if (code < 0x10000) {
        out.push_back(static_cast<char16_t>(code));
    } else {
        code -= 0x10000;
        out.push_back(static_cast<char16_t>(0xD800 + (code >> 10)));
        out.push_back(static_cast<char16_t>(0xDC00 + (code & 0x3FF)));
    }
}

// Decodes one sequence at `i`; returns false (consuming one byte) on a bad one.
// Overlong forms, surrogates and values past U+10FFFF are bad.
bool DecodeUTF8(const unsigned char* bytes, size_t size, size_t& i, char32_t& code)
{
    const unsigned char lead = bytes[i];
    size_t extra;
    char32_t minimum;
    if (lead < 0x80) {
        code = lead;
        ++i;
        return true;
    } else if ((lead & 0xE0) == 0xC0) {
        extra = 1, minimum = 0x80, code = lead & 0x1F;
    } else if ((lead & 0xF0) == 0xE0) {
        extra = 2, minimum = 0x800, code = lead & 0x0F;
    } else if ((lead & 0xF8) == 0xF0) {
        extra = 3, minimum = 0x10000, code = lead & 0x07;
    } else {
        ++i;
        return false;
    }
    if (size - i <= extra) {
        ++i;
        return false;
    }
    for (size_t k = 1; k <= extra; ++k) {
        if ((bytes[i + k] & 0xC0) != 0x80) {
            ++i;
            return false;
        }
        code = (code << 6) | (bytes[i + k] & 0x3F);
    }
    if (code < minimum || code > 0x10FFFF || (code >= 0xD800 && code <= 0xDFFF)) {
        ++i;
        return false;
    }
    i += extra + 1;
    return true;
}

}  // namespace

UTF8String::UTF8String(const char* text)
{
    if (text) append(text);
}

UTF8String::UTF8String(const char* text, size_type length)
    : UTF8StringBase(reinterpret_cast<const unsigned char*>(text), length)
{
}

UTF8String& UTF8String::append(const char* text)
{
    return text ? append(text, std::strlen(text)) : *this;
}

UTF8String& UTF8String::append(const char* text, size_type length)
{
    UTF8StringBase::append(reinterpret_cast<const unsigned char*>(text), length);
    return *this;
}

UTF8String operator+(const UTF8String& left, const char* right)
{
    UTF8String result(left);
    result.append(right);
    return result;
}

UTF8String operator+(const char* left, const UTF8String& right)
{
    UTF8String result(left);
    result.UTF8StringBase::append(right);
    return result;
}

UTF8String operator+(const UTF8String& left, const UTF8String& right)
{
    UTF8String result(left);
    result.UTF8StringBase::append(right);
    return result;
}

UTF16String operator+(const UTF16String& left, const UTF16String& right)
{
    UTF16String result(left);
    result.append(right);
    return result;
}

UTF16String operator+(const UTF16String& left, const char16_t* right)
{
    UTF16String result(left);
    result.append(right);
    return result;
}

bool operator==(const UTF8String& left, const char* right)
{
    const size_t length = right ? std::strlen(right) : 0;
    return left.size() == length && (length == 0 || std::memcmp(left.data(), right, length) == 0);
}

bool operator!=(const UTF8String& left, const char* right) { return !(left == right); }

std::ostream& operator<<(std::ostream& stream, const UTF8String& text)
{
    return stream.write(text.Chars(), static_cast<std::streamsize>(text.size()));
}

std::ostream& operator<<(std::ostream& stream, const UTF16String& text)
{
    return stream << tolmocore::utility::UTF16to8(text);
}

iUTF16StringStream::iUTF16StringStream(const UTF16String& text)
    : std::istringstream(tolmocore::utility::ToNarrow(text))
{
}

namespace tolmocore {
namespace utility {

UTF16String AsciiToUTF16(const char* text, unsigned long length)
{
    UTF16String result;
    result.reserve(length);
    for (unsigned long i = 0; i < length; ++i)
        result.push_back(static_cast<char16_t>(static_cast<unsigned char>(text[i])));
    return result;
}

UTF16String AsciiToUTF16(const char* text) { return AsciiToUTF16(text, text ? std::strlen(text) : 0); }

UTF16String UTF8to16(const UTF8String& text, UnicodeErrorCode* error, unsigned long* errorOffset)
{
    if (error) *error = UnicodeErrorCode_None;
    UTF16String result;
    result.reserve(text.size());
    const unsigned char* bytes = text.data();
    size_t i = 0;
    while (i < text.size()) {
        // Runs of ASCII are by far the common case.
        if (bytes[i] < 0x80) {
            result.push_back(bytes[i++]);
            continue;
        }
        const size_t start = i;
        char32_t code;
        if (!DecodeUTF8(bytes, text.size(), i, code)) {
            if (error && *error == UnicodeErrorCode_None) {
                *error = UnicodeErrorCode_InvalidSequence;
                if (errorOffset) *errorOffset = static_cast<unsigned long>(start);
            }
            code = kReplacement;
        }
        AppendUTF16(result, code);
    }
    return result;
}

UTF8String UTF16to8(const UTF16String& text)
{
    UTF8String result;
    result.reserve(text.size());
    for (size_t i = 0; i < text.size(); ++i) {
        char32_t code = text[i];
        if (code >= 0xD800 && code <= 0xDBFF) {
            if (i + 1 < text.size() && text[i + 1] >= 0xDC00 && text[i + 1] <= 0xDFFF) {
                code = 0x10000 + ((code - 0xD800) << 10) + (text[i + 1] - 0xDC00);
                ++i;
            } else {
                code = kReplacement;
            }
        } else if (code >= 0xDC00 && code <= 0xDFFF) {
            code = kReplacement;
        }
        AppendUTF8(result, code);
    }
    return result;
}

UTF16String ToUTF16(const std::string& text) { return UTF8to16(UTF8String(text)); }

std::string ToNarrow(const UTF16String& text) { return UTF16to8(text).ToStdString(); }

double StringToNumber(const UTF16String& text, Flags<unsigned short>)
{
    size_t i = 0;
    while (i < text.size() && (text[i] == u' ' || text[i] == u'\t')) ++i;
    bool negative = false;
    if (i < text.size() && (text[i] == u'-' || text[i] == u'+')) negative = text[i++] == u'-';
    double value = 0;
    bool digits = false;
    for (; i < text.size() && text[i] >= u'0' && text[i] <= u'9'; ++i, digits = true)
        value = value * 10 + (text[i] - u'0');
    if (i < text.size() && text[i] == u'.') {
        double scale = 0.1;
        for (++i; i < text.size() && text[i] >= u'0' && text[i] <= u'9'; ++i, scale /= 10, digits = true)
            value += (text[i] - u'0') * scale;
    }
    if (!digits) return 0;
    return negative ? -value : value;
}

}  // namespace utility
}  // namespace tolmocore
