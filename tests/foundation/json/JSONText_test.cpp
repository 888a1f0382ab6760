#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <limits>

#include <boost/make_shared.hpp>

#include "foundation/json/JSONText.h"
#include "foundation/json/JSONTree.h"

using namespace tolmocore::serialization;

namespace {

UTF8String Bytes(const char* text, std::size_t size) { return UTF8String(text, size); }

std::string Print(const boost::any& value) { return GetJSONUTF8String(value, false).ToStdString(); }

std::string Reprint(const std::string& text) { return Print(JSONParse(UTF8String(text))); }

std::string Nested(std::size_t depth, const char* open, const char* close)
{
    std::string text;
    for (std::size_t i = 0; i < depth; ++i) text += open;
    text += "[]";
    for (std::size_t i = 0; i < depth; ++i) text += close;
    return text;
}

}  // namespace

class JSONRoundTripTest : public ::testing::Test {};

TEST_F(JSONRoundTripTest, CompactTextComesBackByteForByte)
{
    for (const char* text :
         {"{}", "[]", "\"\"", "null", "true", "[false,null,\"x\",{\"a\":[]}]",
          "{\"a\":[1,-2,{\"b\":null}],\"c\":{\"d\":true,\"e\":\"\\u0001\\\"\\\\\"}}",
          "[9223372036854775807,-9223372036854775808,18446744073709551615,-0.0,0.1,1e+300]"}) {
        EXPECT_EQ(Reprint(text), text);
    }
}

TEST_F(JSONRoundTripTest, WhitespaceGoesAndKeysComeOutInByteOrder)
{
    EXPECT_EQ(Reprint(" \n\t{ \"b\" : [ 1 , 2 ] ,\"a\":{},\"B\":0 } \r\n"), "{\"B\":0,\"a\":{},\"b\":[1,2]}");
    EXPECT_EQ(Reprint("{\"a\":1,\"a\":{\"x\":2}}"), "{\"a\":{\"x\":2}}");  // the last duplicate wins
}

TEST_F(JSONRoundTripTest, NumbersParseToTheirKinds)
{
    const boost::any tree = JSONParse(
        "[-9223372036854775808,9223372036854775807,9223372036854775808,18446744073709551615,"
        "18446744073709551616,2.5,1E2,1e400]");
    const JSONArray& numbers = boost::any_cast<const JSONArray&>(tree);
    EXPECT_EQ(boost::any_cast<long long>(*numbers[0]), std::numeric_limits<long long>::min());
    EXPECT_EQ(boost::any_cast<long long>(*numbers[1]), std::numeric_limits<long long>::max());
    EXPECT_EQ(boost::any_cast<unsigned long long>(*numbers[2]), 9223372036854775808ULL);
    EXPECT_EQ(boost::any_cast<unsigned long long>(*numbers[3]), std::numeric_limits<unsigned long long>::max());
    EXPECT_EQ(boost::any_cast<double>(*numbers[7]), std::numeric_limits<double>::infinity());
    EXPECT_EQ(Print(tree), "[-9223372036854775808,9223372036854775807,9223372036854775808,"
                           "18446744073709551615,18446744073709551616.0,2.5,100.0,1e999]");
}

TEST_F(JSONRoundTripTest, DoublesComeBackExactlyAndStayDoubles)
{
    // 1.3927926388013963e-143 is one that Boost.JSON's own conversion misses by a unit.
    for (double value : {0.1, 2.0, -2.5e-300, 5e-324, 1.7976931348623157e308, 1.3927926388013963e-143,
                         -std::numeric_limits<double>::infinity()}) {
        const boost::any back = JSONParse(GetJSONUTF8String(boost::any(value), false));
        EXPECT_EQ(boost::any_cast<double>(back), value) << Print(boost::any(value));
    }
    EXPECT_THROW(Print(boost::any(std::nan(""))), JSONError);
}

TEST_F(JSONRoundTripTest, StringsEscapeWhatJSONRequiresAndKeepTheRest)
{
    const char raw[] = "q\"b\\s/\b\f\n\r\t\x01\x1f\x7f\0 \xC3\xA9 \xF0\x9D\x84\x9E";
    const UTF8String text = Bytes(raw, sizeof raw - 1);
    const std::string printed = Print(boost::any(text));
    EXPECT_EQ(printed, "\"q\\\"b\\\\s/\\b\\f\\n\\r\\t\\u0001\\u001f\x7f\\u0000 \xC3\xA9 \xF0\x9D\x84\x9E\"");
    EXPECT_EQ(boost::any_cast<UTF8String>(JSONParse(UTF8String(printed))), text);
    EXPECT_EQ(boost::any_cast<UTF8String>(JSONParse("\"\\u00e9\\ud834\\udd1e\\/\"")),
              UTF8String("\xC3\xA9\xF0\x9D\x84\x9E/"));
}

TEST_F(JSONRoundTripTest, InvalidUTF8PrintsAsReplacementCharacters)
{
    // A lone continuation byte, an overlong '/', a surrogate, a truncated sequence.
    const std::string printed = Print(boost::any(UTF8String("a\x80" "b\xC0\xAF" "c\xED\xA0\x80" "d\xE2\x82")));
    const std::string fffd = "\xEF\xBF\xBD";
    EXPECT_EQ(printed, "\"a" + fffd + "b" + fffd + fffd + "c" + fffd + fffd + fffd + "d" + fffd + fffd + "\"");
    EXPECT_NO_THROW(JSONParse(UTF8String(printed)));
}

TEST_F(JSONRoundTripTest, LongStringsSurviveWhole)
{
    std::string text(1 << 20, 'x');
    for (std::size_t i = 0; i < text.size(); i += 4093) text[i] = '\n';
    const UTF8String value(text);
    EXPECT_EQ(boost::any_cast<UTF8String>(JSONParse(GetJSONUTF8String(boost::any(value), false))), value);
}

TEST_F(JSONRoundTripTest, HeldTypesOutsideTheTreeAreRefused)
{
    EXPECT_THROW(Print(boost::any(3)), JSONError);
    EXPECT_THROW(Print(JSONArray{boost::make_shared<boost::any>(3.5f)}), JSONError);
}

class JSONParseRefusalTest : public ::testing::Test {};

TEST_F(JSONParseRefusalTest, MalformedTextThrowsWithItsPlace)
{
    for (const char* text :
         {"", "   ", "[1,2", "{\"a\":}", "[1] x", "[1,]", "{'a':1}", "tru", "01", "1.", "+1", "NaN",
          "/*c*/1", "\"\\x\"", "\"a\nb\"", "\"\\ud800\"", "\"\\udc00\"", "\"\xFF\"", "\"\xC0\xAF\"",
          "\"\xED\xA0\x80\""}) {
        try {
            JSONParse(UTF8String(text));
            ADD_FAILURE() << "accepted: " << text;
        } catch (const JSONError& error) {
            EXPECT_NE(std::strstr(error.what(), "at byte"), nullptr) << error.what();
        }
    }
}

TEST_F(JSONParseRefusalTest, TextEndsAtTheFirstNul)
{
    EXPECT_EQ(Print(JSONParse(Bytes("[1,{\"a\":\"b\"}]\0garbage", 21))), "[1,{\"a\":\"b\"}]");
    EXPECT_THROW(JSONParse(Bytes("\0[1]", 4)), JSONError);
    EXPECT_THROW(JSONParse(Bytes("[1\0]", 4)), JSONError);
}

TEST_F(JSONParseRefusalTest, NestingIsBoundedAtParseAndPrint)
{
    for (auto shape : {std::make_pair("[", "]"), std::make_pair("{\"k\":", "}")}) {
        const std::string deepest = Nested(kJSONMaxDepth - 1, shape.first, shape.second);
        EXPECT_EQ(Reprint(deepest), deepest);
        EXPECT_THROW(JSONParse(UTF8String(Nested(kJSONMaxDepth, shape.first, shape.second))), JSONError);
        std::string huge;
        for (int i = 0; i < 200000; ++i) huge += shape.first;
        EXPECT_THROW(JSONParse(UTF8String(huge)), JSONError);
    }
    boost::any tree = JSONArray();
    for (std::size_t i = 0; i < kJSONMaxDepth; ++i) {
        boost::any outer = JSONArray();
        AppendToArray(outer, std::move(tree));
        tree = std::move(outer);
    }
    EXPECT_THROW(Print(tree), JSONError);
}

TEST_F(JSONParseRefusalTest, OversizedTextIsRefusedUnlessANulEndsItInTime)
{
    UTF8String text(kJSONMaxTextSize + 1, ' ');
    text[0] = '1';
    EXPECT_THROW(JSONParse(text), JSONError);
    text[1] = 0;
    EXPECT_EQ(boost::any_cast<long long>(JSONParse(text)), 1);
}
