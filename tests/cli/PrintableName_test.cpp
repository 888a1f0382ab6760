// What a terminal gets of a name that a server or the disk chose.

#include <gtest/gtest.h>

#include <string>

#include "cli/PrintableName.h"

namespace {

using tolmonetsync::cli::PrintableName;

TEST(PrintableName, EscapesWhatCouldRewriteTheScreenAndNothingElse)
{
    const struct {
        std::string mName;
        std::string mPrinted;
    } cases[] = {
        {"colors.json", "colors.json"},
        {"Grüße, 日本語 & emoji \xF0\x9F\x98\x80.txt", "Grüße, 日本語 & emoji \xF0\x9F\x98\x80.txt"},
        {"a\x1b[2J\x07\rb\n\t", "a\\x1b[2J\\x07\\x0db\\x0a\\x09"},
        {std::string("nul\0del\x7f", 8), "nul\\x00del\\x7f"},
        {"back\\slash \\x1b", "back\\\\slash \\\\x1b"},
        {"c1 \xC2\x85\xC2\x9B ok \xC2\xA0", "c1 \\u0085\\u009b ok \xC2\xA0"},
        {"bidi \xE2\x80\xAEtxt.exe \xD8\x9C\xE2\x80\x8E\xE2\x80\x8F\xE2\x80\xAA\xE2\x81\xA6\xE2\x81\xA9 \xE2\x80\xAF",
         "bidi \\u202etxt.exe \\u061c\\u200e\\u200f\\u202a\\u2066\\u2069 \xE2\x80\xAF"},
        {"bad \xFF \xC0\xAF \xED\xA0\x80 \xE2\x80 end", "bad \\xff \\xc0\\xaf \\xed\\xa0\\x80 \\xe2\\x80 end"},
    };
    for (const auto& c : cases) EXPECT_EQ(PrintableName(c.mName), c.mPrinted) << c.mPrinted;
}

}  // namespace
