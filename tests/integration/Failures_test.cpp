// Failures in the prepare chain and in the pass that the service never sees:
// requests that cannot be sent (refused by a processor in front of the real
// one), a cancel from another thread, and directories the engine refuses.

#include <atomic>
#include <functional>
#include <memory>
#include <thread>
#include <vector>

#include <boost/make_shared.hpp>

#include "FolderSync.h"
#include "support/RefusingProcessor.h"

namespace synctest {

namespace {

namespace fs = std::filesystem;
using testsupport::RefusalRule;
using testsupport::RefusingProcessor;

class Failures : public FolderSync {
protected:
    // A host whose client sends through a processor refusing what `refuse` names.
    std::unique_ptr<SyncHarness> RefusingHost(const RefusalRule& refuse)
    {
        const auto real = tolmonet::http::GetGlobalRequestProcessor();
        tolmonet::http::SetGlobalRequestProcessor(boost::make_shared<RefusingProcessor>(real, refuse));
        std::unique_ptr<SyncHarness> host = NewHost();
        tolmonet::http::SetGlobalRequestProcessor(real);
        return host;
    }
};

// Refuses the nth request (from 1) of a client whose method is `method` and
// whose URL holds `part`.
RefusalRule RefuseNth(const std::string& method, const std::string& part, int nth = 1)
{
    auto seen = std::make_shared<std::atomic<int>>(0);
    return [=](const std::string& sent, const std::string& url) {
        return sent == method && url.find(part) != std::string::npos && ++*seen == nth;
    };
}

// A search listing a collection's members has no name in its query.
const char kListing[] = "/search?q=%7b%22trashed";

TEST_F(Failures, EveryStepThatCannotBeSentReachesTheHostWithItsText)
{
    // The very first request refused: no run starts and no callback comes.
    const RunResult refused = RefusingHost([](const std::string&, const std::string&) { return true; })->Prepare();
    EXPECT_FALSE(refused.mStarted);
    EXPECT_EQ(refused.mErrorCount, 0);

    struct Row {
        const char* mText;
        std::function<void()> mStage;
        RefusalRule mRefuse;
        SyncMode mMode;
        bool mSuccessFollows;  // the batch still ends, and the run goes on
    };
    const std::vector<Row> rows = {
        {"QueueAdd error", [&] { MakeGroup("Presets"); }, RefuseNth("POST", "/api/collections"), SyncMode_TwoWay, true},
        {"FetchChildren failed", [] {}, RefuseNth("POST", kListing, 1), SyncMode_TwoWay, false},
        {"QueueFetchChildren error", [] {}, RefuseNth("POST", kListing, 2), SyncMode_TwoWay, true},
        {"QueueDelete error", [&] { PutItem("Stale", "x.txt", "x"); }, RefuseNth("POST", "Stale"), SyncMode_TwoWay,
         true},
        {"QueueDownload error", [&] { PutItem("Presets", "A.txt", "a2"); }, RefuseNth("GET", "/api/assets/"),
         SyncMode_TwoWay, true},
        {"QueueUpload error",
         [&] {
             Write("A.txt", "a3");
             Touch(Folder() / "A.txt");
         },
         RefuseNth("POST", "A.txt"), SyncMode_TwoWay, true},
        {"QueueDeleteItem error", [&] { fs::remove(Folder() / "A.txt"); }, RefuseNth("DELETE", "/api/assets/"),
         SyncMode_LocalWins, true},
    };
    Write("A.txt", "a1");
    for (const Row& row : rows) {
        SCOPED_TRACE(row.mText);
        row.mStage();
        const Files before = Local();
        const RunResult failed = RefusingHost(row.mRefuse)->Sync(row.mMode);
        EXPECT_EQ(failed.mError, row.mText);
        EXPECT_EQ(failed.mFinished, row.mSuccessFollows);
        EXPECT_EQ(Local(), before);
        // Every row but the last needs the server to hold what is local.
        if (row.mMode == SyncMode_TwoWay) {
            ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
        }
    }
    EXPECT_EQ(Items("Stale"), Files());
    EXPECT_EQ(Items("Presets").size(), 1u);  // the refused deletion left it
}

TEST_F(Failures, ProgressAndCancelFromAnotherThreadDuringAPass)
{
    for (int i = 0; i < 200; ++i) Write("P" + std::to_string(i) + ".txt", std::to_string(i));
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
        EXPECT_EQ(result.mMoved, 200);
    }
    const RunResult again = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(again.Ok()) << again.mError;
    EXPECT_EQ(Items("Presets").size(), 200u);
}

TEST_F(Failures, APreferenceDirectoryOthersCanWriteIsRefusedBeforeAnythingIsTouched)
{
    Write("A.txt", "a");
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
    EXPECT_TRUE(Groups().empty());

    Dir::SetAllowSharedPrefDir(true);
    const RunResult allowed = Sync(SyncMode_TwoWay);
    Dir::SetAllowSharedPrefDir(false);
    ASSERT_TRUE(allowed.Ok()) << allowed.mError;
    EXPECT_EQ(Items("Presets"), (Files{{"A.txt", "a"}}));
}

TEST_F(Failures, ABackupDirectoryThatIsALinkIsRefused)
{
    testsupport::TempDir elsewhere;
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

}  // namespace

}  // namespace synctest
