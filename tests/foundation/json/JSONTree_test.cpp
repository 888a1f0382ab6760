#include <gtest/gtest.h>

#include <thread>

#include "foundation/json/JSONText.h"
#include "foundation/json/JSONTree.h"

using namespace tolmocore::serialization;

class JSONTreeTest : public ::testing::Test {
protected:
    const JSONObject& Members() const { return boost::any_cast<const JSONObject&>(mObject); }
    std::string Print(const boost::any& value) const { return GetJSONUTF8String(value, false).ToStdString(); }

    boost::any mObject = JSONObject();
};

TEST_F(JSONTreeTest, AddAndAppendStoreCopiesInOrder)
{
    boost::any array = JSONArray();
    AddToObject(mObject, "list", array);
    AppendToArray(array, boost::any(2LL));
    AppendToArray(array, boost::any());
    AppendToArray(array, boost::any(UTF8String("x")));
    AddToObject(mObject, "name", boost::any(UTF8String("first")));
    AddToObject(mObject, "name", array);
    EXPECT_EQ(Print(mObject), "{\"list\":[],\"name\":[2,null,\"x\"]}");
}

TEST_F(JSONTreeTest, OperationsOnTheWrongKindOfValueThrow)
{
    boost::any array = JSONArray(), empty;
    EXPECT_THROW(AddToObject(array, "k", boost::any(true)), boost::bad_any_cast);
    EXPECT_THROW(AddToObject(empty, "k", boost::any(true)), boost::bad_any_cast);
    EXPECT_THROW(AppendToArray(mObject, boost::any(true)), boost::bad_any_cast);
}

TEST_F(JSONTreeTest, PresenceAndLookupTellNullFromAbsent)
{
    mObject = JSONParse("{\"null\":null,\"one\":1}");
    EXPECT_TRUE(ObjectHasProperty(Members(), "one", false) && ObjectHasProperty(Members(), "null", false));
    EXPECT_FALSE(ObjectHasProperty(Members(), "absent", false));
    EXPECT_EQ(boost::any_cast<long long>(*GetVariantInObject(Members(), "one")), 1);
    ASSERT_TRUE(GetVariantInObject(Members(), "null"));
    EXPECT_TRUE(IsJSONNull(*GetVariantInObject(Members(), "null")));
    EXPECT_FALSE(GetVariantInObject(Members(), "absent"));
}

TEST_F(JSONTreeTest, ValuesKeptFromAParsedTreeOutliveIt)
{
    boost::shared_ptr<boost::any> kept;
    {
        const boost::any tree = JSONParse("{\"a\":{\"b\":[1,\"two\"]},\"c\":3}");
        kept = GetVariantInObject(boost::any_cast<const JSONObject&>(tree), "a");
    }
    ASSERT_TRUE(kept);
    AddToObject(*kept, "d", boost::any(true));
    EXPECT_EQ(Print(*kept), "{\"b\":[1,\"two\"],\"d\":true}");
}

TEST_F(JSONTreeTest, PartsOfAParsedTreeMayBeDroppedOnOtherThreads)
{
    boost::any tree = JSONParse("[{\"a\":[1,2,3]},{\"b\":\"text\"},[true,null]]");
    JSONArray parts = boost::any_cast<JSONArray>(tree);
    tree = boost::any();
    std::thread first([mine = std::move(parts[0])]() mutable { mine.reset(); });
    std::thread second([mine = std::move(parts[1])]() mutable { mine.reset(); });
    first.join();
    second.join();
    EXPECT_EQ(Print(*parts[2]), "[true,null]");
}
