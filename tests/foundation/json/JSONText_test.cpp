// Text to tree and back: what comes back, and what is refused.

#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <limits>

#include <boost/make_shared.hpp>

#include "foundation/json/JSONText.h"
#include "foundation/json/JSONTree.h"

using namespace tolmocore::serialization;
using namespace std::string_literals;

namespace {

std::string Print(const boost::any& value)
{
    return GetJSONUTF8String(value, false).ToStdString();
}

std::string Nested(std::size_t depth, const char* open, const char* close)
{
    std::string text;
    for (std::size_t i = 0; i < depth; ++i) text += open;
    text += "[]";
    for (std::size_t i = 0; i < depth; ++i) text += close;
    return text;
}

struct Row {
    const char* mLabel;
    std::string mText;
    std::string mPrinted;  // what printing the parsed tree gives
};

}  // namespace

TEST(JSONText, ParsedTextPrintsBackAsExpected)
{
    const std::string compact = "{\"a\":[1,-2,{\"b\":null}],\"c\":{\"d\":true,\"e\":\"\\u0001\\\"\\\\\"}}";
    const std::string extremes = "[9223372036854775807,-9223372036854775808,18446744073709551615,-0.0,0.1,1e+300]";
    const std::string deepest = Nested(kJSONMaxDepth - 1, "{\"k\":", "}");
    const Row rows[] = {
        {"scalars and empty containers", "[{},[],\"\",null,true,false]", "[{},[],\"\",null,true,false]"},
        {"compact text is kept byte for byte", compact, compact},
        {"integer extremes keep their kind", extremes, extremes},
        {"whitespace goes, keys in byte order", " \n\t{ \"b\" : [ 1 , 2 ] ,\"a\":{},\"B\":0 } \r\n",
         "{\"B\":0,\"a\":{},\"b\":[1,2]}"},
        {"the last duplicate key wins", "{\"a\":1,\"a\":{\"x\":2}}", "{\"a\":{\"x\":2}}"},
        {"past 64 bits, exponents and overflow become doubles", "[18446744073709551616,1E2,1e400]",
         "[18446744073709551616.0,100.0,1e999]"},
        {"escapes decode to UTF-8", "\"\\u00e9\\ud834\\udd1e\\/\"", "\"\xC3\xA9\xF0\x9D\x84\x9E/\""},
        {"text ends at the first NUL", "[1,{\"a\":\"b\"}]\0garbage"s, "[1,{\"a\":\"b\"}]"},
        {"the deepest nesting allowed", deepest, deepest},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.mLabel);
        EXPECT_EQ(Print(JSONParse(UTF8String(row.mText))), row.mPrinted);
    }
    const boost::any tree = JSONParse(UTF8String(extremes));
    const JSONArray& numbers = boost::any_cast<const JSONArray&>(tree);
    EXPECT_EQ(boost::any_cast<long long>(*numbers[1]), std::numeric_limits<long long>::min());
    EXPECT_EQ(boost::any_cast<unsigned long long>(*numbers[2]), std::numeric_limits<unsigned long long>::max());
}

TEST(JSONText, DoublesComeBackExactlyAndNaNIsRefused)
{
    // 1.3927926388013963e-143 is one that a plain conversion misses by a unit.
    for (double value : {0.1, 2.0, -2.5e-300, 5e-324, 1.7976931348623157e308, 1.3927926388013963e-143,
                         -std::numeric_limits<double>::infinity()}) {
        const boost::any back = JSONParse(GetJSONUTF8String(boost::any(value), false));
        EXPECT_EQ(boost::any_cast<double>(back), value) << Print(boost::any(value));
    }
    EXPECT_THROW(Print(boost::any(std::nan(""))), JSONError);
}

TEST(JSONText, StringsEscapeWhatJSONRequiresAndRoundTrip)
{
    const UTF8String text("q\"b\\s/\b\f\n\r\t\x01\x1f\x7f\0 \xC3\xA9 \xF0\x9D\x84\x9E"s);
    const std::string printed = Print(boost::any(text));
    EXPECT_EQ(printed, "\"q\\\"b\\\\s/\\b\\f\\n\\r\\t\\u0001\\u001f\x7f\\u0000 \xC3\xA9 \xF0\x9D\x84\x9E\"");
    EXPECT_EQ(boost::any_cast<UTF8String>(JSONParse(UTF8String(printed))), text);

    // A lone continuation byte, an overlong '/', a surrogate, a truncated sequence.
    const std::string fffd = "\xEF\xBF\xBD";
    const std::string replaced =
        Print(boost::any(UTF8String("a\x80"
                                    "b\xC0\xAF"
                                    "c\xED\xA0\x80"
                                    "d\xE2\x82")));
    EXPECT_EQ(replaced, "\"a" + fffd + "b" + fffd + fffd + "c" + fffd + fffd + fffd + "d" + fffd + fffd + "\"");
    EXPECT_NO_THROW(JSONParse(UTF8String(replaced)));

    std::string longText(1 << 20, 'x');
    for (std::size_t i = 0; i < longText.size(); i += 4093) longText[i] = '\n';
    EXPECT_EQ(boost::any_cast<UTF8String>(JSONParse(GetJSONUTF8String(boost::any(UTF8String(longText)), false))),
              UTF8String(longText));
}

TEST(JSONText, MalformedTextThrowsWithItsPlace)
{
    std::vector<std::string> texts = {
        "",         "   ",         "[1,2",        "{\"a\":}", "[1] x",        "[1,]",   "{'a':1}",
        "tru",      "01",          "1.",          "+1",       "NaN",          "/*c*/1", "\"\\x\"",
        "\"a\nb\"", "\"\\ud800\"", "\"\\udc00\"", "\"\xFF\"", "\"\xC0\xAF\"", "\0[1]"s, "[1\0]"s};
    // Nesting past the limit, and a bracket run far past it.
    texts.insert(texts.end(), {"\"\xED\xA0\x80\"", Nested(kJSONMaxDepth, "[", "]"),
                               Nested(kJSONMaxDepth, "{\"k\":", "}"), std::string(200000, '[')});
    for (const std::string& text : texts) {
        try {
            JSONParse(UTF8String(text));
            ADD_FAILURE() << "accepted: " << text.substr(0, 40);
        } catch (const JSONError& error) {
            EXPECT_NE(std::strstr(error.what(), "at byte"), nullptr) << error.what();
        }
    }
}

TEST(JSONText, LimitsHoldAtPrintAndForOversizedText)
{
    boost::any tree = JSONArray();
    for (std::size_t i = 0; i < kJSONMaxDepth; ++i) {
        boost::any outer = JSONArray();
        AppendToArray(outer, std::move(tree));
        tree = std::move(outer);
    }
    EXPECT_THROW(Print(tree), JSONError);
    EXPECT_THROW(Print(boost::any(3)), JSONError);  // not a type the tree holds
    EXPECT_THROW(Print(JSONArray{boost::make_shared<boost::any>(3.5f)}), JSONError);

    UTF8String text(kJSONMaxTextSize + 1, ' ');
    text[0] = '1';
    EXPECT_THROW(JSONParse(text), JSONError);
    text[1] = 0;  // a NUL in time ends the text within the limit
    EXPECT_EQ(boost::any_cast<long long>(JSONParse(text)), 1);
}
