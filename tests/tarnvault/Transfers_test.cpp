// Upload (search, deletes, post, metadata) and conditional, streamed download.

#include <fstream>
#include <functional>
#include <set>

#include "ClientTestSupport.h"
#include "tarnvault/UploadSourcePrivate.h"

using namespace tvtest;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
using tolmocore::filesupport::File;

namespace {

class TransferTest : public ClientTest {
protected:
    // Each waits for the operation's callback.
    Outcome Upload(const std::string& name, const boost::shared_ptr<Collection>& collection = Make("C"),
                   const Guid& id = Guid::CreateUnique())
    {
        Outcome outcome;
        EXPECT_EQ(mClient->UploadAsync(outcome.Success(), outcome.Error(), collection, At(name),
                                       ImmutableString::CreateStatic("text/plain"), u"", id),
                  id);
        EXPECT_TRUE(outcome.Wait());
        return outcome;
    }
    Outcome Download(const std::filesystem::path& name, const UTF8String& etag = "",
                     const Guid& id = Guid::CreateUnique())
    {
        Outcome outcome;
        EXPECT_EQ(mClient->DownloadAsync(outcome.Success(), outcome.Error(), Make<Item>("i1"), At(name), etag, id), id);
        EXPECT_TRUE(outcome.Wait());
        return outcome;
    }
    // A failure with its status and, when one is given, exactly its text.
    static void ExpectFailure(const Outcome& outcome, int status, const char* text)
    {
        EXPECT_FALSE(outcome.Succeeded());
        EXPECT_EQ(outcome.Status(), status);
        if (text)
            EXPECT_EQ(outcome.ErrorText(), text);
        else
            EXPECT_FALSE(outcome.ErrorText().empty());
    }
    File At(const std::filesystem::path& name) { return File(tolmocore::utility::ToUTF16((mDir / name).string())); }

    testsupport::TempDir mDir;
};

}  // namespace

TEST_F(TransferTest, UploadDeletesEveryNamesakeLastFirstThenPostsAndReadsBack)
{
    WriteFileBytes(mDir / "a.txt", "abc");
    const auto collection = Make("C");
    mService.Push(Answer(200, "[" + ItemJSON("old1", "a.txt") + "," + ItemJSON("old2", "a.txt") + "]"));
    mService.Push(Answer(200, ""));
    mService.Push(Answer(200, ""));
    mService.Push(Answer(201, "", {{"Location", "/api/assets/new1"}, {"ETag", "\"e1\""}}));
    mService.Push(Answer(200, ItemJSON("x", "a.txt")));
    const Guid id = Guid::CreateUnique();
    const Outcome outcome = Upload("a.txt", collection, id);
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

// Each failure reaches the error callback; the chain stops where it failed,
// and the collection gains no member.
TEST_F(TransferTest, UploadFailures)
{
    WriteFileBytes(mDir / "a.txt", "abc");
    std::ofstream(mDir / "huge.bin").close();
    std::filesystem::resize_file(mDir / "huge.bin", std::uint64_t(1) << 32);  // sparse
    const std::string noNamesake = "[]";
    const HttpHeaders created{{"Location", "/api/assets/n"}};
    const struct {
        const char* mWhat;
        const char* mFile;
        std::vector<HttpAnswer> mReplies;
        int mStatus;
        const char* mText;  // null: any text but an empty one
    } cases[] = {
        {"no such file", "none.txt", {Answer(200, noNamesake)}, -100, nullptr},
        {"a file of 4 GiB", "huge.bin", {Answer(200, noNamesake)}, -100, "File size beyond the limitation!"},
        {"a failed delete",
         "a.txt",
         {Answer(200, "[" + ItemJSON("old", "a.txt") + "]"), Answer(403, "locked")},
         403,
         "locked"},
        {"a post answered other than 201", "a.txt", {Answer(200, noNamesake), Answer(200, "")}, 200, ""},
        {"metadata that describes a collection",
         "a.txt",
         {Answer(200, noNamesake), Answer(201, "", created), Answer(200, CollectionJSON("n", "a.txt"))},
         -100,
         "Upload: the new asset's metadata is not an item"},
    };
    for (const auto& failure : cases) {
        SCOPED_TRACE(failure.mWhat);
        const size_t before = mService.Requests().size();
        for (const HttpAnswer& reply : failure.mReplies) mService.Push(reply);
        const auto collection = Make("C");
        ExpectFailure(Upload(failure.mFile, collection), failure.mStatus, failure.mText);
        EXPECT_EQ(mService.Requests().size() - before, failure.mReplies.size());
        EXPECT_TRUE(collection->mChildren.empty());
    }
}

// An upload's body is its file as it was when the upload took its length. A
// change before the file is opened to send stops the first read, so no byte
// leaves; a later one stops the read of the last bytes.
TEST_F(TransferTest, UploadSourceStopsWhenTheFileChanges)
{
    const std::filesystem::path path = mDir / "a.bin";
    const std::function<void()> changes[] = {
        [&] { std::ofstream(path, std::ios::app) << 'x'; },  // grows
        [&] { std::filesystem::resize_file(path, 40); },     // ends early
        [&] {                                                // rewritten in place
            std::filesystem::last_write_time(path, std::filesystem::last_write_time(path) + std::chrono::seconds(5));
        },
    };
    unsigned char buffer[64];
    for (const auto& change : changes) {
        for (const size_t readFirst : {0, 50}) {
            SCOPED_TRACE(readFirst);
            WriteFileBytes(path, std::string(100, 'a'));
            UploadSource source(At("a.bin"));
            EXPECT_EQ(source.Size(), 100u);
            if (readFirst > 0) {
                EXPECT_EQ(source.Read(buffer, readFirst), readFirst);
            }
            change();
            EXPECT_THROW(source.Read(buffer, sizeof buffer), std::runtime_error);
            EXPECT_EQ(source.Failure(), kUploadChangedText);
        }
    }
}

TEST_F(TransferTest, DownloadIsConditionalOnTheTagAndReportsTheHeaders)
{
    mService.Push(Answer(
        200, "content",
        {{"Content-Type", "text/plain"}, {"ETag", "\"v2\""}, {"Last-Modified", "Mon, 02 Mar 2026 10:00:00 GMT"}}));
    const Guid id = Guid::CreateUnique();
    const Outcome changed = Download("f.txt", "\"v1\"", id);
    const HttpRequest request = mService.Find("GET", "/api/assets/i1");
    EXPECT_EQ(request.Header("If-None-Match"), "\"v1\"");
    ExpectAuthorised(request, id);
    ASSERT_TRUE(changed.Succeeded());
    const DownloadResult result = changed.Last().mDownload;
    EXPECT_TRUE(result.mDownloaded);
    EXPECT_EQ(result.mContentType, "text/plain");
    EXPECT_EQ(result.mEtag, "\"v2\"");
    EXPECT_EQ(result.mLastModified, UTF16String(u"Mon, 02 Mar 2026 10:00:00 GMT"));
    EXPECT_EQ(result.mContentSize, 7u);
    EXPECT_EQ(ReadFileBytes(mDir / "f.txt"), "content");

    // Unchanged (304): no file.
    mService.Push(Answer(304, ""));
    const Outcome unchanged = Download("new.txt", "e");
    ASSERT_TRUE(unchanged.Succeeded());
    EXPECT_FALSE(unchanged.Last().mDownload.mDownloaded);
    EXPECT_FALSE(std::filesystem::exists(mDir / "new.txt"));

    // No tag: no condition, and an empty body is an empty file.
    mService.Push(Answer(200, ""));
    const Outcome empty = Download("f.txt");
    EXPECT_FALSE(mService.Requests().back().HasHeader("If-None-Match"));
    ASSERT_TRUE(empty.Succeeded());
    EXPECT_TRUE(empty.Last().mDownload.mDownloaded);
    EXPECT_TRUE(empty.Last().mDownload.mEtag.empty());
    EXPECT_EQ(ReadFileBytes(mDir / "f.txt"), "");

    // A link planted at the name is replaced, never written through.
    WriteFileBytes(mDir / "victim", "theirs");
    std::filesystem::create_symlink(mDir / "victim", mDir / "link.txt.temp");
    mService.Push(Answer(200, "ours"));
    ASSERT_TRUE(Download("link.txt.temp").Succeeded());
    EXPECT_EQ(ReadFileBytes(mDir / "victim"), "theirs");
    EXPECT_FALSE(std::filesystem::is_symlink(mDir / "link.txt.temp"));
    EXPECT_EQ(ReadFileBytes(mDir / "link.txt.temp"), "ours");
}

// Each failure reaches the error callback and leaves the target as it was.
TEST_F(TransferTest, DownloadFailuresLeaveTheFileAsItWas)
{
    WriteFileBytes(mDir / "kept.txt", "old");
    HttpAnswer cut = Answer(200, std::string(100000, 'x'));
    cut.mFault = HttpAnswer::Fault_HangUpMidBody;
    const struct {
        const char* mWhat;
        HttpAnswer mReply;
        std::filesystem::path mTarget;
        int mStatus;
        const char* mText;  // null: any text but an empty one
    } cases[] = {
        {"refused", Answer(404, "no such asset"), "kept.txt", 404, "no such asset"},
        {"cut off mid-body", cut, "kept.txt", -100, nullptr},
        {"into a missing directory", Answer(200, "content"), "no/f.txt", -100, nullptr},
    };
    for (const auto& failure : cases) {
        SCOPED_TRACE(failure.mWhat);
        const bool existed = std::filesystem::exists(mDir / failure.mTarget);
        mService.Push(failure.mReply);
        ExpectFailure(Download(failure.mTarget), failure.mStatus, failure.mText);
        if (existed)
            EXPECT_EQ(ReadFileBytes(mDir / failure.mTarget), "old");
        else
            EXPECT_FALSE(std::filesystem::exists(mDir / failure.mTarget));
    }
}

TEST_F(TransferTest, DownloadReachingItsLimitFailsAndRemovesItsFile)
{
    const size_t limit = size_t(1) << 20;
    mClient->SetDownloadSizeLimit(limit);
    WriteFileBytes(mDir / "f.txt", "old");

    // Far past the limit: stopped while it arrives.
    mService.Push(Large("", size_t(64) << 20));
    const Outcome over = Download("f.txt.temp");
    EXPECT_LT(mService.BodyBytesSent(), size_t(64) << 20);
    // At the limit exactly, and a byte below it.
    mService.Push(Large("", limit));
    const Outcome at = Download("f.txt.temp");
    mService.Push(Large("", limit - 1));
    const Outcome below = Download("g.txt.temp");

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

    // The text of a refusal is held in memory: it keeps the bound of every
    // other answer, not the download's.
    mClient->SetDownloadSizeLimit(Tarnvault::kMaxDownloadSize);
    const size_t huge = size_t(128) << 20;
    mService.Push(Large("", huge, 404));
    const size_t sentBefore = mService.BodyBytesSent();
    const Outcome refused = Download("h.txt.temp");
    EXPECT_FALSE(refused.Succeeded());
    EXPECT_EQ(refused.ErrorText(), "Data size beyond the limitation!");
    EXPECT_LT(mService.BodyBytesSent() - sentBefore, huge);
    EXPECT_FALSE(std::filesystem::exists(mDir / "h.txt.temp"));
}
