#include <gtest/gtest.h>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "foundation/json/JSONConvert.h"
#include "foundation/json/JSONText.h"

using namespace tolmocore::serialization;
using boost::posix_time::ptime;

class JSONConvertTest : public ::testing::Test {
protected:
    template <class T>
    T Read(const char* key) const
    {
        return ExtractPropertyFromObject<T>(boost::any_cast<const JSONObject&>(mTree), key);
    }
    template <class T>
    static T RoundTrip(const T& value)
    {
        return JSONConvert<T>::FromJSON(JSONParse(GetJSONUTF8String(JSONConvert<T>::ToJSON(value), false)));
    }

    const boost::any mTree = JSONParse(
        "{\"s\":\"text\",\"empty\":\"\",\"i\":-7,\"u\":18446744073709551615,\"d\":2.5,\"b\":true,"
        "\"null\":null,\"g\":\"0123abcd-4567-89ef-0123-456789abcdef\"}");
};

TEST_F(JSONConvertTest, PlainTypesRoundTripThroughText)
{
    EXPECT_EQ(RoundTrip(UTF8String("caf\xC3\xA9")), UTF8String("caf\xC3\xA9"));
    EXPECT_EQ(RoundTrip(UTF16String(u"caf\u00e9 \U0001D11E")), UTF16String(u"caf\u00e9 \U0001D11E"));
    EXPECT_EQ(RoundTrip(ImmutableString::CreateDynamic("id")), ImmutableString::CreateStatic("id"));
    EXPECT_EQ(RoundTrip(std::string("a\"b")), "a\"b");
    EXPECT_EQ(RoundTrip(true), true);
    EXPECT_EQ(RoundTrip(-5LL), -5);
    EXPECT_EQ(RoundTrip(0.25), 0.25);
}

TEST_F(JSONConvertTest, MissingKeysGiveTheTypesDefaults)
{
    EXPECT_EQ(Read<UTF8String>("absent"), UTF8String());
    EXPECT_EQ(Read<UTF16String>("absent"), UTF16String());
    EXPECT_TRUE(Read<ImmutableString>("absent").IsSameAs(sNullString));
    EXPECT_FALSE(Read<bool>("absent"));
    EXPECT_EQ(Read<long long>("absent"), 0);
    EXPECT_EQ(Read<double>("absent"), 0.0);
    EXPECT_TRUE(Read<Guid>("absent").IsNil());
    EXPECT_TRUE(Read<ptime>("absent").is_not_a_date_time());
}

TEST_F(JSONConvertTest, NumbersReadAcrossKinds)
{
    EXPECT_EQ(Read<long long>("i"), -7);
    EXPECT_EQ(Read<long long>("u"), -1);  // the same 64 bits
    EXPECT_THROW(Read<long long>("d"), boost::bad_any_cast);
    EXPECT_EQ(Read<double>("i"), -7.0);
    EXPECT_EQ(Read<double>("u"), 18446744073709551615.0);
    EXPECT_EQ(Read<double>("d"), 2.5);
}

TEST_F(JSONConvertTest, WrongTypesRaiseBadAnyCast)
{
    EXPECT_THROW(Read<bool>("s"), boost::bad_any_cast);
    EXPECT_THROW(Read<double>("s"), boost::bad_any_cast);
    EXPECT_THROW(Read<UTF8String>("i"), boost::bad_any_cast);
    EXPECT_THROW(Read<UTF16String>("b"), boost::bad_any_cast);
    EXPECT_THROW(Read<ImmutableString>("d"), boost::bad_any_cast);
    EXPECT_THROW(Read<std::string>("null"), boost::bad_any_cast);
    EXPECT_THROW(Read<Guid>("i"), boost::bad_any_cast);
    EXPECT_THROW(Read<ptime>("b"), boost::bad_any_cast);
}

TEST_F(JSONConvertTest, OptionalReadLeavesTheTargetAloneWhenTheKeyIsMissing)
{
    UTF8String out("kept");
    ExtractOptionalPropertyFromObjectGeneric(boost::any_cast<const JSONObject&>(mTree), "absent", out);
    EXPECT_EQ(out, "kept");
    ExtractOptionalPropertyFromObjectGeneric(boost::any_cast<const JSONObject&>(mTree), "empty", out);
    EXPECT_EQ(out, "");
}

TEST_F(JSONConvertTest, GuidsGoAsTextAndBadTextIsRefused)
{
    const Guid guid = Guid::CreateUnique();
    EXPECT_EQ(RoundTrip(guid), guid);
    EXPECT_EQ(Read<Guid>("g").AsUTF8String(), "0123ABCD-4567-89EF-0123-456789ABCDEF");
    EXPECT_THROW(JSONConvert<Guid>::FromJSON(boost::any(UTF8String("0123abcd"))), std::invalid_argument);
    EXPECT_THROW(Read<Guid>("empty"), std::invalid_argument);
}

TEST_F(JSONConvertTest, TimesUseTheSimpleFormAndEmptyForNotADateTime)
{
    const ptime time(boost::gregorian::date(2014, 3, 5),
                     boost::posix_time::time_duration(9, 41, 7) + boost::posix_time::microseconds(123456));
    EXPECT_EQ(GetJSONUTF8String(JSONConvert<ptime>::ToJSON(time), false), "\"2014-Mar-05 09:41:07.123456\"");
    EXPECT_EQ(RoundTrip(time), time);
    const ptime never(boost::posix_time::not_a_date_time);
    EXPECT_EQ(GetJSONUTF8String(JSONConvert<ptime>::ToJSON(never), false), "\"\"");
    EXPECT_TRUE(RoundTrip(never).is_not_a_date_time());
    EXPECT_THROW(JSONConvert<ptime>::FromJSON(boost::any(UTF8String("2014-Foo-05 09:41:07"))), std::exception);
}

TEST_F(JSONConvertTest, VectorsConvertInOrderAndAppend)
{
    const std::vector<UTF8String> names{UTF8String("b"), UTF8String("a")};
    const boost::any array = JSONConvertStdContainer<UTF8String>::ToJSON(names);
    EXPECT_EQ(GetJSONUTF8String(array, false), "[\"b\",\"a\"]");

    std::vector<UTF8String> out{UTF8String("first")};
    JSONConvertStdVector<UTF8String>::FromJSON(array, out);
    EXPECT_EQ(out, (std::vector<UTF8String>{UTF8String("first"), UTF8String("b"), UTF8String("a")}));

    EXPECT_THROW(JSONConvertStdVector<UTF8String>::FromJSON(mTree, out), boost::bad_any_cast);
    EXPECT_THROW(JSONConvertStdVector<UTF8String>::FromJSON(JSONParse("[\"c\",1]"), out), boost::bad_any_cast);
    EXPECT_EQ(out.size(), 3u);  // nothing of the failed array was kept
}
