#include "foundation/core/KeychainStoreFormat.h"

#include <cstring>
#include <string_view>

namespace tolmocore {
namespace security {
namespace detail {
namespace {

const char kHeader[] = "tolmonetsync keychain store 1";

// Each byte that needs escaping, and the letter that stands for it after "\\".
constexpr std::string_view kSpecials("\\\t\n\r", 4);
constexpr std::string_view kLetters("\\tnr", 4);

void AppendEscaped(std::string& out, const UTF16String& text)
{
    for (char c : utility::ToNarrow(text)) {
        const size_t special = kSpecials.find(c);
        if (special == std::string_view::npos) {
            out += c;
        } else {
            out += '\\';
            out += kLetters[special];
        }
    }
}

// False on an unknown escape, a lone trailing backslash or invalid UTF-8.
bool Unescape(const char* begin, const char* end, UTF16String& result)
{
    UTF8String bytes;
    for (const char* p = begin; p < end; ++p) {
        char c = *p;
        if (c == '\\') {
            const size_t letter = ++p < end ? kLetters.find(*p) : std::string_view::npos;
            if (letter == std::string_view::npos) return false;
            c = kSpecials[letter];
        }
        bytes.push_back(static_cast<unsigned char>(c));
    }
    utility::UnicodeErrorCode error;
    result = utility::UTF8to16(bytes, &error);
    return error == utility::UnicodeErrorCode_None;
}

void ParseLine(const char* begin, const char* end, KeychainEntries& entries)
{
    const std::size_t length = static_cast<std::size_t>(end - begin);
    if (length == sizeof(kHeader) - 1 && std::memcmp(begin, kHeader, length) == 0) return;
    const char* firstTab = static_cast<const char*>(std::memchr(begin, '\t', length));
    if (!firstTab) return;
    const char* secondTab = static_cast<const char*>(std::memchr(firstTab + 1, '\t', end - firstTab - 1));
    if (!secondTab || std::memchr(secondTab + 1, '\t', end - secondTab - 1)) return;
    UTF16String domain, account, password;
    if (Unescape(begin, firstTab, domain) && Unescape(firstTab + 1, secondTab, account) &&
        Unescape(secondTab + 1, end, password))
        entries[std::make_pair(domain, account)] = password;
}

}  // namespace

KeychainEntries ParseKeychainStore(const unsigned char* data, std::size_t size)
{
    KeychainEntries entries;
    const char* p = reinterpret_cast<const char*>(data);
    const char* const end = p + size;
    while (p < end) {
        const char* lineEnd = static_cast<const char*>(std::memchr(p, '\n', end - p));
        if (!lineEnd) break;  // truncated: see the header
        ParseLine(p, lineEnd, entries);
        p = lineEnd + 1;
    }
    return entries;
}

std::string SerializeKeychainStore(const KeychainEntries& entries)
{
    std::string out = std::string(kHeader) + "\n";
    for (const auto& entry : entries) {
        AppendEscaped(out, entry.first.first);
        out += '\t';
        AppendEscaped(out, entry.first.second);
        out += '\t';
        AppendEscaped(out, entry.second);
        out += '\n';
    }
    return out;
}

}  // namespace detail
}  // namespace security
}  // namespace tolmocore
