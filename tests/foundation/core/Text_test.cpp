// Strings, their conversions and ImmutableString.

#include <gtest/gtest.h>

#include <thread>
#include <vector>

#include "foundation/core/ImmutableString.h"
#include "foundation/core/Strings.h"

using namespace tolmocore::utility;

TEST(Utf8To16, AsciiAndMultiByteSequencesRoundTrip)
{
    // "Grüße, 世界" and a character outside the basic plane (U+1F600).
    const UTF8String text("Gr\xC3\xBC\xC3\x9F" "e, \xE4\xB8\x96\xE7\x95\x8C \xF0\x9F\x98\x80");
    const UTF16String wide = UTF8to16(text);
    EXPECT_EQ(wide, UTF16String(u"Grüße, 世界 \U0001F600"));
    EXPECT_EQ(UTF16to8(wide), text);
}

TEST(Utf8To16, MalformedInputBecomesReplacementCharactersAndIsReported)
{
    UnicodeErrorCode error = UnicodeErrorCode_None;
    unsigned long offset = 99;
    // A truncated sequence, an overlong slash, an encoded surrogate, a stray continuation.
    const UTF8String bad("ab\xC3", 3);
    EXPECT_EQ(UTF8to16(bad, &error, &offset), UTF16String(u"ab\uFFFD"));
    EXPECT_EQ(error, UnicodeErrorCode_InvalidSequence);
    EXPECT_EQ(offset, 2u);
    EXPECT_EQ(UTF8to16(UTF8String("\xC0\xAF")), UTF16String(u"\uFFFD\uFFFD"));
    EXPECT_EQ(UTF8to16(UTF8String("\xED\xA0\x80")), UTF16String(u"\uFFFD\uFFFD\uFFFD"));
    EXPECT_EQ(UTF8to16(UTF8String("\x80x")), UTF16String(u"\uFFFDx"));
    error = UnicodeErrorCode_InvalidSequence;
    UTF8to16(UTF8String("fine"), &error);
    EXPECT_EQ(error, UnicodeErrorCode_None);
}

TEST(Utf8To16, UnpairedSurrogatesBecomeReplacementCharacters)
{
    UTF16String lone;
    lone.push_back(0xD83D);
    lone.push_back(u'x');
    lone.push_back(0xDE00);
    EXPECT_EQ(UTF16to8(lone), UTF8String("\xEF\xBF\xBDx\xEF\xBF\xBD"));
}

TEST(Utf8String, EmbeddedNulsAndNarrowInterplay)
{
    const UTF8String withNul("a\0b", 3);
    EXPECT_EQ(withNul.size(), 3u);
    EXPECT_EQ(withNul.ToStdString(), std::string("a\0b", 3));
    UTF8String built = UTF8String("x") + "y" + UTF8String("z");
    built += "!";
    EXPECT_TRUE(built == "xyz!");
    EXPECT_TRUE(UTF8String() == "");
    EXPECT_TRUE(UTF8String((const char*)nullptr).empty());
}

TEST(AsciiToUTF16, WidensEachByte)
{
    EXPECT_EQ(AsciiToUTF16("Sync", 4), UTF16String(u"Sync"));
    EXPECT_EQ(AsciiToUTF16("abc", 2), UTF16String(u"ab"));
}

TEST(StringToNumber, ReadsTheLeadingNumber)
{
    EXPECT_DOUBLE_EQ(StringToNumber(UTF16String(u"8.0")), 8.0);
    EXPECT_DOUBLE_EQ(StringToNumber(UTF16String(u"9.0.1")), 9.0);
    EXPECT_DOUBLE_EQ(StringToNumber(UTF16String(u" 12.25x")), 12.25);
    EXPECT_DOUBLE_EQ(StringToNumber(UTF16String(u"-3")), -3.0);
    EXPECT_DOUBLE_EQ(StringToNumber(UTF16String(u"")), 0.0);
    EXPECT_DOUBLE_EQ(StringToNumber(UTF16String(u"v9")), 0.0);
}

TEST(StringStreams, WriteAndReadText)
{
    oUTF8StringStream out;
    out << "count=" << 42 << ' ' << UTF8String("ok");
    EXPECT_TRUE(out.GetString() == "count=42 ok");
    iUTF16StringStream in(UTF16String(u"7 words"));
    int number = 0;
    std::string word;
    in >> number >> word;
    EXPECT_EQ(number, 7);
    EXPECT_EQ(word, "words");
}

TEST(ImmutableString, StaticTextIsWrappedNotCopied)
{
    static const char kText[] = "X-REQUEST-ID";
    const ImmutableString wrapped = ImmutableString::CreateStatic(kText);
    EXPECT_EQ(wrapped.c_str(), kText);
    EXPECT_EQ(wrapped.size(), 12u);
    EXPECT_EQ(wrapped.ToString(), UTF16String(u"X-REQUEST-ID"));
}

TEST(ImmutableString, ContentComparisonAndIdentityDiffer)
{
    const ImmutableString constant = ImmutableString::CreateStatic("LOCATION");
    const ImmutableString equalText = ImmutableString::CreateDynamic("LOCATION");
    const ImmutableString copy = constant;
    EXPECT_TRUE(constant == equalText);
    EXPECT_FALSE(constant.IsSameAs(equalText));
    EXPECT_TRUE(constant.IsSameAs(copy));
    EXPECT_TRUE(ImmutableString::CreateDynamic("A") < ImmutableString::CreateDynamic("AB"));
    EXPECT_TRUE(ImmutableString::CreateDynamic("AB") < ImmutableString::CreateDynamic("B"));
    EXPECT_TRUE(sNullString.empty());
    EXPECT_TRUE(sNullString == ImmutableString::CreateDynamic(""));
}

TEST(ImmutableString, DynamicCopiesOutliveTheirSource)
{
    ImmutableString kept;
    {
        UTF16String source(u"caf\u00e9");
        kept = ImmutableString::CreateDynamic(source);
        source.assign(u"changed");
    }
    EXPECT_EQ(kept.ToStdString(), "caf\xC3\xA9");
}

TEST(ImmutableString, CopiesOnManyThreadsShareTheTextSafely)
{
    const ImmutableString shared = ImmutableString::CreateDynamic("shared text");
    std::vector<std::thread> threads;
    std::atomic<int> mismatches{0};
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&] {
            for (int i = 0; i < 10000; ++i) {
                ImmutableString copy = shared;
                if (!(copy == shared)) ++mismatches;
            }
        });
    }
    for (auto& thread : threads) thread.join();
    EXPECT_EQ(mismatches.load(), 0);
}
