#include <gtest/gtest.h>

#include <thread>
#include <vector>

#include "foundation/net/QuoteURL.h"

using tolmonet::FormList;
using tolmonet::QuoteURL;

namespace {

FormList Pairs(std::initializer_list<std::pair<const char*, std::string> > items)
{
    FormList list;
    for (const auto& item : items) list.emplace_back(ImmutableString::CreateDynamic(item.first), UTF8String(item.second));
    return list;
}

}  // namespace

TEST(QuoteURL, JoinsPairsInOrderWithoutLeadingOrTrailingSeparators)
{
    EXPECT_TRUE(QuoteURL(FormList()) == "");
    EXPECT_TRUE(QuoteURL(Pairs({{"a", "b c"}})) == "a=b%20c");
    EXPECT_TRUE(QuoteURL(Pairs({{"q", "1"}, {"q", "2"}, {"empty", ""}})) == "q=1&q=2&empty=");
}

TEST(QuoteURL, QuotesNameAndValueWithLowerCaseDigits)
{
    EXPECT_TRUE(QuoteURL(Pairs({{"q", "{\"a\":\"b\"}"}})) == "q=%7b%22a%22%3a%22b%22%7d");
    EXPECT_TRUE(QuoteURL(Pairs({{"a/b", "c/d"}})) == "a%2fb=c%2fd");
    EXPECT_TRUE(QuoteURL(Pairs({{"x", "~+&=?%#"}})) == "x=%7e%2b%26%3d%3f%25%23");
}

TEST(QuoteURL, EveryByteOutsideTheSafeSetIsQuoted)
{
    const std::string safe = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_.-";
    for (int byte = 0; byte < 256; ++byte) {
        const UTF8String one(1, static_cast<unsigned char>(byte));
        const UTF8String quoted = tolmonet::_Quote(one);
        if (byte != 0 && safe.find(static_cast<char>(byte)) != std::string::npos) {
            EXPECT_TRUE(quoted == one) << byte;
        } else {
            char expected[4];
            std::snprintf(expected, sizeof expected, "%%%02x", byte);
            EXPECT_TRUE(quoted == expected) << byte;
        }
    }
    // A UTF-8 letter comes out as one triplet per byte.
    EXPECT_TRUE(tolmonet::_Quote(UTF8String("\xC3\xA9")) == "%c3%a9");
}

TEST(QuoteURL, FirstCallersOnSeveralThreadsSeeOneFinishedTable)
{
    std::vector<std::thread> threads;
    std::atomic<int> wrong{0};
    for (int t = 0; t < 4; ++t)
        threads.emplace_back([&] {
            if (!(QuoteURL(Pairs({{"name", "a b"}})) == "name=a%20b")) ++wrong;
        });
    for (auto& thread : threads) thread.join();
    EXPECT_EQ(wrong.load(), 0);
}
