#include "foundation/net/QuoteURL.h"

#include <cstdio>
#include <cstring>
#include <mutex>

namespace tolmonet {
namespace {

// Entry i is byte i as it appears in a query: itself when safe, else "%xx".
struct QuoteTable {
    char mText[256][4];
    unsigned char mLength[256];
};

const QuoteTable& MakeQuoteTable()
{
    static QuoteTable* table = nullptr;
    static std::once_flag once;
    std::call_once(once, [] {
        static const char kSafe[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_.-";
        table = new QuoteTable;  // kept until exit, like every process-wide table
        for (int i = 0; i < 256; ++i) {
            if (i > 0 && i < 128 && std::strchr(kSafe, i)) {
                table->mText[i][0] = static_cast<char>(i);
                table->mText[i][1] = '\0';
                table->mLength[i] = 1;
            } else {
                std::snprintf(table->mText[i], sizeof table->mText[i], "%%%02x", i);
                table->mLength[i] = 3;
            }
        }
    });
    return *table;
}

void AppendQuoted(UTF8String& out, const unsigned char* bytes, size_t size, const QuoteTable& table)
{
    for (size_t i = 0; i < size; ++i) out.append(table.mText[bytes[i]], table.mLength[bytes[i]]);
}

}  // namespace

UTF8String _Quote(const UTF8String& text)
{
    UTF8String result;
    result.reserve(text.size());
    AppendQuoted(result, text.data(), text.size(), MakeQuoteTable());
    return result;
}

UTF8String QuoteURL(const FormList& pairs)
{
    const QuoteTable& table = MakeQuoteTable();
    UTF8String result;
    bool first = true;
    for (const auto& pair : pairs) {
        if (!first) result.push_back('&');
        first = false;
        AppendQuoted(result, reinterpret_cast<const unsigned char*>(pair.first.c_str()), pair.first.size(), table);
        result.push_back('=');
        AppendQuoted(result, pair.second.data(), pair.second.size(), table);
    }
    return result;
}

}  // namespace tolmonet
