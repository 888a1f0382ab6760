#include <gtest/gtest.h>

#include <thread>
#include <vector>

#include "foundation/net/QuoteURL.h"

using tolmonet::FormList;
using tolmonet::QuoteURL;

TEST(QuoteURL, JoinsPairsInOrderAndQuotesEveryByteOutsideTheSafeSetWithLowerCaseDigits)
{
    const auto quote = [](std::initializer_list<std::pair<const char*, std::string> > items) {
        FormList list;
        for (const auto& item : items)
            list.emplace_back(ImmutableString::CreateDynamic(item.first), UTF8String(item.second));
        return QuoteURL(list).ToStdString();
    };
    EXPECT_EQ(quote({}), "");
    EXPECT_EQ(quote({{"q", "1"}, {"q", "2"}, {"empty", ""}}), "q=1&q=2&empty=");
    EXPECT_EQ(quote({{"a/b", "{\"a\":\"b c\xC3\xA9\"}"}}), "a%2fb=%7b%22a%22%3a%22b%20c%c3%a9%22%7d");

    const std::string safe = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_.-";
    for (int byte = 0; byte < 256; ++byte) {
        const std::string quoted = tolmonet::_Quote(UTF8String(1, static_cast<char>(byte))).ToStdString();
        char expected[4];
        std::snprintf(expected, sizeof expected, "%%%02x", byte);
        const bool isSafe = byte != 0 && safe.find(static_cast<char>(byte)) != std::string::npos;
        EXPECT_EQ(quoted, isSafe ? std::string(1, static_cast<char>(byte)) : std::string(expected)) << byte;
    }

    // First callers on several threads see one finished table.
    std::vector<std::thread> threads;
    std::atomic<int> wrong{0};
    for (int t = 0; t < 4; ++t)
        threads.emplace_back([&] { wrong += quote({{"name", "a b"}}) == "name=a%20b" ? 0 : 1; });
    for (auto& thread : threads) thread.join();
    EXPECT_EQ(wrong.load(), 0);
}
