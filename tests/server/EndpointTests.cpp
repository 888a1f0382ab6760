// Each route's success and its refusals, read back the way the client reads.

#include <boost/pointer_cast.hpp>

#include "ServiceFixture.h"

namespace servertest {
namespace {

using tolmonetsync::Collection;
using tolmonetsync::Item;

class EndpointTest : public ServiceTest {};

TEST_F(EndpointTest, ClientRootIsMadeOnceAndReadsBackAsARoot)
{
    const Reply first = mAlice->Send("GET", "/collections?name=" + Quote("desk app"));
    ASSERT_EQ(200, first.mStatus) << first.mBody;
    const auto assets = Assets(first);
    ASSERT_EQ(1u, assets.size());
    ASSERT_TRUE(assets[0]->is_collection());
    EXPECT_TRUE(assets[0]->is_root());
    EXPECT_EQ(u"desk app", assets[0]->mName);
    EXPECT_EQ(assets[0]->mId.ToStdString(), ClientRoot(*mAlice, "desk app"));
    EXPECT_NE(assets[0]->mId.ToStdString(), ClientRoot(*mAlice, "other app"));
}

TEST_F(EndpointTest, ClientRootWithoutANameIsRefused)
{
    EXPECT_EQ(400, mAlice->Send("GET", "/collections").mStatus);
}

TEST_F(EndpointTest, SearchByRootTypeFindsOnlyTheUserRootNamedRoot)
{
    ClientRoot(*mAlice, "app");
    const Reply reply = Search(*mAlice, std::string("{\"type\":\"") + kRootType + "\",\"trashed\":{\"$ne\":true}}");
    ASSERT_EQ(200, reply.mStatus) << reply.mBody;
    const auto assets = Assets(reply);
    ASSERT_EQ(1u, assets.size());
    EXPECT_TRUE(assets[0]->is_root());
    EXPECT_EQ(u"root", assets[0]->mName);
}

TEST_F(EndpointTest, CreateAnswersLocationAndTheHeaderReadsBack)
{
    const Reply created =
        mAlice->Send("POST", "/collections",
                     std::string("{\"header\":{\"name\":\"Prefs ?%+\",\"type\":\"") + kPreferencesType + "\"}}",
                     {"Content-Type: application/json"});
    ASSERT_EQ(201, created.mStatus) << created.mBody;
    const std::string location = created.Header("Location");
    EXPECT_EQ(0u, location.find("/api/collections/"));
    const Reply header = mAlice->Send("GET", "/collections/" + IdFromLocation(location) + "/header");
    ASSERT_EQ(200, header.mStatus);
    Reply asList = header;
    asList.mBody = "[" + header.mBody + "]";
    const auto assets = Assets(asList);
    auto collection = boost::dynamic_pointer_cast<Collection>(assets.at(0));
    ASSERT_TRUE(collection);
    EXPECT_EQ(tolmonetsync::kCollectionType_Preferences, collection->mType);
    EXPECT_EQ(u"Prefs ?%+", collection->mName);
    EXPECT_FALSE(collection->mCreated.is_not_a_date_time());
}

TEST_F(EndpointTest, CreateRefusesRootsKindlessCollectionsAndBadBodies)
{
    const std::vector<std::string> json = {"Content-Type: application/json"};
    EXPECT_EQ(400, mAlice
                       ->Send("POST", "/collections",
                              std::string("{\"header\":{\"name\":\"r\",\"type\":\"") + kRootType + "\"}}", json)
                       .mStatus);
    EXPECT_EQ(400, mAlice->Send("POST", "/collections", "{\"header\":{\"name\":\"n\",\"type\":\"\"}}", json).mStatus);
    EXPECT_EQ(400, mAlice->Send("POST", "/collections", "{\"header\":", json).mStatus);
    EXPECT_EQ(400, mAlice->Send("POST", "/collections", "[]", json).mStatus);
    const Reply noType = mAlice->Send("POST", "/collections", "{\"header\":{\"name\":\"n\"}}", json);
    EXPECT_EQ(400, noType.mStatus);
    EXPECT_EQ(std::string::npos, noType.mBody.find('\n'));
}

TEST_F(EndpointTest, MembersAreListedInTheOrderTheyWereAdded)
{
    const std::string parent = CreateCollection(*mAlice, "parent");
    const std::string a = CreateCollection(*mAlice, "a");
    const std::string b = CreateCollection(*mAlice, "b");
    AddMember(*mAlice, parent, "/collections/" + b);
    AddMember(*mAlice, parent, "/collections/" + a);
    AddMember(*mAlice, parent, "/collections/" + b);  // already there: stays where it is
    const Reply list = mAlice->Send("GET", "/collections/" + parent + "/members");
    ASSERT_EQ(200, list.mStatus);
    EXPECT_EQ((std::vector<std::string>{b, a}), Ids(list));
}

TEST_F(EndpointTest, AddRefusesCyclesMissingAssetsAndBadPaths)
{
    const std::string outer = CreateCollection(*mAlice, "outer");
    const std::string inner = CreateCollection(*mAlice, "inner");
    AddMember(*mAlice, outer, "/collections/" + inner);
    const std::vector<std::string> json = {"Content-Type: application/json"};
    EXPECT_EQ(
        409,
        mAlice->Send("PUT", "/collections/" + inner + "/members", "[\"/collections/" + outer + "\"]", json).mStatus);
    EXPECT_EQ(
        409,
        mAlice->Send("PUT", "/collections/" + outer + "/members", "[\"/collections/" + outer + "\"]", json).mStatus);
    EXPECT_EQ(404, mAlice->Send("PUT", "/collections/" + outer + "/members", "[\"/assets/nothing\"]", json).mStatus);
    EXPECT_EQ(404,
              mAlice->Send("PUT", "/collections/nothing/members", "[\"/collections/" + inner + "\"]", json).mStatus);
    EXPECT_EQ(400, mAlice->Send("PUT", "/collections/" + outer + "/members", "[\"elsewhere/x\"]", json).mStatus);
    EXPECT_EQ(400, mAlice->Send("PUT", "/collections/" + outer + "/members", "{\"a\":1}", json).mStatus);
}

TEST_F(EndpointTest, DeleteFollowsTheRecursiveFlag)
{
    const std::string parent = CreateCollection(*mAlice, "parent");
    const std::string child = CreateCollection(*mAlice, "child");
    AddMember(*mAlice, parent, "/collections/" + child);
    const std::string item = Upload(*mAlice, child, "file.txt", "bytes");
    EXPECT_EQ(409, mAlice->Send("DELETE", "/collections/" + parent + "?recursive=false").mStatus);
    EXPECT_EQ(400, mAlice->Send("DELETE", "/collections/" + parent + "?recursive=maybe").mStatus);
    EXPECT_EQ(200, mAlice->Send("DELETE", "/collections/" + parent + "?recursive=true").mStatus);
    EXPECT_EQ(404, mAlice->Send("GET", "/collections/" + child + "/header").mStatus);
    EXPECT_EQ(404, mAlice->Send("GET", "/assets/" + item).mStatus);
    EXPECT_EQ(404, mAlice->Send("DELETE", "/assets/" + item + "?recursive=false").mStatus);
}

TEST_F(EndpointTest, RecursiveDeleteKeepsMembersHeldElsewhere)
{
    const std::string doomed = CreateCollection(*mAlice, "doomed");
    const std::string keeper = CreateCollection(*mAlice, "keeper");
    const std::string shared = Upload(*mAlice, doomed, "shared.txt", "s");
    AddMember(*mAlice, keeper, "/assets/" + shared);
    ASSERT_EQ(200, mAlice->Send("DELETE", "/collections/" + doomed + "?recursive=true").mStatus);
    const Reply download = mAlice->Send("GET", "/assets/" + shared);
    EXPECT_EQ(200, download.mStatus);
    EXPECT_EQ("s", download.mBody);
}

TEST_F(EndpointTest, RootsCannotBeDeleted)
{
    const std::string root = ClientRoot(*mAlice, "app");
    EXPECT_EQ(403, mAlice->Send("DELETE", "/collections/" + root + "?recursive=true").mStatus);
}

TEST_F(EndpointTest, UploadAnswersEtagAndLocationAndTheMetadataReadsBackAsAnItem)
{
    const std::string folder = CreateCollection(*mAlice, "folder");
    const Reply reply = mAlice->Send(
        "POST",
        "/assets?name=" + Quote("na me?.txt") + "&collections=" + Quote("[\"/api/collections/" + folder + "\"]"),
        "hello", {"Content-Type: text/plain", "X-Persistence-Policy: ethereal"});
    ASSERT_EQ(201, reply.mStatus) << reply.mBody;
    const std::string etag = reply.Header("ETag");
    ASSERT_GE(etag.size(), 2u);
    EXPECT_EQ('"', etag.front());
    EXPECT_EQ('"', etag.back());
    const std::string id = IdFromLocation(reply.Header("Location"));
    Reply metadata = mAlice->Send("GET", "/assets/" + id + "/metadata");
    ASSERT_EQ(200, metadata.mStatus);
    metadata.mBody = "[" + metadata.mBody + "]";
    auto item = boost::dynamic_pointer_cast<Item>(Assets(metadata).at(0));
    ASSERT_TRUE(item);
    EXPECT_EQ(id, item->mId.ToStdString());
    EXPECT_EQ(u"na me?.txt", item->mName);
    EXPECT_EQ("text/plain", item->mContentType.ToStdString());
    EXPECT_EQ(5, item->mSize);
    const Reply members = mAlice->Send("GET", "/collections/" + folder + "/members");
    EXPECT_EQ((std::vector<std::string>{id}), Ids(members));
}

TEST_F(EndpointTest, UploadRefusesCollectionTypesAndMissingParts)
{
    const std::string folder = CreateCollection(*mAlice, "folder");
    const std::string collections = "&collections=" + Quote("[\"/api/collections/" + folder + "\"]");
    EXPECT_EQ(
        400,
        mAlice->Send("POST", "/assets?name=x" + collections, "b", {std::string("Content-Type: ") + kCollectionType})
            .mStatus);
    EXPECT_EQ(400, mAlice->Send("POST", "/assets" + std::string("?") + collections.substr(1), "b").mStatus);
    EXPECT_EQ(400, mAlice->Send("POST", "/assets?name=x", "b").mStatus);
    EXPECT_EQ(400, mAlice->Send("POST", "/assets?name=x&collections=" + Quote("[\"/elsewhere/1\"]"), "b").mStatus);
    EXPECT_EQ(404,
              mAlice->Send("POST", "/assets?name=x&collections=" + Quote("[\"/api/collections/none\"]"), "b").mStatus);
    EXPECT_TRUE(Ids(mAlice->Send("GET", "/collections/" + folder + "/members")).empty());
}

TEST_F(EndpointTest, EmptyContentTypeIsStoredAsOctetStream)
{
    const std::string folder = CreateCollection(*mAlice, "folder");
    const std::string id = Upload(*mAlice, folder, "blob", std::string("\0\1\2", 3), "");
    const Reply download = mAlice->Send("GET", "/assets/" + id);
    ASSERT_EQ(200, download.mStatus);
    EXPECT_EQ(std::string("\0\1\2", 3), download.mBody);
    EXPECT_EQ("application/octet-stream", download.Header("Content-Type"));
}

TEST_F(EndpointTest, DownloadGivesBytesAndHeadersAndHonoursIfNoneMatch)
{
    const std::string folder = CreateCollection(*mAlice, "folder");
    const std::string id = Upload(*mAlice, folder, "a.json", "{\"k\":1}", "application/json");
    const Reply full = mAlice->Send("GET", "/assets/" + id);
    ASSERT_EQ(200, full.mStatus);
    EXPECT_EQ("{\"k\":1}", full.mBody);
    EXPECT_EQ("application/json", full.Header("Content-Type"));
    EXPECT_FALSE(full.Header("Last-Modified").empty());
    const std::string etag = full.Header("ETag");
    const Reply same = mAlice->Send("GET", "/assets/" + id, "", {"If-None-Match: " + etag});
    EXPECT_EQ(304, same.mStatus);
    EXPECT_TRUE(same.mBody.empty());
    EXPECT_EQ(200, mAlice->Send("GET", "/assets/" + id, "", {"If-None-Match: \"stale\""}).mStatus);
    EXPECT_EQ(404, mAlice->Send("GET", "/assets/" + folder).mStatus);
}

TEST_F(EndpointTest, UnknownPathsAndMethodsAreRefused)
{
    EXPECT_EQ(404, mAlice->Send("GET", "/nothing/here").mStatus);
    EXPECT_EQ(405, mAlice->Send("GET", "/search").mStatus);
    EXPECT_EQ(405, mAlice->Send("DELETE", "/collections").mStatus);
}

}  // namespace
}  // namespace servertest
