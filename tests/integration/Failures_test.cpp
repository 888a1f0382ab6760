// Failures in the prepare chain and in the pass, over loopback: one error
// for the host, the cache file as it was, no local file lost, and a clean
// sync after. The service fails requests through its fault hooks; a request
// that cannot be sent at all is refused by a processor in front of the real one.

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <thread>

#include "LocalScenarioServer.h"
#include "SyncHarness.h"
#include "SyncTestSupport.h"
#include "foundation/net/ForwardingProcessor.h"
#include "support/FileOpsRecorder.h"

using namespace synctest;
using namespace testsupport;
using tolmonetsync::server::FaultRule;
namespace fs = std::filesystem;

namespace {

using RefusalRule = std::function<bool(const std::string& method, const std::string& url)>;

// Refuses, as a processor that cannot send, every request the rule names.
class RefusingProcessor : public tolmonet::http::ForwardingProcessor {
public:
    RefusingProcessor(const boost::shared_ptr<RequestProcessor>& target, const RefusalRule& refuse)
        : ForwardingProcessor(target), mRefuse(refuse)
    {
    }
    bool GET(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override
    {
        return Pass("GET", url) && ForwardingProcessor::GET(id, handler, url, headers, configuration);
    }
    bool PUT(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const Body& body, const tolmonet::HeaderList& headers,
             const tolmonet::Configuration& configuration) override
    {
        return Pass("PUT", url) && ForwardingProcessor::PUT(id, handler, url, body, headers, configuration);
    }
    bool POST(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
              const Body& body, const tolmonet::HeaderList& headers,
              const tolmonet::Configuration& configuration) override
    {
        return Pass("POST", url) && ForwardingProcessor::POST(id, handler, url, body, headers, configuration);
    }
    bool DEL(const Guid& id, const tolmonet::http::ResponseHandler& handler, const ImmutableString& url,
             const tolmonet::HeaderList& headers, const tolmonet::Configuration& configuration) override
    {
        return Pass("DELETE", url) && ForwardingProcessor::DEL(id, handler, url, headers, configuration);
    }

    int Refused() const { return mRefused.load(); }

private:
    bool Pass(const char* method, const ImmutableString& url)
    {
        if (!mRefuse(method, url.c_str())) return true;
        ++mRefused;
        return false;
    }
    RefusalRule mRefuse;
    std::atomic<int> mRefused{0};
};

class FailuresTest : public ::testing::Test {
protected:
    void SetUp() override { fs::create_directories(mDesk.Path() / "Presets"); }

    std::unique_ptr<SyncHarness> NewHost(const boost::shared_ptr<SyncServer>& client)
    {
        std::unique_ptr<SyncHarness> host(new SyncHarness(client));
        host->Service().RegisterSyncDirectory(SyncDir(DirAt(mDesk.Path() / "Presets"), u".xmp", u"Presets",
                                                      ImmutableString::CreateStatic("text/xml"), SyncMetadata_ModDate,
                                                      1 << 20));
        return host;
    }
    std::unique_ptr<SyncHarness> NewHost() { return NewHost(mServer.Client()); }
    // A host whose client sends through a processor refusing what `refuse` names.
    std::unique_ptr<SyncHarness> RefusingHost(const RefusalRule& refuse)
    {
        const boost::shared_ptr<tolmonet::http::RequestProcessor> real = tolmonet::http::GetGlobalRequestProcessor();
        mRefusing.reset(new RefusingProcessor(real, refuse));
        tolmonet::http::SetGlobalRequestProcessor(mRefusing);
        std::unique_ptr<SyncHarness> host = NewHost(mServer.Client());
        tolmonet::http::SetGlobalRequestProcessor(real);
        return host;
    }
    fs::path Preset(const std::string& name) { return mDesk.Path() / "Presets" / name; }
    std::string CacheFile()
    {
        const fs::path path = mPrefs.Path() / "tolmonetsynccache.json";
        return fs::exists(path) ? ReadFileBytes(path) : std::string("<none>");
    }
    std::shared_ptr<const tolmonetsync::server::FaultHandle> Fail(const char* method, const char* path, int status,
                                                                  const std::string& body, int nth = 1)
    {
        FaultRule rule;
        rule.mNth = nth;
        rule.mMethod = method;
        rule.mPathPattern = path;
        rule.mStatus = status;
        rule.mBody = body;
        return mServer.Service().Faults().Install(rule);
    }
    // A first sync of three presets, then a change on each side.
    void StageChanges()
    {
        WriteFileBytes(Preset("A.xmp"), "a1");
        WriteFileBytes(Preset("B.xmp"), "b1");
        WriteFileBytes(Preset("C.xmp"), "c1");
        ASSERT_TRUE(NewHost()->Sync(SyncMode_TwoWay).Ok());
        WriteFileBytes(Preset("A.xmp"), "a2");
        fs::last_write_time(Preset("A.xmp"), fs::last_write_time(Preset("A.xmp")) + std::chrono::seconds(5));
        mServer.PutItem("Presets", "B.xmp", "b2");
    }

    PrefDirScope mPrefs;
    TempDir mDesk;
    LocalScenarioServer mServer;
    boost::shared_ptr<RefusingProcessor> mRefusing;
};

const char kUpload[] = "/api/assets";
const char kDownload[] = "/api/assets/[^/]+";

}  // namespace

TEST_F(FailuresTest, FailedUploadInThePassReportsOnceAndKeepsTheCacheFile)
{
    StageChanges();
    const std::string before = CacheFile();
    const auto fault = Fail("POST", kUpload, 500, "storage is full");
    const RunResult failed = NewHost()->Sync(SyncMode_TwoWay);
    EXPECT_TRUE(fault->Fired());
    EXPECT_FALSE(failed.mFinished);
    EXPECT_EQ(failed.mErrorCount, 1);
    EXPECT_EQ(failed.mError, "storage is full");
    EXPECT_EQ(CacheFile(), before);
    // The download of the same pass still landed, with its backup.
    EXPECT_EQ(ReadFileBytes(Preset("B.xmp")), "b2");

    mServer.Service().Faults().Clear();
    const RunResult again = NewHost()->Sync(SyncMode_TwoWay);
    ASSERT_TRUE(again.Ok()) << again.mError;
    EXPECT_EQ(mServer.Items("Presets"),
              (std::map<std::string, std::string>{{"A.xmp", "a2"}, {"B.xmp", "b2"}, {"C.xmp", "c1"}}));
}

TEST_F(FailuresTest, FailedDownloadLeavesTheLocalFileWhole)
{
    StageChanges();
    // The pass asks for B and C, in either order.
    const auto first = Fail("GET", kDownload, 404, "gone", 1);
    const auto second = Fail("GET", kDownload, 404, "gone", 2);
    const RunResult failed = NewHost()->Sync(SyncMode_TwoWay);
    EXPECT_TRUE(first->Fired() && second->Fired());
    EXPECT_EQ(failed.mError, "gone");
    EXPECT_EQ(ReadFileBytes(Preset("B.xmp")), "b1");
    EXPECT_EQ(ReadFileBytes(Preset("C.xmp")), "c1");
}

TEST_F(FailuresTest, UploadThatCannotBeSentErrsAtOnceAndThePassMayStillSave)
{
    WriteFileBytes(Preset("A.xmp"), "a1");
    ASSERT_TRUE(NewHost()->Sync(SyncMode_TwoWay).Ok());
    WriteFileBytes(Preset("A.xmp"), "a2");
    fs::last_write_time(Preset("A.xmp"), fs::last_write_time(Preset("A.xmp")) + std::chrono::seconds(5));
    // The upload is the pass's only request, so the batch has ended when the
    // pass returns: no wait decides the outcome.
    // An upload starts with a search for the item's name.
    const RunResult result =
        RefusingHost([](const std::string&, const std::string& url) {
            return url.find("/api/search") != std::string::npos && url.find("A.xmp") != std::string::npos;
        })->Sync(SyncMode_TwoWay);
    EXPECT_EQ(mRefusing->Refused(), 1);
    EXPECT_EQ(result.mError, "QueueUpload error");
    // No request failed, so the batch ends through its destructor on the
    // success path: the cache file is written after the error.
    EXPECT_TRUE(result.mFinished);
    EXPECT_NE(CacheFile().find("A.xmp"), std::string::npos);
    EXPECT_EQ(mServer.Items("Presets"), (std::map<std::string, std::string>{{"A.xmp", "a1"}}));
}

TEST_F(FailuresTest, ChainFailuresReachTheHostWithTheirTexts)
{
    // Before anything cached the client root, its request is the chain's first.
    const RunResult refused = RefusingHost([](const std::string&, const std::string&) { return true; })->Prepare();
    EXPECT_FALSE(refused.mStarted);
    EXPECT_EQ(refused.mErrorCount, 0);
    EXPECT_EQ(mRefusing->Refused(), 1);

    // A stale group whose deletion cannot be sent.
    mServer.PutItem("Stale", "x.xmp", "x");
    WriteFileBytes(Preset("A.xmp"), "a");
    EXPECT_EQ(
        RefusingHost([](const std::string&, const std::string& url) { return url.find("Stale") != std::string::npos; })
            ->Prepare()
            .mError,
        "QueueDelete error");
    EXPECT_EQ(mRefusing->Refused(), 1);
    EXPECT_EQ(mServer.Items("Stale").size(), 1u);

    const auto fault = Fail("POST", "/api/search", 403, "not yours");
    EXPECT_EQ(NewHost()->Prepare().mError, "not yours");
    EXPECT_TRUE(fault->Fired());
}

TEST_F(FailuresTest, ProgressAndCancelFromAnotherThreadDuringAPass)
{
    for (int i = 0; i < 200; ++i) WriteFileBytes(Preset("P" + std::to_string(i) + ".xmp"), std::to_string(i));
    std::unique_ptr<SyncHarness> host = NewHost();
    const RunResult prepared = host->Prepare();
    ASSERT_TRUE(prepared.Ok()) << prepared.mError;
    std::atomic<bool> stop{false};
    std::thread poller([&] {
        while (!stop) {
            const float done = host->Service().Progress();
            EXPECT_GE(done, 0.0f);
            EXPECT_LE(done, 1.0f);
            host->Service().GetStatus();
            host->Service().CancelAll();
        }
    });
    const RunResult result = host->Pass(prepared.mCache, SyncMode_TwoWay);
    stop = true;
    poller.join();
    // Either the cancel reached a request in flight, or every one had ended.
    if (result.mErrorCount > 0) {
        EXPECT_EQ(result.mError, "Request cancelled");
        EXPECT_FALSE(result.mFinished);
    } else {
        EXPECT_TRUE(result.Ok());
        EXPECT_EQ(result.mMoved, 200);
    }
    EXPECT_EQ(host->Service().GetStatus(), SyncStatus_Syncing);

    const RunResult again = NewHost()->Sync(SyncMode_TwoWay);
    ASSERT_TRUE(again.Ok()) << again.mError;
    EXPECT_EQ(mServer.Items("Presets").size(), 200u);
}

TEST_F(FailuresTest, DiskFaultsInTheSwapFailThePassAndKeepTheCacheFile)
{
    WriteFileBytes(Preset("A.xmp"), "a1");
    ASSERT_TRUE(NewHost()->Sync(SyncMode_TwoWay).Ok());
    const std::string before = CacheFile();
    mServer.PutItem("Presets", "A.xmp", "a2");
    const std::string target = Preset("A.xmp").string();
    {
        // The download cannot be made durable before the rename: the old file stays.
        FileOpsRecorder disk;
        disk.FailNext("fsync", target + ".temp", EIO);
        const RunResult failed = NewHost()->Sync(SyncMode_TwoWay);
        EXPECT_TRUE(disk.AllFailuresMet());
        EXPECT_FALSE(failed.mFinished);
        EXPECT_NE(failed.mError.find("A.xmp"), std::string::npos) << failed.mError;
        EXPECT_EQ(ReadFileBytes(Preset("A.xmp")), "a1");
        EXPECT_EQ(CacheFile(), before);
    }
    {
        // The rename cannot be made durable: the cache file must not record it.
        FileOpsRecorder disk;
        disk.FailNext("dirsync", (mDesk.Path() / "Presets").string(), EIO, "rename " + target + ".temp -> " + target);
        const RunResult failed = NewHost()->Sync(SyncMode_TwoWay);
        EXPECT_TRUE(disk.AllFailuresMet());
        EXPECT_FALSE(failed.mFinished);
        EXPECT_NE(failed.mError.find("Cannot sync the directory"), std::string::npos) << failed.mError;
        EXPECT_EQ(CacheFile(), before);
    }
}

TEST_F(FailuresTest, PreferenceDirectoryOthersCanWriteIsRefusedBeforeAnythingIsTouched)
{
    WriteFileBytes(Preset("A.xmp"), "a");
    fs::permissions(mPrefs.Path(), fs::perms::all);
    const std::string named = "Refusing the preference directory " + mPrefs.Path().string() + ": it is writable";
    const RunResult preview = NewHost()->Preview(SyncMode_TwoWay);
    EXPECT_EQ(preview.mError.find(named), 0u) << preview.mError;
    try {
        NewHost()->Prepare();
        ADD_FAILURE() << "PrepareSync accepted a directory others can write";
    } catch (const std::exception& e) {
        EXPECT_EQ(std::string(e.what()).find(named), 0u) << e.what();
    }
    EXPECT_TRUE(fs::is_empty(mPrefs.Path()));
    EXPECT_TRUE(mServer.Groups().empty());

    Dir::SetAllowSharedPrefDir(true);
    const RunResult allowed = NewHost()->Sync(SyncMode_TwoWay);
    Dir::SetAllowSharedPrefDir(false);
    ASSERT_TRUE(allowed.Ok()) << allowed.mError;
    EXPECT_EQ(mServer.Items("Presets"), (std::map<std::string, std::string>{{"A.xmp", "a"}}));
}

TEST_F(FailuresTest, ABackupDirectoryThatIsALinkIsRefusedThroughPrepareSync)
{
    TempDir elsewhere;
    fs::create_directory_symlink(elsewhere.Path(), mPrefs.Path() / "SyncBackup");
    try {
        NewHost()->Prepare();
        ADD_FAILURE() << "PrepareSync used a linked SyncBackup";
    } catch (const std::exception& e) {
        EXPECT_EQ(std::string(e.what()), "Refusing the backup directory " + (mPrefs.Path() / "SyncBackup").string() +
                                             ": it is a symbolic link");
    }
    EXPECT_TRUE(fs::is_empty(elsewhere.Path()));
}
