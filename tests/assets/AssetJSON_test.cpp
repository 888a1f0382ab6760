// Reading assets from the service's JSON, printing them, and search queries.

#include <gtest/gtest.h>

#include <sstream>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "assets/AssetJSON.h"
#include "foundation/json/JSON.h"

using namespace tolmonetsync;
namespace json = tolmocore::serialization;

namespace {

boost::shared_ptr<AssetBase> Read(const char* text)
{
    return json::JSONConvert<boost::shared_ptr<AssetBase> >::FromJSON(json::JSONParse(UTF8String(text)));
}

std::string Print(const boost::any& value) { return json::GetJSONUTF8String(value, false).ToStdString(); }

const char kCollectionType[] = "application/vnd.halvane.tarnvault.collection";

}  // namespace

TEST(AssetJSON, CollectionIdComesFromTheUrlWhenThereIsNoId)
{
    const auto asset = Read(R"({"url":"/api/collections/abc","type":"application/vnd.halvane.tarnvault.collection",
                                "name":"Gr\u00fcppe","modified":"2014-03-05T09:41:07.999+00:00"})");
    ASSERT_TRUE(asset->is_collection());
    EXPECT_FALSE(asset->is_root());
    EXPECT_EQ(asset->mId.ToStdString(), "abc");
    EXPECT_EQ(asset->mName, UTF16String(u"Grüppe"));
    EXPECT_EQ(asset->GetURI().ToStdString(), "/collections/abc");
    EXPECT_EQ(boost::posix_time::to_simple_string(asset->mModified), "2014-Mar-05 09:41:07");
    EXPECT_TRUE(asset->mCreated.is_not_a_date_time());
}

TEST(AssetJSON, PresentIdNeverLooksAtTheUrl)
{
    const auto asset = Read(R"({"id":"own","url":"/api/collections/other","type":"application/vnd.halvane.tarnvault.collection.root"})");
    EXPECT_EQ(asset->mId.ToStdString(), "own");
    EXPECT_TRUE(asset->is_root());
}

TEST(AssetJSON, PreferencesCollectionIsNoRoot)
{
    const auto asset = Read(R"({"id":"p","type":"application/vnd.halvane.tarnvault.collection.preferences"})");
    EXPECT_TRUE(asset->is_collection());
    EXPECT_FALSE(asset->is_root());
    EXPECT_EQ(boost::static_pointer_cast<Collection>(asset)->mType, kCollectionType_Preferences);
}

TEST(AssetJSON, UnknownOrMissingMediaTypeIsAnItem)
{
    const auto item = Read(R"({"id":"/assets/x1","type":"image/png","shareable":true,"size":42,"aspect_ratio":1})");
    ASSERT_FALSE(item->is_collection());
    EXPECT_EQ(item->mId.ToStdString(), "x1");
    EXPECT_EQ(item->GetURI().ToStdString(), "/assets/x1");
    const Item& fields = static_cast<const Item&>(*item);
    EXPECT_EQ(fields.mContentType.ToStdString(), "image/png");
    EXPECT_TRUE(fields.mShareable);
    EXPECT_FALSE(fields.mShared);
    EXPECT_EQ(fields.mSize, 42);
    EXPECT_DOUBLE_EQ(fields.mAspectRatio, 1.0);
    EXPECT_TRUE(fields.mEtag.empty());
    EXPECT_FALSE(Read(R"({"id":"y"})")->is_collection());
}

TEST(AssetJSON, SizeForms)
{
    auto size = [](const char* text) { return boost::static_pointer_cast<Item>(Read(text))->mSize; };
    EXPECT_EQ(size(R"({"size":"1234"})"), 1234);
    EXPECT_EQ(size(R"({"size":"abc"})"), 0);
    EXPECT_EQ(size(R"({"name":"no size"})"), -1);
    EXPECT_THROW(size(R"({"size":1.5})"), std::exception);
}

TEST(AssetJSON, MalformedAssetsFailWhole)
{
    EXPECT_THROW(Read(R"(["not an object"])"), boost::bad_any_cast);
    EXPECT_THROW(Read(R"({"type":7})"), boost::bad_any_cast);
    EXPECT_THROW(Read(R"({"shared":"yes"})"), boost::bad_any_cast);
    EXPECT_THROW(Read(R"({"modified":"yesterday"})"), std::exception);
    using Vector = std::vector<boost::shared_ptr<AssetBase> >;
    EXPECT_THROW(json::JSONConvert<Vector>::FromJSON(json::JSONParse(UTF8String("{}"))), boost::bad_any_cast);
    EXPECT_EQ(json::JSONConvert<Vector>::FromJSON(json::JSONParse(UTF8String(R"([{"id":"a"},{"id":"b"}])"))).size(), 2u);
}

TEST(AssetJSON, StreamFormsForTraceLines)
{
    std::ostringstream out;
    out << Read(R"({"id":"c1","name":"G","type":"application/vnd.halvane.tarnvault.collection"})");
    EXPECT_EQ(out.str(), "Collection(type: 2, id: c1, name: 'G', created: not-a-date-time, modified: not-a-date-time)");
    std::ostringstream item;
    item << boost::static_pointer_cast<Item>(Read(R"({"id":"i1","name":"f.xmp","type":"text/xml"})"));
    EXPECT_EQ(item.str(),
              "Item(content-type: text/xml, etag: , id: i1, name: 'f.xmp', created: not-a-date-time, modified: "
              "not-a-date-time)");
}

TEST(CollectionType, ConversionsBothWays)
{
    EXPECT_EQ(tarnvault::StringToCollectionType(UTF8String(kCollectionType)), kCollectionType_Collection);
    EXPECT_EQ(tarnvault::StringToCollectionType(UTF8String("application/vnd.halvane.tarnvault.collection ")),
              kCollectionType_None);
    EXPECT_TRUE(tarnvault::CollectionTypeToString(kCollectionType_None).empty());
    for (CollectionType type : {kCollectionType_Root, kCollectionType_Collection, kCollectionType_Preferences})
        EXPECT_EQ(tarnvault::StringToCollectionType(tarnvault::CollectionTypeToString(type)), type);
}

TEST(SearchQueryJSON, DefaultLeavesOutTrashedAssetsOnly)
{
    EXPECT_EQ(Print(json::JSONConvert<SearchQuery>::ToJSON(SearchQuery())), R"({"trashed":{"$ne":true}})");
}

TEST(SearchQueryJSON, TypeNameAndCriteriaForms)
{
    SearchQuery query(kCollectionType_Root, u"Name \"quoted\"");
    query.mTrashed.mModifier = kSearchModifier_Equal;
    query.mTrashed.mValue = false;
    const std::string text = Print(json::JSONConvert<SearchQuery>::ToJSON(query));
    EXPECT_NE(text.find(R"("type":"application/vnd.halvane.tarnvault.collection.root")"), std::string::npos);
    EXPECT_NE(text.find(R"("trashed":false)"), std::string::npos);
    EXPECT_NE(text.find(R"("name":"Name \"quoted\"")"), std::string::npos);

    SearchCriteria contains;
    contains.mModifier = kSearchModifier_Contains;
    contains.mValue = true;
    EXPECT_EQ(Print(json::JSONConvert<SearchCriteria>::ToJSON(contains)), R"({"$contains":true})");
    EXPECT_THROW(json::JSONConvert<SearchCriteria>::ToJSON(SearchCriteria()), std::runtime_error);
}

TEST(SearchQuery, ScopesInOrderOfTheCalls)
{
    boost::shared_ptr<Collection> first(new Collection), second(new Collection);
    first->mId = "one";
    second->mId = "two";
    SearchQuery query(first, u"x");
    query.AddScope(second);
    ASSERT_EQ(query.mScopes.size(), 2u);
    EXPECT_EQ(query.mScopes[0].ToStdString(), "/collections/one");
    EXPECT_EQ(query.mScopes[1].ToStdString(), "/collections/two");
    EXPECT_EQ(query.mType, kCollectionType_None);
}
