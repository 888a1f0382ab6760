#include "foundation/core/Redaction.h"

#include <algorithm>
#include <cctype>
#include <cstring>

namespace tolmocore {
namespace debug {
namespace {

const char* const kSecretKeys[] = {"password",     "client_secret", "refresh_token", "token",
                                   "bearer_token", "access_token",  "device_token",  "authorization"};
const char kBlank[] = "***";
// A key spelled with every escape still fits; a longer run is no key, and
// the cap keeps the scan linear on text full of quotes or separators.
const std::size_t kLongestKeyText = 128;
const std::size_t npos = std::string::npos;

char Lower(char c)
{
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

bool IsSecretKey(const std::string& key)
{
    for (const char* secret : kSecretKeys) {
        const std::size_t length = std::strlen(secret);
        if (key.size() != length) continue;
        bool same = true;
        for (std::size_t i = 0; i < length && same; ++i) same = Lower(key[i]) == secret[i];
        if (same) return true;
    }
    return false;
}

int HexValue(char c)
{
    if (c >= '0' && c <= '9') return c - '0';
    if (c >= 'a' && c <= 'f') return c - 'a' + 10;
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    return -1;
}

// strchr would also find the NUL that ends `set`.
bool IsOneOf(char c, const char* set)
{
    return c != '\0' && std::strchr(set, c) != nullptr;
}

bool IsSpace(char c)
{
    return c == ' ' || c == '\t' || c == '\r' || c == '\n';
}

std::size_t SkipSpace(const std::string& text, std::size_t i)
{
    while (i < text.size() && IsSpace(text[i])) ++i;
    return i;
}

// Where a field or a header line may begin.
bool AtFieldStart(const std::string& text, std::size_t i)
{
    return i == 0 || text[i - 1] == '?' || text[i - 1] == '&' || text[i - 1] == '\n';
}

// The index of the quote closing the JSON string opened at `open`, or the
// text's size if it is never closed.
std::size_t ClosingQuote(const std::string& text, std::size_t open)
{
    for (std::size_t i = open + 1; i < text.size(); ++i) {
        if (text[i] == '\\')
            ++i;
        else if (text[i] == '"')
            return i;
    }
    return text.size();
}

// Decodes the JSON string opened at `open` as a key; gives the index past its
// closing quote, or npos if it is no short, well-formed string.
std::size_t ReadJsonKey(const std::string& text, std::size_t open, std::string& key)
{
    key.clear();
    const std::size_t limit = std::min(text.size(), open + 1 + kLongestKeyText);
    std::size_t i = open + 1;
    while (i < limit) {
        const char c = text[i];
        if (c == '"') return i + 1;
        if (c != '\\') {
            key += c;
            ++i;
            continue;
        }
        if (i + 1 >= text.size()) return npos;
        const char escaped = text[i + 1];
        if (escaped == 'u') {
            if (i + 6 > text.size()) return npos;
            int code = 0;
            for (std::size_t k = i + 2; k < i + 6; ++k) {
                const int digit = HexValue(text[k]);
                if (digit < 0) return npos;
                code = code * 16 + digit;
            }
            // Only ASCII can spell a secret key; anything else just must not match.
            key += code < 0x80 ? static_cast<char>(code) : '\x01';
            i += 6;
        } else {
            key += escaped == '"' || escaped == '\\' || escaped == '/' ? escaped : '\x01';
            i += 2;
        }
    }
    return npos;
}

// The end of the object or array that starts at `open`: past its closing
// bracket, or the text's size if it is never closed.
std::size_t EndOfCompound(const std::string& text, std::size_t open)
{
    int depth = 0;
    for (std::size_t i = open; i < text.size(); ++i) {
        const char c = text[i];
        if (c == '"') {
            i = ClosingQuote(text, i);
        } else if (c == '{' || c == '[') {
            ++depth;
        } else if ((c == '}' || c == ']') && --depth == 0) {
            return i + 1;
        }
    }
    return text.size();
}

// "key": value at the quote at i. The closing quote of a blanked string is
// left to be scanned again: in broken JSON it may open the next key.
bool RedactJsonMember(const std::string& text, std::size_t i, std::string& out, std::size_t& next)
{
    std::string key;
    const std::size_t afterKey = ReadJsonKey(text, i, key);
    if (afterKey == npos || !IsSecretKey(key)) return false;
    const std::size_t colon = SkipSpace(text, afterKey);
    if (colon >= text.size() || text[colon] != ':') return false;
    const std::size_t value = SkipSpace(text, colon + 1);
    out.append(text, i, value - i);
    next = value;
    if (value >= text.size()) return true;
    const char first = text[value];
    if (first == '"') {
        out += '"';
        out += kBlank;
        next = ClosingQuote(text, value);
    } else if (first == '{' || first == '[') {
        out += '"';
        out += kBlank;
        out += '"';
        next = EndOfCompound(text, value);
    } else {
        // A bare value runs to the end of its line, not to the next space: a
        // header line after a line break that the space before a value took
        // must not leave "Bearer X" behind.
        std::size_t end = value;
        while (end < text.size() && !IsOneOf(text[end], ",}]\"\r\n")) ++end;
        while (end > value && (text[end - 1] == ' ' || text[end - 1] == '\t')) --end;
        if (end > value) {
            out += '"';
            out += kBlank;
            out += '"';
        }
        next = end;
    }
    return true;
}

// "Name: value" at the start of a line: the rest of the line is blanked.
bool RedactHeaderLine(const std::string& text, std::size_t i, std::string& out, std::size_t& next)
{
    std::size_t name = i;
    while (name < text.size() && (text[name] == ' ' || text[name] == '\t')) ++name;
    std::size_t end = name;
    while (end < text.size() && end - name <= kLongestKeyText &&
           (std::isalnum(static_cast<unsigned char>(text[end])) || text[end] == '_' || text[end] == '-'))
        ++end;
    std::size_t colon = end;
    while (colon < text.size() && (text[colon] == ' ' || text[colon] == '\t')) ++colon;
    if (colon >= text.size() || text[colon] != ':' || !IsSecretKey(text.substr(name, end - name))) return false;
    std::size_t value = colon + 1;
    while (value < text.size() && (text[value] == ' ' || text[value] == '\t')) ++value;
    std::size_t lineEnd = value;
    while (lineEnd < text.size() && text[lineEnd] != '\r' && text[lineEnd] != '\n') ++lineEnd;
    out.append(text, i, value - i);
    if (lineEnd > value) out += kBlank;
    next = lineEnd;
    return true;
}

// "key=value" of a query or form, its key perhaps percent-encoded.
bool RedactQueryField(const std::string& text, std::size_t i, std::string& out, std::size_t& next)
{
    std::string key;
    std::size_t k = i;
    while (k < text.size() && k - i <= kLongestKeyText && !IsOneOf(text[k], "=&#?\"\r\n")) {
        if (text[k] == '%' && k + 2 < text.size() && HexValue(text[k + 1]) >= 0 && HexValue(text[k + 2]) >= 0) {
            key += static_cast<char>(HexValue(text[k + 1]) * 16 + HexValue(text[k + 2]));
            k += 3;
        } else {
            key += text[k++];
        }
    }
    if (k >= text.size() || text[k] != '=' || !IsSecretKey(key)) return false;
    std::size_t end = k + 1;
    while (end < text.size() && !IsOneOf(text[end], "&#\"\r\n")) ++end;
    out.append(text, i, k + 1 - i);
    if (end > k + 1) out += kBlank;
    next = end;
    return true;
}

}  // namespace

std::string RedactSecrets(const std::string& text)
{
    std::string out;
    out.reserve(text.size());
    std::size_t i = 0;
    while (i < text.size()) {
        std::size_t next = i;
        if (AtFieldStart(text, i) && (RedactHeaderLine(text, i, out, next) || RedactQueryField(text, i, out, next))) {
            i = next;
            continue;
        }
        if (text[i] == '"' && RedactJsonMember(text, i, out, next)) {
            i = next;
            continue;
        }
        out += text[i++];
    }
    return out;
}

}  // namespace debug
}  // namespace tolmocore
