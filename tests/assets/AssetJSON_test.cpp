// Reading assets from the service's JSON, their trace forms, and the search
// query forms the service does not echo back.

#include <gtest/gtest.h>


#include <boost/date_time/posix_time/posix_time.hpp>

#include "assets/AssetJSON.h"
#include "foundation/json/JSON.h"

using namespace tolmonetsync;
namespace json = tolmocore::serialization;

namespace {

boost::shared_ptr<AssetBase> Read(const std::string& text)
{
    return json::JSONConvert<boost::shared_ptr<AssetBase> >::FromJSON(json::JSONParse(UTF8String(text)));
}

std::string Print(const boost::any& value)
{
    return json::GetJSONUTF8String(value, false).ToStdString();
}

}  // namespace

TEST(AssetJSON, KindIdAndSizeInEveryForm)
{
    const std::string media = "\"type\":\"application/vnd.halvane.tarnvault.collection";
    struct Row {
        const char* mLabel;
        std::string mJson;
        const char* mId;
        CollectionType mType;  // kCollectionType_None: an item
        std::int64_t mSize;    // items only
    };
    const std::vector<Row> rows = {
        {"id from the url", "{\"url\":\"/api/collections/abc\"," + media + "\"}", "abc", kCollectionType_Collection, 0},
        {"id before the url", "{\"id\":\"own\",\"url\":\"/api/collections/x\"," + media + ".root\"}", "own",
         kCollectionType_Root, 0},
        {"preferences", "{\"id\":\"p\"," + media + ".preferences\"}", "p", kCollectionType_Preferences, 0},
        {"unknown media type", R"({"id":"/assets/x1","type":"image/png","size":42})", "x1", kCollectionType_None, 42},
        {"no media type, size as text", R"({"id":"y","size":"1234"})", "y", kCollectionType_None, 1234},
        {"size as other text", R"({"id":"y","size":"abc"})", "y", kCollectionType_None, 0},
        {"no size", R"({"id":"y"})", "y", kCollectionType_None, -1},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.mLabel);
        const auto asset = Read(row.mJson);
        EXPECT_EQ(row.mId, asset->mId.ToStdString());
        EXPECT_EQ(row.mType != kCollectionType_None, asset->is_collection());
        EXPECT_EQ(row.mType == kCollectionType_Root, asset->is_root());
        if (row.mType == kCollectionType_None) {
            EXPECT_EQ(row.mSize, boost::static_pointer_cast<Item>(asset)->mSize);
        } else {
            EXPECT_EQ(row.mType, boost::static_pointer_cast<Collection>(asset)->mType);
        }
    }
    const auto dated = Read(R"({"id":"c","modified":"2014-03-05T09:41:07.999+00:00"})");
    EXPECT_EQ("2014-Mar-05 09:41:07", boost::posix_time::to_simple_string(dated->mModified));
}

TEST(AssetJSON, MalformedAssetsFailWhole)
{
    for (const char* bad : {R"(["not an object"])", R"({"type":7})", R"({"shared":"yes"})", R"({"size":1.5})",
                            R"({"modified":"yesterday"})"})
        EXPECT_ANY_THROW(Read(bad)) << bad;
    using Vector = std::vector<boost::shared_ptr<AssetBase> >;
    EXPECT_ANY_THROW(json::JSONConvert<Vector>::FromJSON(json::JSONParse(UTF8String("{}"))));
}

TEST(SearchQueryJSON, EqualAndContainsCriteriaAndAQuotedName)
{
    SearchQuery query(kCollectionType_None, u"Name \"quoted\"");
    query.mTrashed.mModifier = kSearchModifier_Equal;
    query.mTrashed.mValue = false;
    const std::string text = Print(json::JSONConvert<SearchQuery>::ToJSON(query));
    EXPECT_NE(std::string::npos, text.find(R"("trashed":false)")) << text;
    EXPECT_NE(std::string::npos, text.find(R"("name":"Name \"quoted\"")")) << text;
    SearchCriteria contains;
    contains.mModifier = kSearchModifier_Contains;
    contains.mValue = true;
    EXPECT_EQ(R"({"$contains":true})", Print(json::JSONConvert<SearchCriteria>::ToJSON(contains)));
}
