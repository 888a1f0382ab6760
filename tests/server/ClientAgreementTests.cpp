// The library's own REST client against the service, in every answer
// style: the two sides were written apart from the same contract, so this
// is where a disagreement shows.

#include <chrono>
#include <condition_variable>
#include <filesystem>
#include <memory>
#include <mutex>

#include <boost/pointer_cast.hpp>
#include <boost/shared_ptr.hpp>

#include "ServiceFixture.h"
#include "foundation/core/File.h"
#include "foundation/core/ImmutableString.h"
#include "foundation/net/HeaderConstants.h"
#include "tarnvault/Tarnvault.h"

namespace servertest {
namespace {

using namespace tolmonetsync;
using tolmonetsync::server::AnswerStyle;

// What one operation's callbacks received; Succeeded gives up after 60 s.
// The callbacks share the state, so one that comes late finds it alive.
class Call {
public:
    ErrorCallback Error()
    {
        auto state = mState;
        return [state](const Guid&, const boost::shared_ptr<tolmonet::Response>& response) {
            state->Finish(false, [&](State& s) { s.mStatus = response ? response->status : 0; });
        };
    }
    SuccessCallback Done()
    {
        auto state = mState;
        return [state](const Guid&) { state->Finish(true, [](State&) {}); };
    }
    CollectionCallback CollectionDone()
    {
        auto state = mState;
        return [state](const Guid&, const boost::shared_ptr<Collection>& c) {
            state->Finish(true, [&](State& s) { s.mAsset = c; });
        };
    }
    AssetCallback AssetDone()
    {
        auto state = mState;
        return [state](const Guid&, const boost::shared_ptr<AssetBase>& a) {
            state->Finish(true, [&](State& s) { s.mAsset = a; });
        };
    }
    ItemCallback ItemDone()
    {
        auto state = mState;
        return [state](const Guid&, const boost::shared_ptr<Item>& i) {
            state->Finish(true, [&](State& s) { s.mAsset = i; });
        };
    }
    DownloadCallback Downloaded()
    {
        auto state = mState;
        return
            [state](const Guid&, const DownloadResult& r) { state->Finish(true, [&](State& s) { s.mDownload = r; }); };
    }
    // True once a callback came and it was the success callback.
    bool Succeeded()
    {
        std::unique_lock<std::mutex> lock(mState->mMutex);
        mState->mChanged.wait_for(lock, std::chrono::seconds(60), [&] { return mState->mDone; });
        return mState->mDone && mState->mSuccess;
    }
    int Status() const
    {
        std::lock_guard<std::mutex> lock(mState->mMutex);
        return mState->mStatus;
    }
    boost::shared_ptr<AssetBase> Asset() const
    {
        std::lock_guard<std::mutex> lock(mState->mMutex);
        return mState->mAsset;
    }
    DownloadResult Download() const
    {
        std::lock_guard<std::mutex> lock(mState->mMutex);
        return mState->mDownload;
    }

private:
    struct State {
        template <typename F>
        void Finish(bool success, F fill)
        {
            std::lock_guard<std::mutex> lock(mMutex);
            fill(*this);
            mSuccess = success;
            mDone = true;
            mChanged.notify_all();
        }

        std::mutex mMutex;
        std::condition_variable mChanged;
        bool mDone = false;
        bool mSuccess = false;
        int mStatus = 0;
        boost::shared_ptr<AssetBase> mAsset;
        DownloadResult mDownload;
    };

    std::shared_ptr<State> mState = std::make_shared<State>();
};

class ClientAgreementTest : public ServiceTest, public ::testing::WithParamInterface<AnswerStyle> {
protected:
    void SetUp() override
    {
        ServiceTest::SetUp();
        mService->SetAnswerStyle(GetParam());
        ParameterList parameters;
        parameters.push_back(std::make_pair(tolmonet::kHEADER_LOCATION, UTF8String(mService->AssetServiceUrl())));
        parameters.push_back(std::make_pair(tolmonet::kHEADER_COOKIE, UTF8String(kAliceToken)));
        parameters.push_back(std::make_pair(tolmonet::kHEADER_USER_AGENT, UTF8String("desk app")));
        mClient.reset(new tarnvault::Tarnvault(parameters));
    }

    File FileNamed(const std::string& name) const
    {
        return File(tolmocore::utility::UTF8to16(UTF8String((mData.Path() / name).string())));
    }
    File Source(const std::string& bytes) const
    {
        testsupport::WriteFileBytes(mData.Path() / "source", bytes);
        return FileNamed("source");
    }

    boost::shared_ptr<tarnvault::Tarnvault> mClient;
};

TEST_P(ClientAgreementTest, RootCollectionUploadDownloadAndDelete)
{
    Call root;
    ASSERT_FALSE(mClient->GetRootAsync(root.CollectionDone(), root.Error(), Guid::CreateUnique()).IsNil());
    ASSERT_TRUE(root.Succeeded()) << root.Status();
    auto rootCollection = boost::dynamic_pointer_cast<Collection>(root.Asset());
    ASSERT_TRUE(rootCollection && rootCollection->is_root());
    EXPECT_EQ(ClientRoot(*mAlice, "desk app"), rootCollection->mId.ToStdString());

    Call created;
    mClient->CreateCollectionAsync(created.CollectionDone(), created.Error(), rootCollection, u"Group ?%+ \u00e9",
                                   kCollectionType_Collection, Guid::CreateUnique());
    ASSERT_TRUE(created.Succeeded()) << created.Status();
    auto group = boost::dynamic_pointer_cast<Collection>(created.Asset());
    ASSERT_TRUE(group);
    EXPECT_EQ(u"Group ?%+ \u00e9", group->mName);

    const ImmutableString textType = ImmutableString::CreateStatic("text/plain");
    for (const std::string& bytes : {std::string("first"), std::string("second, longer")}) {
        Call upload;  // the second replaces the first: search, delete, post, metadata
        mClient->UploadAsync(upload.ItemDone(), upload.Error(), group, Source(bytes), textType, u"a b?.txt",
                             Guid::CreateUnique());
        ASSERT_TRUE(upload.Succeeded()) << upload.Status();
    }
    Call children;
    mClient->FetchChildrenAsync(children.Done(), children.Error(), group, Guid::CreateUnique());
    ASSERT_TRUE(children.Succeeded()) << children.Status();
    ASSERT_EQ(1u, group->mChildren.size());
    auto item = boost::dynamic_pointer_cast<Item>(group->mChildren[0]);
    ASSERT_TRUE(item);
    EXPECT_EQ(u"a b?.txt", item->mName);
    EXPECT_EQ(14, item->mSize);

    Call download;
    mClient->DownloadAsync(download.Downloaded(), download.Error(), item, FileNamed("copy"), UTF8String(),
                           Guid::CreateUnique());
    ASSERT_TRUE(download.Succeeded()) << download.Status();
    EXPECT_TRUE(download.Download().mDownloaded);
    EXPECT_EQ(14u, download.Download().mContentSize);
    EXPECT_EQ("text/plain", download.Download().mContentType.ToStdString());
    EXPECT_EQ("second, longer", testsupport::ReadFileBytes(mData.Path() / "copy"));

    Call unchanged;
    mClient->DownloadAsync(unchanged.Downloaded(), unchanged.Error(), item, FileNamed("unchanged"),
                           download.Download().mEtag, Guid::CreateUnique());
    ASSERT_TRUE(unchanged.Succeeded()) << unchanged.Status();
    EXPECT_FALSE(unchanged.Download().mDownloaded);
    EXPECT_FALSE(std::filesystem::exists(mData.Path() / "unchanged"));

    Call removed;
    mClient->DeleteAsync(removed.Done(), removed.Error(), boost::shared_ptr<AssetBase>(group), true,
                         Guid::CreateUnique());
    ASSERT_TRUE(removed.Succeeded()) << removed.Status();
    Call header;
    mClient->HeaderAsync(header.AssetDone(), header.Error(), group->mId, true, Guid::CreateUnique());
    EXPECT_FALSE(header.Succeeded());
    EXPECT_EQ(404, header.Status());
}

TEST_P(ClientAgreementTest, UserRootIsTheOneRootASearchFinds)
{
    ClientRoot(*mAlice, "desk app");
    Call root;
    mClient->GetUserFileRootAsync(root.CollectionDone(), root.Error(), Guid::CreateUnique());
    ASSERT_TRUE(root.Succeeded()) << root.Status();
    ASSERT_TRUE(root.Asset() && root.Asset()->is_root());
    EXPECT_EQ(u"root", root.Asset()->mName);
}

AnswerStyle Style(server::IdForm form, bool absolute, server::HeaderCase headerCase, bool sizeAsString, bool fractions)
{
    AnswerStyle style;
    style.mIdForm = form;
    style.mAbsoluteLocation = absolute;
    style.mHeaderCase = headerCase;
    style.mSizeAsString = sizeAsString;
    style.mFractionalSeconds = fractions;
    return style;
}

INSTANTIATE_TEST_SUITE_P(Styles, ClientAgreementTest,
                         ::testing::Values(Style(server::IdForm_Plain, false, server::HeaderCase_Usual, false, true),
                                           Style(server::IdForm_Path, true, server::HeaderCase_Lower, true, false),
                                           Style(server::IdForm_ApiPath, false, server::HeaderCase_Upper, false, false),
                                           Style(server::IdForm_UrlOnly, true, server::HeaderCase_Usual, true, true)));

// A service that takes uploads of 1 MiB at most.
class UploadLimitTest : public ClientAgreementTest {
protected:
    tolmonetsync::server::LocalServiceOptions Options() const override
    {
        tolmonetsync::server::LocalServiceOptions options = ClientAgreementTest::Options();
        options.mMaxUploadBytes = 1 << 20;
        return options;
    }
};

TEST_P(UploadLimitTest, AnUploadOverTheLimitReachesTheLibraryAsThe413)
{
    Call root;
    ASSERT_FALSE(mClient->GetRootAsync(root.CollectionDone(), root.Error(), Guid::CreateUnique()).IsNil());
    ASSERT_TRUE(root.Succeeded()) << root.Status();
    auto rootCollection = boost::dynamic_pointer_cast<Collection>(root.Asset());
    ASSERT_TRUE(rootCollection);
    const ImmutableString type = ImmutableString::CreateStatic("application/octet-stream");

    // Not a connection reset (-100): the service reads 1 MiB of it, answers and closes gracefully.
    Call tooLarge;
    mClient->UploadAsync(tooLarge.ItemDone(), tooLarge.Error(), rootCollection, Source(std::string(2 << 20, 'x')), type,
                         u"big.bin", Guid::CreateUnique());
    EXPECT_FALSE(tooLarge.Succeeded());
    EXPECT_EQ(413, tooLarge.Status());
    EXPECT_EQ(0u, mService->Content().TemporaryCount());

    Call fits;
    mClient->UploadAsync(fits.ItemDone(), fits.Error(), rootCollection, Source(std::string(1 << 20, 'y')), type,
                         u"fits.bin", Guid::CreateUnique());
    ASSERT_TRUE(fits.Succeeded()) << fits.Status();
    EXPECT_EQ(1 << 20, boost::dynamic_pointer_cast<Item>(fits.Asset())->mSize);
}

INSTANTIATE_TEST_SUITE_P(OneStyle, UploadLimitTest, ::testing::Values(AnswerStyle()));

}  // namespace
}  // namespace servertest
