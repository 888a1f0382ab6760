#include <gtest/gtest.h>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "foundation/json/ISO8601Time.h"
#include "foundation/json/JSONText.h"

using namespace tolmocore::serialization;
using boost::posix_time::ptime;

class ISO8601TimeTest : public ::testing::Test {
protected:
    ptime Read(const char* json) const
    {
        const boost::any tree = JSONParse(json);
        return parse_iso8601_time(boost::any_cast<const JSONObject&>(tree), "t");
    }

    const ptime mExpected{boost::gregorian::date(2014, 3, 5), boost::posix_time::time_duration(9, 41, 7)};
};

TEST_F(ISO8601TimeTest, UTCTimesReadToTheSecond)
{
    EXPECT_EQ(Read("{\"t\":\"2014-03-05T09:41:07+00:00\"}"), mExpected);
    EXPECT_EQ(Read("{\"t\":\"2014-03-05T09:41:07.999+00:00\"}"), mExpected);
    EXPECT_EQ(Read("{\"t\":\"2014-03-05T09:41:07.5\"}"), mExpected);
    EXPECT_EQ(Read("{\"t\":\"2014-03-05T09:41:07\"}"), mExpected);
}

TEST_F(ISO8601TimeTest, MissingOrEmptyIsNotADateTimeAndOtherValuesThrow)
{
    EXPECT_TRUE(Read("{}").is_not_a_date_time());
    EXPECT_TRUE(Read("{\"t\":\"\"}").is_not_a_date_time());
    EXPECT_THROW(Read("{\"t\":20140305}"), boost::bad_any_cast);
    EXPECT_THROW(Read("{\"t\":\"yesterday\"}"), std::exception);
    EXPECT_THROW(Read("{\"t\":\"2014-13-05T09:41:07+00:00\"}"), std::exception);
}
