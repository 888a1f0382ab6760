// Upload (search, deletes, post, metadata) and conditional download.

#include <functional>
#include <set>

#include "ClientTestSupport.h"

using namespace tvtest;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
using tolmocore::filesupport::File;

namespace {

File FileAt(const std::filesystem::path& path)
{
    return File(tolmocore::utility::ToUTF16(path.string()));
}

const ImmutableString kText = ImmutableString::CreateStatic("text/plain");

class TransferTest : public ClientTest {
protected:
    testsupport::TempDir mDir;
};

}  // namespace

TEST_F(TransferTest, UploadDeletesEveryNamesakeLastFirstThenPostsAndReadsBack)
{
    WriteFileBytes(mDir / "a.txt", "abc");
    const auto collection = MakeCollection("C");
    mService.Script(200, "[" + ItemJSON("old1", "a.txt") + "," + ItemJSON("old2", "a.txt") + "]");
    mService.Script(200, "");
    mService.Script(200, "");
    mService.Script(201, "", {{"Location", "/api/assets/new1"}, {"ETag", "\"e1\""}});
    mService.Script(200, ItemJSON("x", "a.txt"));
    Outcome outcome;
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(
        mClient->UploadAsync(outcome.Success(), outcome.Error(), collection, FileAt(mDir / "a.txt"), kText, u"", id),
        id);
    ASSERT_TRUE(outcome.Wait());
    const auto requests = mService.Requests();
    ASSERT_EQ(requests.size(), 5u);
    EXPECT_EQ(mService.Find("POST", "/api/search?", R"("name":"a.txt")").mMethod, "POST");
    // Namesakes go last first, both before the post.
    std::vector<std::string> changes;
    for (const HttpRequest& request : requests)
        if (request.mMethod == "DELETE" || request.mTarget.rfind("/api/assets?", 0) == 0)
            changes.push_back(request.mMethod + " " + request.mTarget);
    EXPECT_EQ(changes, (std::vector<std::string>{
                           "DELETE /api/assets/old2?recursive=true", "DELETE /api/assets/old1?recursive=true",
                           "POST /api/assets?name=a.txt&collections=%5b%22%2fapi%2fcollections%2fC%22%5d"}));
    const HttpRequest post = mService.Find("POST", "/api/assets?");
    EXPECT_EQ(post.Header("Content-Type"), "text/plain");
    EXPECT_EQ(post.Header("Content-Length"), "3");
    EXPECT_EQ(post.Header("X-Persistence-Policy"), "ethereal");
    EXPECT_EQ(post.mBody, "abc");
    EXPECT_EQ(mService.Find("GET", "/api/assets/new1/metadata").mMethod, "GET");
    for (const HttpRequest& request : requests) ExpectAuthorised(request, id);

    ASSERT_TRUE(outcome.Succeeded());
    EXPECT_EQ(outcome.Id(), id);
    const auto item = outcome.AssetSeen();
    EXPECT_EQ(item->mId, "new1");
    EXPECT_EQ(item->mEtag, "\"e1\"");
    ASSERT_EQ(collection->mChildren.size(), 1u);
    EXPECT_EQ(collection->mChildren.back(), item);
}

TEST_F(TransferTest, UploadOfAnEmptyFileUnderItsGivenNameSendsNoBody)
{
    WriteFileBytes(mDir / "empty.bin", "");
    mService.Script(200, "[]");
    mService.Script(201, "", {{"Location", "/api/assets/n"}});
    mService.Script(200, ItemJSON("n", "given name"));
    Outcome outcome;
    mClient->UploadAsync(outcome.Success(), outcome.Error(), MakeCollection("C"), FileAt(mDir / "empty.bin"), kText,
                         u"given name", Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    ASSERT_EQ(mService.Requests().size(), 3u);
    const HttpRequest post = mService.Find("POST", "/api/assets?");
    EXPECT_EQ(post.mTarget.substr(0, post.mTarget.find('&')), "/api/assets?name=given%20name");
    EXPECT_EQ(post.Header("Content-Length"), "0");
    EXPECT_TRUE(post.mBody.empty());
    ASSERT_TRUE(outcome.Succeeded());
    EXPECT_TRUE(outcome.AssetSeen()->mEtag.empty());
}

TEST_F(TransferTest, UploadFailures)
{
    // A file that is not there: only the search went out.
    mService.Script(200, "[]");
    Outcome missing;
    mClient->UploadAsync(missing.Success(), missing.Error(), MakeCollection("C"), FileAt(mDir / "none.txt"), kText, u"",
                         Guid::CreateUnique());
    ASSERT_TRUE(missing.Wait());
    EXPECT_EQ(missing.Status(), -100);
    EXPECT_FALSE(missing.ErrorText().empty());
    EXPECT_EQ(mService.Requests().size(), 1u);

    // A failed delete stops the upload.
    WriteFileBytes(mDir / "a.txt", "abc");
    mService.Script(200, "[" + ItemJSON("old", "a.txt") + "]");
    mService.Script(403, "locked");
    Outcome deleteFailed;
    mClient->UploadAsync(deleteFailed.Success(), deleteFailed.Error(), MakeCollection("C"), FileAt(mDir / "a.txt"),
                         kText, u"", Guid::CreateUnique());
    ASSERT_TRUE(deleteFailed.Wait());
    EXPECT_EQ(deleteFailed.Status(), 403);
    EXPECT_EQ(mService.Requests().size(), 3u);

    // The post answered with something other than 201.
    mService.Script(200, "[]");
    mService.Script(200, "");
    Outcome notCreated;
    mClient->UploadAsync(notCreated.Success(), notCreated.Error(), MakeCollection("C"), FileAt(mDir / "a.txt"), kText,
                         u"", Guid::CreateUnique());
    ASSERT_TRUE(notCreated.Wait());
    EXPECT_EQ(notCreated.Status(), 200);
    EXPECT_EQ(mService.Requests().size(), 5u);

    // Metadata that describes a collection: a plain error, and no new member.
    const auto collection = MakeCollection("C");
    mService.Script(200, "[]");
    mService.Script(201, "", {{"Location", "/api/assets/n"}});
    mService.Script(200, CollectionJSON("n", "a.txt"));
    Outcome notAnItem;
    mClient->UploadAsync(notAnItem.Success(), notAnItem.Error(), collection, FileAt(mDir / "a.txt"), kText, u"",
                         Guid::CreateUnique());
    ASSERT_TRUE(notAnItem.Wait());
    EXPECT_EQ(notAnItem.ErrorText(), "Upload: the new asset's metadata is not an item");
    EXPECT_TRUE(collection->mChildren.empty());
}

TEST_F(TransferTest, DownloadWritesTheBodyAndReportsTheHeaders)
{
    mService.Script(
        200, "content",
        {{"Content-Type", "text/plain"}, {"ETag", "\"v2\""}, {"Last-Modified", "Mon, 02 Mar 2026 10:00:00 GMT"}});
    Outcome outcome;
    const Guid id = Guid::CreateUnique();
    EXPECT_EQ(mClient->DownloadAsync(outcome.Success(), outcome.Error(), MakeItem("i1"), FileAt(mDir / "f.txt"),
                                     "\"v1\"", id),
              id);
    ASSERT_TRUE(outcome.Wait());
    const HttpRequest request = mService.Find("GET", "/api/assets/i1");
    EXPECT_EQ(request.Header("If-None-Match"), "\"v1\"");
    ExpectAuthorised(request, id);
    ASSERT_TRUE(outcome.Succeeded());
    const DownloadResult result = outcome.Last().mDownload;
    EXPECT_TRUE(result.mDownloaded);
    EXPECT_EQ(result.mContentType, "text/plain");
    EXPECT_EQ(result.mEtag, "\"v2\"");
    EXPECT_EQ(result.mLastModified, UTF16String(u"Mon, 02 Mar 2026 10:00:00 GMT"));
    EXPECT_EQ(result.mContentSize, 7u);
    EXPECT_EQ(ReadFileBytes(mDir / "f.txt"), "content");
}

// No tag: no condition, and an empty body is a file. Unchanged (304): no file.
TEST_F(TransferTest, DownloadWithoutEtagOrUnchanged)
{
    mService.Script(200, "");
    mService.Script(304, "");
    Outcome empty, unchanged;
    mClient->DownloadAsync(empty.Success(), empty.Error(), MakeItem("i1"), FileAt(mDir / "f.txt"), "",
                           Guid::CreateUnique());
    ASSERT_TRUE(empty.Wait());
    EXPECT_FALSE(mService.Find("GET", "/api/assets/i1").HasHeader("If-None-Match"));
    ASSERT_TRUE(empty.Succeeded());
    EXPECT_TRUE(empty.Last().mDownload.mDownloaded);
    EXPECT_EQ(empty.Last().mDownload.mContentSize, 0u);
    EXPECT_TRUE(empty.Last().mDownload.mEtag.empty());
    EXPECT_EQ(ReadFileBytes(mDir / "f.txt"), "");

    mClient->DownloadAsync(unchanged.Success(), unchanged.Error(), MakeItem("i2"), FileAt(mDir / "new.txt"), "e",
                           Guid::CreateUnique());
    ASSERT_TRUE(unchanged.Wait());
    EXPECT_EQ(mService.Find("GET", "/api/assets/i2").Header("If-None-Match"), "e");
    ASSERT_TRUE(unchanged.Succeeded());
    EXPECT_FALSE(unchanged.Last().mDownload.mDownloaded);
    EXPECT_TRUE(unchanged.Last().mDownload.mEtag.empty());
    EXPECT_FALSE(std::filesystem::exists(mDir / "new.txt"));
}

// Each failure reaches the error callback and leaves the target as it was.
TEST_F(TransferTest, DownloadFailuresLeaveTheFileAsItWas)
{
    WriteFileBytes(mDir / "kept.txt", "old");
    const struct {
        const char* mWhat;
        std::function<void()> mScript;
        std::filesystem::path mTarget;
        int mStatus;
        const char* mText;  // null: any text but an empty one
    } cases[] = {
        {"refused", [&] { mService.Script(404, "no such asset"); }, mDir / "kept.txt", 404, "no such asset"},
        {"cut off mid-body",
         [&] {
             HttpAnswer cut;
             cut.mBody = std::string(100000, 'x');
             cut.mFault = HttpAnswer::Fault_HangUpMidBody;
             mService.Push(cut);
         },
         mDir / "kept.txt", -100, nullptr},
        {"into a missing directory", [&] { mService.Script(200, "content"); }, mDir / "no" / "f.txt", -100, nullptr},
    };
    for (const auto& failure : cases) {
        SCOPED_TRACE(failure.mWhat);
        const bool existed = std::filesystem::exists(failure.mTarget);
        failure.mScript();
        Outcome outcome;
        mClient->DownloadAsync(outcome.Success(), outcome.Error(), MakeItem("i1"), FileAt(failure.mTarget), "",
                               Guid::CreateUnique());
        ASSERT_TRUE(outcome.Wait());
        EXPECT_FALSE(outcome.Succeeded());
        EXPECT_EQ(outcome.Status(), failure.mStatus);
        if (failure.mText)
            EXPECT_EQ(outcome.ErrorText(), failure.mText);
        else
            EXPECT_FALSE(outcome.ErrorText().empty());
        if (existed)
            EXPECT_EQ(ReadFileBytes(failure.mTarget), "old");
        else
            EXPECT_FALSE(std::filesystem::exists(failure.mTarget));
    }
}

TEST_F(TransferTest, DownloadReachingItsLimitFailsAndRemovesItsFile)
{
    EXPECT_EQ(mClient->DownloadSizeLimit(), std::uint64_t(1) << 32);
    const size_t limit = size_t(1) << 20;
    mClient->SetDownloadSizeLimit(limit);
    WriteFileBytes(mDir / "f.txt", "old");

    // Far past the limit: stopped while it arrives.
    mService.ScriptLarge("", size_t(64) << 20);
    Outcome over;
    mClient->DownloadAsync(over.Success(), over.Error(), MakeItem("i1"), FileAt(mDir / "f.txt.temp"), "",
                           Guid::CreateUnique());
    ASSERT_TRUE(over.Wait());
    EXPECT_LT(mService.BodyBytesSent(), size_t(64) << 20);
    // At the limit exactly, and a byte below it.
    mService.ScriptLarge("", limit);
    Outcome at;
    mClient->DownloadAsync(at.Success(), at.Error(), MakeItem("i1"), FileAt(mDir / "f.txt.temp"), "",
                           Guid::CreateUnique());
    ASSERT_TRUE(at.Wait());
    mService.ScriptLarge("", limit - 1);
    Outcome below;
    mClient->DownloadAsync(below.Success(), below.Error(), MakeItem("i1"), FileAt(mDir / "g.txt.temp"), "",
                           Guid::CreateUnique());
    ASSERT_TRUE(below.Wait());

    for (const Outcome* refused : {&over, &at}) {
        EXPECT_FALSE(refused->Succeeded());
        EXPECT_EQ(refused->Status(), -100);
        EXPECT_EQ(refused->ErrorText(), "Data size beyond the limitation!");
    }
    // Neither the refused files nor what streamed into them before the stop.
    std::set<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(mDir.Path())) names.insert(entry.path().filename());
    EXPECT_EQ(names, (std::set<std::string>{"f.txt", "g.txt.temp"}));
    EXPECT_EQ(ReadFileBytes(mDir / "f.txt"), "old");
    ASSERT_TRUE(below.Succeeded());
    EXPECT_EQ(below.Last().mDownload.mContentSize, limit - 1);
    EXPECT_EQ(ReadFileBytes(mDir / "g.txt.temp"), std::string(limit - 1, ' '));
    // Nobody else's business until the swap gives it the mode it will keep.
    EXPECT_EQ(std::filesystem::status(mDir / "g.txt.temp").permissions() & std::filesystem::perms::mask,
              std::filesystem::perms::owner_read | std::filesystem::perms::owner_write);
}

TEST_F(TransferTest, DownloadRefusedWithAHugeTextIsStoppedAtTheJSONBound)
{
    // The download's own limit is for content; the text of a refusal is held
    // in memory, so it keeps the bound of every other answer.
    const size_t huge = size_t(128) << 20;
    mService.ScriptLarge("", huge, 404);
    Outcome refused;
    mClient->DownloadAsync(refused.Success(), refused.Error(), MakeItem("i1"), FileAt(mDir / "f.txt.temp"), "",
                           Guid::CreateUnique());
    ASSERT_TRUE(refused.Wait());
    EXPECT_FALSE(refused.Succeeded());
    const std::string text = refused.ErrorText();
    EXPECT_TRUE(text == "Data size beyond the limitation!") << text.size() << " bytes: " << text.substr(0, 60);
    EXPECT_LT(mService.BodyBytesSent(), huge);
    EXPECT_FALSE(std::filesystem::exists(mDir / "f.txt.temp"));
}
