// Failures in the prepare chain and in the pass: one error for the host,
// the cache file as it was, no local file lost, and a clean sync after.

#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "InMemoryScenarioServer.h"
#include "SyncHarness.h"
#include "SyncTestSupport.h"
#include "support/FileOpsRecorder.h"

using namespace synctest;
using namespace testsupport;
namespace fs = std::filesystem;

namespace {

class FailuresTest : public ::testing::Test {
protected:
    void SetUp() override { fs::create_directories(mDesk.Path() / "Presets"); }

    std::unique_ptr<SyncHarness> NewHost()
    {
        std::unique_ptr<SyncHarness> host(new SyncHarness(mServer.Client()));
        host->Service().RegisterSyncDirectory(SyncDir(DirAt(mDesk.Path() / "Presets"), u".xmp", u"Presets",
                                                      ImmutableString::CreateStatic("text/xml"), SyncMetadata_ModDate,
                                                      1 << 20));
        return host;
    }
    fs::path Preset(const std::string& name) { return mDesk.Path() / "Presets" / name; }
    std::string CacheFile()
    {
        const fs::path path = mPrefs.Path() / "tolmonetsynccache.json";
        return fs::exists(path) ? ReadFileBytes(path) : std::string("<none>");
    }
    InMemoryFaultTable::FaultId Fail(InMemoryOperation operation, unsigned nth, int status, const std::string& body)
    {
        InMemoryFault fault;
        fault.mOperation = operation;
        fault.mNth = nth;
        fault.mStatus = status;
        fault.mBody = body;
        return mServer.Server().Faults().Add(fault);
    }
    InMemoryFaultTable::FaultId Refuse(InMemoryOperation operation, unsigned nth = 1)
    {
        InMemoryFault fault;
        fault.mOperation = operation;
        fault.mNth = nth;
        fault.mRefuse = true;
        return mServer.Server().Faults().Add(fault);
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
    InMemoryScenarioServer mServer;
};

}  // namespace

TEST_F(FailuresTest, FailedRequestInThePassReportsOnceAndKeepsTheCacheFile)
{
    StageChanges();
    const std::string before = CacheFile();
    const auto fault = Fail(InMemoryOperation_Upload, 1, 500, "storage is full");
    const RunResult failed = NewHost()->Sync(SyncMode_TwoWay);
    EXPECT_EQ(mServer.Server().Faults().Hits(fault), 1u);
    EXPECT_FALSE(failed.mFinished);
    EXPECT_EQ(failed.mErrorCount, 1);
    EXPECT_EQ(failed.mError, "storage is full");
    EXPECT_EQ(CacheFile(), before);
    // The download of the same pass still landed, with its backup.
    EXPECT_EQ(ReadFileBytes(Preset("B.xmp")), "b2");

    const RunResult again = NewHost()->Sync(SyncMode_TwoWay);
    ASSERT_TRUE(again.Ok()) << again.mError;
    EXPECT_EQ(mServer.Items("Presets"), (std::map<std::string, std::string>{{"A.xmp", "a2"}, {"B.xmp", "b2"}, {"C.xmp", "c1"}}));
}

TEST_F(FailuresTest, FailedDownloadLeavesTheLocalFileWhole)
{
    StageChanges();
    Fail(InMemoryOperation_Download, 0, 404, "gone");
    const RunResult failed = NewHost()->Sync(SyncMode_TwoWay);
    EXPECT_EQ(failed.mError, "gone");
    EXPECT_EQ(ReadFileBytes(Preset("B.xmp")), "b1");
    EXPECT_EQ(ReadFileBytes(Preset("C.xmp")), "c1");
}

TEST_F(FailuresTest, RequestThatCannotBeQueuedInThePassErrsAtOnceAndThePassMayStillSave)
{
    StageChanges();
    Refuse(InMemoryOperation_Upload);
    const RunResult result = NewHost()->Sync(SyncMode_TwoWay);
    EXPECT_EQ(result.mError, "QueueUpload error");
    // No request failed, so the batch ends through its destructor on the
    // success path: the cache file is written after the error.
    EXPECT_TRUE(result.mFinished);
    EXPECT_NE(CacheFile().find("A.xmp"), std::string::npos);
}

TEST_F(FailuresTest, ChainFailuresReachTheHostWithTheirTexts)
{
    // Before anything cached the client root, its request is the chain's first.
    Refuse(InMemoryOperation_GetPreferencesRoot);
    const RunResult refused = NewHost()->Prepare();
    EXPECT_FALSE(refused.mStarted);
    EXPECT_EQ(refused.mErrorCount, 0);
    mServer.Server().Faults().Clear();

    mServer.PutItem("Stale", "x.xmp", "x");
    WriteFileBytes(Preset("A.xmp"), "a");
    Refuse(InMemoryOperation_DeleteByName);
    EXPECT_EQ(NewHost()->Prepare().mError, "QueueDelete error");
    mServer.Server().Faults().Clear();

    Fail(InMemoryOperation_FetchChildren, 1, 403, "not yours");
    EXPECT_EQ(NewHost()->Prepare().mError, "not yours");
}

TEST_F(FailuresTest, FailingEachRequestInTurnNeverLosesAFile)
{
    StageChanges();
    const std::string before = CacheFile();
    for (unsigned n = 1; n < 200; ++n) {
        mServer.Server().Faults().Clear();
        const auto fault = Fail(InMemoryOperation_Any, n, 500, "fault " + std::to_string(n));
        const RunResult result = NewHost()->Sync(SyncMode_TwoWay);
        // Every file holds its old bytes or its new ones.
        const std::string a = ReadFileBytes(Preset("A.xmp")), b = ReadFileBytes(Preset("B.xmp"));
        EXPECT_EQ(a, "a2");
        EXPECT_TRUE(b == "b1" || b == "b2") << b;
        EXPECT_EQ(ReadFileBytes(Preset("C.xmp")), "c1");
        if (mServer.Server().Faults().Hits(fault) == 0) {
            ASSERT_TRUE(result.Ok()) << result.mError;
            break;
        }
        EXPECT_EQ(result.mError, "fault " + std::to_string(n));
        EXPECT_EQ(CacheFile(), before) << "after failing request " << n;
    }
    EXPECT_EQ(mServer.Items("Presets"), (std::map<std::string, std::string>{{"A.xmp", "a2"}, {"B.xmp", "b2"}, {"C.xmp", "c1"}}));
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
    ASSERT_TRUE(result.Ok()) << result.mError;  // the in-memory server's requests cannot be cancelled
    EXPECT_EQ(result.mMoved, 200);
    EXPECT_EQ(host->Service().GetStatus(), SyncStatus_Syncing);
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
