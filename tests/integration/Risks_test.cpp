// The risks a preview names, the opt-in limits and the cache fingerprint,
// through the library calls against the local service.

#include <gtest/gtest.h>

#include <set>

#include "FolderSync.h"
#include "sync/CacheFingerprint.h"

namespace synctest {

namespace {

namespace fs = std::filesystem;
using Risks = std::set<std::string>;

// "KIND GROUP/NAME" for every risk of a preview in `mode`.
Risks RisksOf(SyncHarness& host, SyncMode mode)
{
    const RunResult preview = host.Preview(mode);
    EXPECT_TRUE(preview.Ok()) << preview.mError;
    Risks risks;
    if (!preview.mPreview) return risks;
    for (const SyncRisk& risk : preview.mPreview->Risks()) {
        std::string name = tolmocore::utility::ToNarrow(risk.mGroup);
        if (!risk.mName.empty()) name += "/" + tolmocore::utility::ToNarrow(risk.mName);
        risks.insert(std::string(risk.KindName()) + " " + name);
    }
    return risks;
}

}  // namespace

class SyncRisks : public FolderSync {};

TEST_F(SyncRisks, EachModeNamesItsRiskyDecisions)
{
    Write("changed.txt", "c1");
    Write("deleted.txt", "d1");
    Write("newer.txt", "n1");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    // Another computer: a newer version of two files, a file this one never
    // synced, and a group nobody here names.
    PutItem("Presets", "changed.txt", "c from elsewhere");
    PutItem("Presets", "newer.txt", "n from elsewhere");
    PutItem("Presets", "both.txt", "b from elsewhere");
    PutItem("Stale", "x.txt", "x");
    PutItem("Stale", "y.txt", "y");
    // And this one: a change, a deletion, a file of its own.
    Write("changed.txt", "c2");
    Touch(Folder() / "changed.txt");
    fs::remove(Folder() / "deleted.txt");
    Write("both.txt", "b here");

    const struct {
        SyncMode mMode;
        Risks mRisks;
    } rows[] = {
        {SyncMode_TwoWay,
         {"conflict Presets/changed.txt", "restore-deleted Presets/deleted.txt",
          "first-sync-overwrite Presets/both.txt", "group-delete Stale"}},
        {SyncMode_LocalWins,
         {"conflict Presets/changed.txt", "conflict Presets/newer.txt", "first-sync-overwrite Presets/both.txt",
          "group-delete Stale"}},
        {SyncMode_ServerWins, {"group-delete Stale"}},
    };
    for (const auto& row : rows) EXPECT_EQ(RisksOf(*NewHost(), row.mMode), row.mRisks) << row.mMode;

    // The item count of a doomed group, and the local files server-wins removes.
    Write("mine.txt", "only here");
    const RunResult preview = NewHost()->Preview(SyncMode_ServerWins);
    ASSERT_TRUE(preview.Ok()) << preview.mError;
    const std::vector<SyncRisk> risks = preview.mPreview->Risks();
    ASSERT_EQ(risks.size(), 2u);
    EXPECT_EQ(risks[0].mDetail, "deleted on the server with its 2 item(s)");
    EXPECT_STREQ(risks[1].KindName(), "local-delete");
    EXPECT_EQ(risks[1].mName, u"mine.txt");
    EXPECT_EQ(preview.mPreview->Counts().mDeletions, 3u);
}

TEST_F(SyncRisks, AFingerprintBesideTheCacheFileTellsAForeignCache)
{
    Write("a.txt", "a");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    const fs::path fingerprint = mPrefs.Path() / "tolmonetsynccache.fingerprint";
    ASSERT_TRUE(fs::exists(fingerprint));
    EXPECT_EQ(RisksOf(*NewHost(), SyncMode_TwoWay), Risks());

    const CacheFingerprint ours = FingerprintOf(*NewHost()->Service().GetApi());
    const struct {
        const char* mWhat;
        CacheFingerprint mKept;  // "" for a field as this client has it
        const char* mReason;     // nullptr: not foreign
    } rows[] = {
        {"another service", {"", "", "http://elsewhere/api"}, "service http://elsewhere/api"},
        {"another root", {"", "Other_Root_1.0", ""}, "preferences root Other_Root_1.0"},
        // A client signed in by a bare token knows no user: no evidence.
        {"another user", {"bob", "", ""}, ours.mUser.empty() ? nullptr : "user bob"},
    };
    for (const auto& row : rows) {
        CacheFingerprint kept = row.mKept;
        if (kept.mRoot.empty()) kept.mRoot = ours.mRoot;
        if (kept.mService.empty()) kept.mService = ours.mService;
        WriteCacheFingerprint(kept);
        const std::string reason = ForeignCacheReason(ours);
        if (row.mReason == nullptr)
            EXPECT_EQ(reason, "") << row.mWhat;
        else
            EXPECT_NE(reason.find(row.mReason), std::string::npos) << row.mWhat << ": " << reason;
    }
    WriteCacheFingerprint({"", "Other_Root_1.0", ours.mService});
    EXPECT_EQ(RisksOf(*NewHost(), SyncMode_TwoWay).count("foreign-cache "), 1u);

    // Old installs wrote none; forgetting the cache forgets its owner too.
    fs::remove(fingerprint);
    EXPECT_EQ(RisksOf(*NewHost(), SyncMode_TwoWay), Risks());
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    NewHost()->Service().DeleteCaches();
    EXPECT_FALSE(fs::exists(fingerprint));
    EXPECT_FALSE(fs::exists(mPrefs.Path() / "tolmonetsynccache.json"));
}

TEST_F(SyncRisks, APassBeyondALimitRefusesBeforeItQueuesAnything)
{
    Write("a.txt", "a1");
    Write("b.txt", "b1");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
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
        const RunResult prepared = host->Prepare();
        ASSERT_TRUE(prepared.Ok()) << prepared.mError;
        EXPECT_EQ(preview.mPreview->ExceededLimit().rfind(row.mRefusal, 0), 0u) << preview.mPreview->ExceededLimit();
        const RunResult pass = host->Pass(prepared.mCache, row.mMode);
        EXPECT_EQ(pass.mErrorCount, 1);
        EXPECT_EQ(pass.mError.rfind(row.mRefusal, 0), 0u) << pass.mError;
        EXPECT_EQ(Local(), localBefore) << row.mMode;
        EXPECT_EQ(Items("Presets"), (Files{{"a.txt", "a1"}, {"b.txt", "b1"}})) << row.mMode;
    }
}

}  // namespace synctest
