#include "cli/PrintableName.h"

#include <cstdio>

namespace tolmonetsync {
namespace cli {

namespace {

// The length of the valid UTF-8 sequence at `i` and its code point, or 0 if
// the bytes there are no valid sequence (overlong forms and surrogates too).
std::size_t DecodeUtf8(const std::string& text, std::size_t i, char32_t& code)
{
    const auto byte = [&](std::size_t k) { return static_cast<unsigned char>(text[k]); };
    const unsigned char lead = byte(i);
    std::size_t length = 0;
    char32_t minimum = 0;
    if (lead < 0x80) {
        code = lead;
        return 1;
    } else if ((lead & 0xE0) == 0xC0) {
        length = 2, code = lead & 0x1F, minimum = 0x80;
    } else if ((lead & 0xF0) == 0xE0) {
        length = 3, code = lead & 0x0F, minimum = 0x800;
    } else if ((lead & 0xF8) == 0xF0) {
        length = 4, code = lead & 0x07, minimum = 0x10000;
    } else {
        return 0;
    }
    if (i + length > text.size()) return 0;
    for (std::size_t k = i + 1; k < i + length; ++k) {
        if ((byte(k) & 0xC0) != 0x80) return 0;
        code = (code << 6) | (byte(k) & 0x3F);
    }
    if (code < minimum || code > 0x10FFFF || (code >= 0xD800 && code <= 0xDFFF)) return 0;
    return length;
}

bool IsBidiControl(char32_t code)
{
    return code == 0x061C || code == 0x200E || code == 0x200F || (code >= 0x202A && code <= 0x202E) ||
           (code >= 0x2066 && code <= 0x2069);
}

void AppendEscape(std::string& out, const char* format, unsigned value)
{
    char text[8];
    std::snprintf(text, sizeof text, format, value);
    out += text;
}

}  // namespace

std::string PrintableName(const std::string& text)
{
    std::string out;
    out.reserve(text.size());
    std::size_t i = 0;
    while (i < text.size()) {
        char32_t code = 0;
        const std::size_t length = DecodeUtf8(text, i, code);
        if (length == 0) {
            AppendEscape(out, "\\x%02x", static_cast<unsigned char>(text[i]));
            ++i;
            continue;
        }
        if (code == '\\')
            out += "\\\\";
        else if (code < 0x20 || code == 0x7F)
            AppendEscape(out, "\\x%02x", static_cast<unsigned>(code));
        else if ((code >= 0x80 && code <= 0x9F) || IsBidiControl(code))
            AppendEscape(out, "\\u%04x", static_cast<unsigned>(code));
        else
            out.append(text, i, length);
        i += length;
    }
    return out;
}

}  // namespace cli
}  // namespace tolmonetsync
