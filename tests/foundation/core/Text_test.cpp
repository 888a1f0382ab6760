// Conversions between the text forms, and ImmutableString.

#include <gtest/gtest.h>

#include "foundation/core/ImmutableString.h"
#include "foundation/core/Strings.h"

using namespace tolmocore::utility;

TEST(Text, UTF8AndUTF16ConvertBothWaysAndDamageBecomesReplacementCharacters)
{
    struct Row {
        const char* mLabel;
        UTF8String mNarrow;
        UTF16String mWide;
    };
    const Row rows[] = {
        {"letters beyond ASCII and beyond the basic plane",
         UTF8String("Gr\xC3\xBC\xC3\x9F"
                    "e, \xE4\xB8\x96\xE7\x95\x8C \xF0\x9F\x98\x80"),
         UTF16String(u"Grüße, 世界 \U0001F600")},
        {"a truncated sequence", UTF8String("ab\xC3", 3), UTF16String(u"ab\uFFFD")},
        {"an overlong slash", UTF8String("\xC0\xAF"), UTF16String(u"\uFFFD\uFFFD")},
        {"an encoded surrogate", UTF8String("\xED\xA0\x80"), UTF16String(u"\uFFFD\uFFFD\uFFFD")},
        {"a stray continuation", UTF8String("\x80x"), UTF16String(u"\uFFFDx")},
        {"an embedded NUL", UTF8String("a\0b", 3), UTF16String(u"a\0b", 3)},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.mLabel);
        EXPECT_EQ(UTF8to16(row.mNarrow), row.mWide);
    }
    EXPECT_EQ(UTF16to8(rows[0].mWide), rows[0].mNarrow);
    const UTF16String unpaired{0xD83D, u'x', 0xDE00};
    EXPECT_EQ(UTF16to8(unpaired), UTF8String("\xEF\xBF\xBDx\xEF\xBF\xBD"));

    UnicodeErrorCode error = UnicodeErrorCode_None;
    unsigned long offset = 99;
    UTF8to16(rows[1].mNarrow, &error, &offset);
    EXPECT_EQ(error, UnicodeErrorCode_InvalidSequence);
    EXPECT_EQ(offset, 2u);
    UTF8to16(UTF8String("fine"), &error);
    EXPECT_EQ(error, UnicodeErrorCode_None);
}

TEST(Text, VersionNumbersReadTheirLeadingNumber)
{
    const std::pair<const char16_t*, double> rows[] = {{u"8.0", 8.0}, {u"9.0.1", 9.0}, {u" 12.25x", 12.25},
                                                       {u"-3", -3.0}, {u"", 0.0},      {u"v9", 0.0}};
    for (const auto& row : rows) EXPECT_DOUBLE_EQ(StringToNumber(UTF16String(row.first)), row.second);
}

TEST(ImmutableString, DynamicCopiesOutliveTheirSourceAndCompareByContent)
{
    ImmutableString kept;
    {
        UTF16String source(u"caf\u00e9");
        kept = ImmutableString::CreateDynamic(source);
        source.assign(u"changed");
    }
    EXPECT_EQ(kept.ToStdString(), "caf\xC3\xA9");
    EXPECT_TRUE(kept == ImmutableString::CreateStatic("caf\xC3\xA9"));
    EXPECT_FALSE(kept.IsSameAs(ImmutableString::CreateStatic("caf\xC3\xA9")));
    EXPECT_TRUE(ImmutableString::CreateDynamic("A") < ImmutableString::CreateDynamic("AB"));
    EXPECT_TRUE(ImmutableString::CreateDynamic("AB") < ImmutableString::CreateDynamic("B"));
}
