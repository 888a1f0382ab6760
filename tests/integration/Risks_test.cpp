// The library calls behind the risk report and the limits, against the local
// service; the command's tests go through every kind of risk.

#include <gtest/gtest.h>

#include "FolderSync.h"
#include "sync/CacheFingerprint.h"

namespace synctest {

namespace fs = std::filesystem;

class SyncRisks : public FolderSync {};

TEST_F(SyncRisks, APreviewNamesRisksAndCountsWhatADoomedGroupHolds)
{
    Write("a.txt", "a");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    PutItem("Stale", "x.txt", "x");
    PutItem("Stale", "y.txt", "y");
    Write("mine.txt", "only here");
    // A cache file another service's sync left here.
    CacheFingerprint elsewhere = FingerprintOf(*NewHost()->Service().GetApi());
    elsewhere.mService = "http://elsewhere/api";
    WriteCacheFingerprint(elsewhere);

    const RunResult preview = NewHost()->Preview(SyncMode_ServerWins);
    ASSERT_TRUE(preview.Ok()) << preview.mError;
    std::vector<std::string> risks;
    for (const SyncRisk& risk : preview.mPreview->Risks()) {
        std::string name = tolmocore::utility::ToNarrow(risk.mGroup);
        if (!risk.mName.empty()) name += "/" + tolmocore::utility::ToNarrow(risk.mName);
        risks.push_back(std::string(risk.KindName()) + " " + name + ": " + risk.mDetail);
    }
    EXPECT_EQ(
        risks,
        (std::vector<std::string>{
            "foreign-cache : the cache file was written for service http://elsewhere/api, not " +
                mService->AssetServiceUrl(),
            "group-delete Stale: deleted on the server with its 2 item(s)",
            "local-delete Presets/mine.txt: removed here because the server has no such item (backed up first)"}));
    EXPECT_EQ(preview.mPreview->Counts().mDeletions, 3u);
}

TEST_F(SyncRisks, APassBeyondALimitQueuesNothingAndTheFingerprintGoesWithTheCache)
{
    Write("a.txt", "a1");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    const fs::path fingerprint = mPrefs.Path() / "tolmonetsynccache.fingerprint";
    EXPECT_TRUE(fs::exists(fingerprint));
    Write("a.txt", "a2");
    Touch(Folder() / "a.txt");
    Write("extra.txt", "only here");
    const Files localBefore = Local();

    const struct {
        SyncMode mMode;
        std::size_t mMaxDelete, mMaxOverwrite;
        const char* mRefusal;
    } rows[] = {
        {SyncMode_ServerWins, 0, SyncLimits::kNone, "over the limit max-delete 0: this sync would delete 1"},
        {SyncMode_TwoWay, SyncLimits::kNone, 0, "over the limit max-overwrite 0: this sync would overwrite 1"},
    };
    for (const auto& row : rows) {
        std::unique_ptr<SyncHarness> host = NewHost();
        host->Service().SetMaxDelete(row.mMaxDelete);
        host->Service().SetMaxOverwrite(row.mMaxOverwrite);
        const RunResult preview = host->Preview(row.mMode);
        ASSERT_TRUE(preview.Ok()) << preview.mError;
        EXPECT_EQ(preview.mPreview->ExceededLimit().rfind(row.mRefusal, 0), 0u) << preview.mPreview->ExceededLimit();
        const RunResult prepared = host->Prepare();
        ASSERT_TRUE(prepared.Ok()) << prepared.mError;
        const RunResult pass = host->Pass(prepared.mCache, row.mMode);
        EXPECT_EQ(pass.mErrorCount, 1);
        EXPECT_EQ(pass.mError.rfind(row.mRefusal, 0), 0u) << pass.mError;
        EXPECT_EQ(Local(), localBefore) << row.mMode;
        EXPECT_EQ(Items("Presets"), (Files{{"a.txt", "a1"}})) << row.mMode;
    }

    NewHost()->Service().DeleteCaches();
    EXPECT_FALSE(fs::exists(fingerprint));
}

}  // namespace synctest
