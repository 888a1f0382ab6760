// Typed values read from and written into a tree.

#include <gtest/gtest.h>

#include <thread>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "foundation/json/ISO8601Time.h"
#include "foundation/json/JSONConvert.h"
#include "foundation/json/JSONText.h"
#include "foundation/json/JSONTree.h"

using namespace tolmocore::serialization;
using boost::posix_time::ptime;

class JSONValuesTest : public ::testing::Test {
protected:
    template <class T>
    T Read(const char* key) const
    {
        return ExtractPropertyFromObject<T>(Members(), key);
    }
    template <class T>
    static T RoundTrip(const T& value)
    {
        return JSONConvert<T>::FromJSON(JSONParse(GetJSONUTF8String(JSONConvert<T>::ToJSON(value), false)));
    }
    const JSONObject& Members() const { return boost::any_cast<const JSONObject&>(mTree); }
    static std::string Print(const boost::any& value) { return GetJSONUTF8String(value, false).ToStdString(); }

    boost::any mTree = JSONParse(
        "{\"s\":\"text\",\"empty\":\"\",\"i\":-7,\"u\":18446744073709551615,\"d\":2.5,\"b\":true,"
        "\"null\":null,\"g\":\"0123abcd-4567-89ef-0123-456789abcdef\"}");
};

TEST_F(JSONValuesTest, PlainTypesRoundTripAndMissingKeysGiveDefaults)
{
    EXPECT_EQ(RoundTrip(UTF8String("caf\xC3\xA9")), UTF8String("caf\xC3\xA9"));
    EXPECT_EQ(RoundTrip(UTF16String(u"caf\u00e9 \U0001D11E")), UTF16String(u"caf\u00e9 \U0001D11E"));
    EXPECT_EQ(RoundTrip(ImmutableString::CreateDynamic("id")), ImmutableString::CreateStatic("id"));
    EXPECT_EQ(RoundTrip(std::string("a\"b")), "a\"b");

    EXPECT_EQ(Read<UTF8String>("absent"), UTF8String());
    EXPECT_TRUE(Read<ImmutableString>("absent").IsSameAs(sNullString));
    EXPECT_FALSE(Read<bool>("absent"));
    EXPECT_EQ(Read<long long>("absent"), 0);
    EXPECT_TRUE(Read<Guid>("absent").IsNil());
    EXPECT_TRUE(Read<ptime>("absent").is_not_a_date_time());

    UTF8String kept("kept");  // an optional read leaves the target alone
    ExtractOptionalPropertyFromObjectGeneric(Members(), "absent", kept);
    EXPECT_EQ(kept, "kept");
    ExtractOptionalPropertyFromObjectGeneric(Members(), "empty", kept);
    EXPECT_EQ(kept, "");
}

TEST_F(JSONValuesTest, NumbersReadAcrossKindsAndWrongTypesThrow)
{
    EXPECT_EQ(Read<long long>("i"), -7);
    EXPECT_EQ(Read<long long>("u"), -1);  // the same 64 bits
    EXPECT_EQ(Read<double>("u"), 18446744073709551615.0);
    EXPECT_EQ(Read<double>("i"), -7.0);
    EXPECT_THROW(Read<long long>("d"), boost::bad_any_cast);
    EXPECT_THROW(Read<bool>("s"), boost::bad_any_cast);
    EXPECT_THROW(Read<double>("s"), boost::bad_any_cast);
    EXPECT_THROW(Read<UTF8String>("i"), boost::bad_any_cast);
    EXPECT_THROW(Read<UTF16String>("b"), boost::bad_any_cast);
    EXPECT_THROW(Read<ImmutableString>("d"), boost::bad_any_cast);
    EXPECT_THROW(Read<std::string>("null"), boost::bad_any_cast);
    EXPECT_THROW(Read<Guid>("i"), boost::bad_any_cast);
    EXPECT_THROW(Read<ptime>("b"), boost::bad_any_cast);
}

TEST_F(JSONValuesTest, GuidsAndTimesGoAsTextAndBadTextIsRefused)
{
    const Guid guid = Guid::CreateUnique();
    EXPECT_EQ(RoundTrip(guid), guid);
    EXPECT_EQ(Read<Guid>("g").AsUTF8String(), "0123ABCD-4567-89EF-0123-456789ABCDEF");
    EXPECT_THROW(JSONConvert<Guid>::FromJSON(boost::any(UTF8String("0123abcd"))), std::invalid_argument);
    EXPECT_THROW(Read<Guid>("empty"), std::invalid_argument);

    // Times take the simple form, and an empty text for not-a-date-time.
    const ptime time(boost::gregorian::date(2014, 3, 5),
                     boost::posix_time::time_duration(9, 41, 7) + boost::posix_time::microseconds(123456));
    EXPECT_EQ(GetJSONUTF8String(JSONConvert<ptime>::ToJSON(time), false), "\"2014-Mar-05 09:41:07.123456\"");
    EXPECT_EQ(RoundTrip(time), time);
    const ptime never(boost::posix_time::not_a_date_time);
    EXPECT_EQ(GetJSONUTF8String(JSONConvert<ptime>::ToJSON(never), false), "\"\"");
    EXPECT_TRUE(RoundTrip(never).is_not_a_date_time());
    for (const char* text : {"2014-Foo-05 09:41:07", "2014-Mar-5 09:41:07", "2014-Mar-05 09:41:07.",
                             "2014-Mar-05 09:41:07.1234567890", "2014-Mar-05 09:41:0x", "2014-mar-05 09:41:07"})
        EXPECT_THROW(JSONConvert<ptime>::FromJSON(boost::any(UTF8String(text))), std::exception) << text;
}

TEST_F(JSONValuesTest, ISO8601TimesReadToTheSecond)
{
    const ptime expected(boost::gregorian::date(2014, 3, 5), boost::posix_time::time_duration(9, 41, 7));
    const auto read = [](const char* json) {
        return parse_iso8601_time(boost::any_cast<const JSONObject&>(JSONParse(json)), "t");
    };
    for (const char* text :
         {"2014-03-05T09:41:07+00:00", "2014-03-05T09:41:07.999+00:00", "2014-03-05T09:41:07.5", "2014-03-05T09:41:07"})
        EXPECT_EQ(read(("{\"t\":\"" + std::string(text) + "\"}").c_str()), expected) << text;
    EXPECT_TRUE(read("{}").is_not_a_date_time());
    EXPECT_TRUE(read("{\"t\":\"\"}").is_not_a_date_time());
    EXPECT_THROW(read("{\"t\":20140305}"), boost::bad_any_cast);
    EXPECT_THROW(read("{\"t\":\"yesterday\"}"), std::exception);
    EXPECT_THROW(read("{\"t\":\"2014-13-05T09:41:07+00:00\"}"), std::exception);
}

TEST_F(JSONValuesTest, VectorsConvertInOrderAndAFailedArrayAddsNothing)
{
    const std::vector<UTF8String> names{UTF8String("b"), UTF8String("a")};
    const boost::any array = JSONConvertStdContainer<UTF8String>::ToJSON(names);
    EXPECT_EQ(Print(array), "[\"b\",\"a\"]");
    std::vector<UTF8String> out{UTF8String("first")};
    JSONConvertStdVector<UTF8String>::FromJSON(array, out);
    EXPECT_EQ(out, (std::vector<UTF8String>{UTF8String("first"), UTF8String("b"), UTF8String("a")}));
    EXPECT_THROW(JSONConvertStdVector<UTF8String>::FromJSON(mTree, out), boost::bad_any_cast);
    EXPECT_THROW(JSONConvertStdVector<UTF8String>::FromJSON(JSONParse("[\"c\",1]"), out), boost::bad_any_cast);
    EXPECT_EQ(out.size(), 3u);
}

TEST_F(JSONValuesTest, TreeEditsStoreCopiesAndRefuseTheWrongKind)
{
    boost::any object = JSONObject(), array = JSONArray(), empty;
    AddToObject(object, "list", array);
    AppendToArray(array, boost::any(2LL));
    AppendToArray(array, boost::any());
    AddToObject(object, "name", boost::any(UTF8String("first")));
    AddToObject(object, "name", array);
    EXPECT_EQ(Print(object), "{\"list\":[],\"name\":[2,null]}");
    EXPECT_THROW(AddToObject(array, "k", boost::any(true)), boost::bad_any_cast);
    EXPECT_THROW(AddToObject(empty, "k", boost::any(true)), boost::bad_any_cast);
    EXPECT_THROW(AppendToArray(object, boost::any(true)), boost::bad_any_cast);

    EXPECT_TRUE(ObjectHasProperty(Members(), "null", false));  // null is present, not absent
    EXPECT_FALSE(ObjectHasProperty(Members(), "absent", false));
    ASSERT_TRUE(GetVariantInObject(Members(), "null"));
    EXPECT_TRUE(IsJSONNull(*GetVariantInObject(Members(), "null")));
    EXPECT_FALSE(GetVariantInObject(Members(), "absent"));
}

TEST_F(JSONValuesTest, PartsOfAParsedTreeOutliveItOnAnyThread)
{
    boost::any tree = JSONParse("[{\"a\":{\"b\":[1,\"two\"]}},{\"b\":\"text\"},[true,null]]");
    JSONArray parts = boost::any_cast<JSONArray>(tree);
    const boost::shared_ptr<boost::any> inner = GetVariantInObject(boost::any_cast<const JSONObject&>(*parts[0]), "a");
    tree = boost::any();
    std::thread first([mine = std::move(parts[0])]() mutable { mine.reset(); });
    std::thread second([mine = std::move(parts[1])]() mutable { mine.reset(); });
    first.join();
    second.join();
    AddToObject(*inner, "d", boost::any(true));
    EXPECT_EQ(Print(*inner), "{\"b\":[1,\"two\"],\"d\":true}");
    EXPECT_EQ(Print(*parts[2]), "[true,null]");
}
