// The library's own REST client against the service, in every answer
// style: the two sides were written apart from the same contract, so this
// is where a disagreement shows.

#include <chrono>
#include <filesystem>
#include <fstream>
#include <functional>
#include <memory>
#include <random>

#include <boost/date_time/posix_time/posix_time.hpp>
#include <boost/make_shared.hpp>
#include <boost/pointer_cast.hpp>
#include <boost/shared_ptr.hpp>

#include "ServiceFixture.h"
#include "foundation/core/File.h"
#include "foundation/core/ImmutableString.h"
#include "support/CallRecorder.h"
#include "support/HostClient.h"
#include "support/RefusingProcessor.h"
#include "tarnvault/Tarnvault.h"

namespace servertest {
namespace {

using namespace tolmonetsync;
using tolmonetsync::server::AnswerStyle;

// What the first callback of one operation received.
struct Outcome {
    bool mSuccess = false;
    int mStatus = 0;    // the error's
    std::string mText;  // the error's body
    boost::shared_ptr<AssetBase> mAsset;
    DownloadResult mDownload;
};
using Call = testsupport::CallRecorder<Outcome>;

void Keep(Outcome& outcome, const DownloadResult& download)
{
    outcome.mDownload = download;
}
template <class T>
void Keep(Outcome& outcome, const boost::shared_ptr<T>& asset)
{
    outcome.mAsset = asset;
}

// Fits every success callback, and keeps the asset or download it carries.
auto Done(const Call& call)
{
    return [call](const Guid&, const auto&... carried) {
        Outcome outcome;
        outcome.mSuccess = true;
        (Keep(outcome, carried), ...);
        call.Add(outcome);
    };
}
ErrorCallback Failed(const Call& call)
{
    return [call](const Guid&, const boost::shared_ptr<tolmonet::Response>& response) {
        Outcome outcome;
        outcome.mStatus = response ? response->status : 0;
        outcome.mText = response ? response->BodyText().ToStdString() : std::string();
        call.Add(outcome);
    };
}
// Waits at most a minute; an empty outcome if nothing came.
Outcome First(const Call& call)
{
    return call.WaitFor(1, std::chrono::minutes(1)) ? call.All().front() : Outcome();
}

class ClientAgreementTest : public ServiceTest, public ::testing::WithParamInterface<AnswerStyle> {
protected:
    explicit ClientAgreementTest(const testsupport::TestService::Customise& customise = {}) : ServiceTest(customise)
    {
        mService->SetAnswerStyle(GetParam());
        mClient.reset(
            new tarnvault::Tarnvault(testsupport::Parameters(mService->AssetServiceUrl(), kAliceToken, "desk app")));
    }

    File FileNamed(const std::string& name) const
    {
        return File(tolmocore::utility::UTF8to16(UTF8String((mFiles.Path() / name).string())));
    }
    File Source(const std::string& bytes) const
    {
        testsupport::WriteFileBytes(mFiles.Path() / "source", bytes);
        return FileNamed("source");
    }
    boost::shared_ptr<Collection> Root()
    {
        Call root;
        mClient->GetRootAsync(Done(root), Failed(root), Guid::CreateUnique());
        return boost::dynamic_pointer_cast<Collection>(First(root).mAsset);
    }

    testsupport::TempDir mFiles;
    boost::shared_ptr<tarnvault::Tarnvault> mClient;
};

TEST_P(ClientAgreementTest, RootCollectionUploadDownloadAndDelete)
{
    const auto root = Root();
    ASSERT_TRUE(root && root->is_root());
    EXPECT_EQ(ClientRoot(*mAlice, "desk app"), root->mId.ToStdString());

    Call created;
    mClient->CreateCollectionAsync(Done(created), Failed(created), root, u"Group ?%+ \u00e9",
                                   kCollectionType_Collection, Guid::CreateUnique());
    auto group = boost::dynamic_pointer_cast<Collection>(First(created).mAsset);
    ASSERT_TRUE(group);
    EXPECT_EQ(u"Group ?%+ \u00e9", group->mName);

    const ImmutableString textType = ImmutableString::CreateStatic("text/plain");
    for (const std::string& bytes : {std::string("first"), std::string("second, longer")}) {
        Call upload;  // the second replaces the first: search, delete, post, metadata
        mClient->UploadAsync(Done(upload), Failed(upload), group, Source(bytes), textType, u"a b?.txt",
                             Guid::CreateUnique());
        ASSERT_TRUE(First(upload).mSuccess);
    }
    Call children;
    mClient->FetchChildrenAsync(Done(children), Failed(children), group, Guid::CreateUnique());
    ASSERT_TRUE(First(children).mSuccess);
    ASSERT_EQ(1u, group->mChildren.size());
    auto item = boost::dynamic_pointer_cast<Item>(group->mChildren[0]);
    ASSERT_TRUE(item);
    EXPECT_EQ(u"a b?.txt", item->mName);
    EXPECT_EQ(14, item->mSize);

    Call download;
    mClient->DownloadAsync(Done(download), Failed(download), item, FileNamed("copy"), UTF8String(),
                           Guid::CreateUnique());
    const DownloadResult downloaded = First(download).mDownload;
    EXPECT_TRUE(downloaded.mDownloaded);
    EXPECT_EQ(14u, downloaded.mContentSize);
    EXPECT_EQ("text/plain", downloaded.mContentType.ToStdString());
    EXPECT_EQ("second, longer", testsupport::ReadFileBytes(mFiles.Path() / "copy"));

    Call unchanged;
    mClient->DownloadAsync(Done(unchanged), Failed(unchanged), item, FileNamed("unchanged"), downloaded.mEtag,
                           Guid::CreateUnique());
    const Outcome notModified = First(unchanged);
    EXPECT_TRUE(notModified.mSuccess);
    EXPECT_FALSE(notModified.mDownload.mDownloaded);
    EXPECT_FALSE(std::filesystem::exists(mFiles.Path() / "unchanged"));

    Call removed;
    mClient->DeleteAsync(Done(removed), Failed(removed), boost::shared_ptr<AssetBase>(group), true,
                         Guid::CreateUnique());
    ASSERT_TRUE(First(removed).mSuccess);
    Call header;
    mClient->HeaderAsync(Done(header), Failed(header), group->mId, true, Guid::CreateUnique());
    EXPECT_EQ(404, First(header).mStatus);

    Call userRoot;  // the one root a search by the root type finds
    mClient->GetUserFileRootAsync(Done(userRoot), Failed(userRoot), Guid::CreateUnique());
    const auto found = First(userRoot).mAsset;
    ASSERT_TRUE(found && found->is_root());
    EXPECT_EQ(u"root", found->mName);
}

// The style is really on the wire, and the client's reader takes it.
TEST_P(ClientAgreementTest, TheStyleShowsOnTheWire)
{
    const AnswerStyle style = GetParam();
    const std::string body = std::string("{\"header\":{\"name\":\"x\",\"type\":\"") + kCollectionType + "\"}}";
    const std::string location = mAlice->Send("POST", "/collections", body, kJson).Header("Location");
    const std::string folder = IdFromLocation(location);
    const std::string base = style.mAbsoluteLocation ? "http://127.0.0.1:" + std::to_string(mService->Port()) : "";
    EXPECT_EQ(base + "/api/collections/" + folder, location);

    const std::string header = mAlice->Send("GET", "/collections/" + folder + "/header").mBody;
    const char* const idPrefixes[] = {"\"id\":\"", "\"id\":\"/collections/", "\"id\":\"/api/collections/"};
    if (style.mIdForm == server::IdForm_UrlOnly) {
        EXPECT_EQ(std::string::npos, header.find("\"id\"")) << header;
    } else {
        EXPECT_NE(std::string::npos, header.find(idPrefixes[style.mIdForm] + folder + "\"")) << header;
    }

    const std::string item = Upload(*mAlice, folder, "item.bin", "12345", "application/x-thing");
    const char* const etagSpellings[] = {"ETag", "etag", "ETAG"};
    const std::string head = mAlice->Send("GET", "/assets/" + item).mHead;
    EXPECT_NE(std::string::npos, head.find(std::string("\n") + etagSpellings[style.mHeaderCase] + ":")) << head;

    const Reply members = mAlice->Send("GET", "/collections/" + folder + "/members");
    EXPECT_NE(std::string::npos, members.mBody.find(style.mSizeAsString ? "\"size\":\"5\"" : "\"size\":5"));
    const std::size_t start = members.mBody.find("\"created\":\"") + 11;
    const std::string created = members.mBody.substr(start, members.mBody.find('"', start) - start);
    EXPECT_EQ(style.mFractionalSeconds, created.find('.') != std::string::npos) << created;
    EXPECT_EQ("+00:00", created.substr(created.size() - 6));

    EXPECT_EQ((std::vector<std::string>{item}), Ids(members));
    const auto read = boost::dynamic_pointer_cast<Item>(Assets(members).at(0));
    ASSERT_TRUE(read);
    EXPECT_EQ(5, read->mSize);
    EXPECT_EQ("application/x-thing", read->mContentType.ToStdString());
    const auto now = boost::posix_time::second_clock::universal_time();
    EXPECT_LE(read->mCreated, now);
    EXPECT_GT(read->mCreated, now - boost::posix_time::hours(1));
}

// Between them, every value of every choice.
INSTANTIATE_TEST_SUITE_P(
    Styles, ClientAgreementTest,
    ::testing::Values(AnswerStyle{server::IdForm_Plain, false, server::HeaderCase_Usual, false, true},
                      AnswerStyle{server::IdForm_Path, true, server::HeaderCase_Lower, true, false},
                      AnswerStyle{server::IdForm_ApiPath, false, server::HeaderCase_Upper, false, false},
                      AnswerStyle{server::IdForm_UrlOnly, true, server::HeaderCase_Usual, true, true}));

// A service that takes uploads of 1 MiB at most.
class UploadLimitTest : public ClientAgreementTest {
protected:
    UploadLimitTest() : ClientAgreementTest([](auto& options) { options.mMaxUploadBytes = 1 << 20; }) {}
};

TEST_P(UploadLimitTest, AnUploadOverTheLimitReachesTheLibraryAsThe413)
{
    const auto root = Root();
    ASSERT_TRUE(root);
    const ImmutableString type = ImmutableString::CreateStatic("application/octet-stream");

    // Not a connection reset (-100): the service reads 1 MiB of it, answers and closes gracefully.
    Call tooLarge;
    mClient->UploadAsync(Done(tooLarge), Failed(tooLarge), root, Source(std::string(2 << 20, 'x')), type, u"big.bin",
                         Guid::CreateUnique());
    EXPECT_EQ(413, First(tooLarge).mStatus);
    EXPECT_EQ(0u, mService->Content().TemporaryCount());

    Call fits;
    mClient->UploadAsync(Done(fits), Failed(fits), root, Source(std::string(1 << 20, 'y')), type, u"fits.bin",
                         Guid::CreateUnique());
    const auto fitted = boost::dynamic_pointer_cast<Item>(First(fits).mAsset);
    ASSERT_TRUE(fitted);
    EXPECT_EQ(1 << 20, fitted->mSize);
}

INSTANTIATE_TEST_SUITE_P(OneStyle, UploadLimitTest, ::testing::Values(AnswerStyle()));

class StreamedUploadTest : public ClientAgreementTest {
protected:
    Outcome UploadFile(const boost::shared_ptr<Collection>& into, const File& file)
    {
        Call upload;
        mClient->UploadAsync(Done(upload), Failed(upload), into, file,
                             ImmutableString::CreateStatic("application/octet-stream"), u"up.bin",
                             Guid::CreateUnique());
        return First(upload);
    }
    std::string Downloaded(const boost::shared_ptr<AssetBase>& asset)
    {
        Call download;
        mClient->DownloadAsync(Done(download), Failed(download), boost::dynamic_pointer_cast<Item>(asset),
                               FileNamed("copy"), UTF8String(), Guid::CreateUnique());
        EXPECT_TRUE(First(download).mDownload.mDownloaded);
        return testsupport::ReadFileBytes(mFiles.Path() / "copy");
    }
};

// Uploads stream from their file. The service keeps the file byte for byte,
// also when libcurl has to send it again, and nothing of a file that changed
// after the upload took its length.
TEST_P(StreamedUploadTest, TheServiceKeepsTheFileAsItWasOrNothing)
{
    const auto root = Root();
    ASSERT_TRUE(root);
    std::string large((3 << 20) + 5, '\0');  // far past libcurl's buffer
    std::mt19937 random(11);
    for (char& byte : large) byte = static_cast<char>(random());
    // The third upload's kept-alive connection is dropped before any answer:
    // libcurl sends it again on a new one, from the file's first byte.
    server::FaultRule drop;
    drop.mMethod = "POST";
    drop.mPathPattern = "/api/assets";
    drop.mNth = 3;
    drop.mAction = server::FaultAction_CloseBeforeAnswer;
    const auto dropped = mService->Faults().Install(drop);
    for (const std::string& bytes : {std::string(), large, std::string("sent twice")}) {
        const Outcome uploaded = UploadFile(root, Source(bytes));
        ASSERT_TRUE(uploaded.mSuccess) << bytes.size() << " bytes: " << uploaded.mText;
        EXPECT_TRUE(Downloaded(uploaded.mAsset) == bytes) << bytes.size() << " bytes";
    }
    EXPECT_EQ(dropped->Seen(), 4);

    // The file changes as its post is handed to the processor: it grows, or
    // is rewritten with its length kept.
    const std::filesystem::path path = mFiles.Path() / "source";
    const std::function<void()> changes[] = {
        [&] { std::ofstream(path, std::ios::app) << 'x'; },
        [&] {
            std::filesystem::last_write_time(path, std::filesystem::last_write_time(path) + std::chrono::seconds(5));
        },
    };
    const auto real = tolmonet::http::GetGlobalRequestProcessor();
    for (const auto& change : changes) {
        const File file = Source(large);
        tolmonet::http::SetGlobalRequestProcessor(boost::make_shared<testsupport::RefusingProcessor>(
            real, [&](const std::string& method, const std::string& url) {
                if (method == "POST" && url.find("/assets?") != std::string::npos) change();
                return false;
            }));
        mClient.reset(
            new tarnvault::Tarnvault(testsupport::Parameters(mService->AssetServiceUrl(), kAliceToken, "desk app")));
        tolmonet::http::SetGlobalRequestProcessor(real);
        const Outcome changed = UploadFile(root, file);
        EXPECT_FALSE(changed.mSuccess);
        EXPECT_EQ(changed.mStatus, -100);
        EXPECT_EQ(changed.mText, "Upload: the file changed while it was being sent");
        // The namesake went first, and nothing came in its place.
        EXPECT_TRUE(Ids(mAlice->Send("GET", "/collections/" + root->mId.ToStdString() + "/members")).empty());
    }
}

INSTANTIATE_TEST_SUITE_P(OneStyle, StreamedUploadTest, ::testing::Values(AnswerStyle()));

}  // namespace
}  // namespace servertest
