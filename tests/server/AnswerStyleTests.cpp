// Every answer style reads back, in the client's own reader, to the same assets.

#include <boost/date_time/posix_time/posix_time.hpp>
#include <boost/pointer_cast.hpp>

#include "ServiceFixture.h"

namespace servertest {
namespace {

using tolmonetsync::server::AnswerStyle;

class AnswerStyleTest : public ServiceTest, public ::testing::WithParamInterface<tolmonetsync::server::IdForm> {
protected:
    void SetUp() override
    {
        ServiceTest::SetUp();
        mFolder = CreateCollection(*mAlice, "folder");
        mItem = Upload(*mAlice, mFolder, "item.bin", "12345", "application/x-thing");
    }

    void Use(const AnswerStyle& style) { mService->SetAnswerStyle(style); }

    std::string mFolder;
    std::string mItem;
};

TEST_P(AnswerStyleTest, SearchAndMembersReadBackToTheRealIds)
{
    AnswerStyle style;
    style.mIdForm = GetParam();
    Use(style);
    const std::vector<std::string> expected = {mItem};
    EXPECT_EQ(expected, Ids(Search(*mAlice, "{}", "[\"/collections/" + mFolder + "\"]")));
    EXPECT_EQ(expected, Ids(mAlice->Send("GET", "/collections/" + mFolder + "/members")));
    const std::vector<std::string> all = Ids(Search(*mAlice, "{}"));
    EXPECT_NE(std::find(all.begin(), all.end(), mFolder), all.end());
    const Reply root = mAlice->Send("GET", "/collections?name=app");
    const auto roots = Assets(root);
    ASSERT_EQ(1u, roots.size());
    EXPECT_TRUE(roots[0]->is_root());
    EXPECT_EQ(std::string::npos, roots[0]->mId.ToStdString().find('/'));
}

INSTANTIATE_TEST_SUITE_P(IdForms, AnswerStyleTest,
                         ::testing::Values(tolmonetsync::server::IdForm_Plain, tolmonetsync::server::IdForm_Path,
                                           tolmonetsync::server::IdForm_ApiPath, tolmonetsync::server::IdForm_UrlOnly));

class AnswerHeaderTest : public AnswerStyleTest {};

TEST_F(AnswerHeaderTest, AbsoluteLocationEndsInTheSameId)
{
    AnswerStyle style;
    style.mAbsoluteLocation = true;
    Use(style);
    const std::string body = std::string("{\"header\":{\"name\":\"x\",\"type\":\"") + kCollectionType + "\"}}";
    const Reply created = mAlice->Send("POST", "/collections", body, {"Content-Type: application/json"});
    ASSERT_EQ(201, created.mStatus);
    const std::string location = created.Header("Location");
    EXPECT_EQ(0u, location.find("http://127.0.0.1:" + std::to_string(mService->Port()) + "/api/collections/"));
    EXPECT_EQ(200, mAlice->Send("GET", "/collections/" + IdFromLocation(location) + "/header").mStatus);
}

TEST_F(AnswerHeaderTest, HeaderNamesComeInTheChosenCase)
{
    AnswerStyle style;
    style.mHeaderCase = tolmonetsync::server::HeaderCase_Lower;
    Use(style);
    Reply reply = mAlice->Send("GET", "/assets/" + mItem);
    EXPECT_EQ("etag", reply.HeaderSpelling("ETag"));
    EXPECT_EQ("last-modified", reply.HeaderSpelling("Last-Modified"));
    style.mHeaderCase = tolmonetsync::server::HeaderCase_Upper;
    Use(style);
    reply = mAlice->Send("GET", "/assets/" + mItem);
    EXPECT_EQ("ETAG", reply.HeaderSpelling("ETag"));
    EXPECT_EQ("LAST-MODIFIED", reply.HeaderSpelling("Last-Modified"));
}

TEST_F(AnswerHeaderTest, SizesAsStringsReadBackAsNumbers)
{
    AnswerStyle style;
    style.mSizeAsString = true;
    Use(style);
    const Reply reply = mAlice->Send("GET", "/collections/" + mFolder + "/members");
    EXPECT_NE(std::string::npos, reply.mBody.find("\"size\":\"5\""));
    auto item = boost::dynamic_pointer_cast<tolmonetsync::Item>(Assets(reply).at(0));
    ASSERT_TRUE(item);
    EXPECT_EQ(5, item->mSize);
    EXPECT_EQ("application/x-thing", item->mContentType.ToStdString());
}

TEST_F(AnswerHeaderTest, TimesWithAndWithoutFractionsGiveTheSameSecond)
{
    AnswerStyle style;
    const auto withFraction = Assets(mAlice->Send("GET", "/collections/" + mFolder + "/members")).at(0);
    style.mFractionalSeconds = false;
    Use(style);
    const Reply plain = mAlice->Send("GET", "/collections/" + mFolder + "/members");
    const std::size_t start = plain.mBody.find("\"created\":\"") + 11;
    const std::string created = plain.mBody.substr(start, plain.mBody.find('"', start) - start);
    EXPECT_EQ(std::string::npos, created.find('.')) << created;
    EXPECT_EQ("+00:00", created.substr(created.size() - 6));
    const auto withoutFraction = Assets(plain).at(0);
    ASSERT_FALSE(withoutFraction->mCreated.is_not_a_date_time());
    EXPECT_EQ(withFraction->mCreated, withoutFraction->mCreated);
    EXPECT_EQ(withFraction->mModified, withoutFraction->mModified);
    const auto now = boost::posix_time::second_clock::universal_time();
    EXPECT_LE(withoutFraction->mCreated, now);
    EXPECT_GT(withoutFraction->mCreated, now - boost::posix_time::hours(1));
}

}  // namespace
}  // namespace servertest
