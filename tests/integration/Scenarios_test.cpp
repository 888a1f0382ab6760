// Whole syncs by the real client against the local service: what each mode
// does to both sides, what it keeps, and what it never touches.

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>

#include "FolderSync.h"
#include "foundation/json/JSONText.h"
#include "support/FileOpsRecorder.h"
#include "sync/CacheFile.h"

namespace synctest {

namespace {

namespace fs = std::filesystem;
using namespace tolmonetsync::server;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;

struct NamedStyle {
    const char* mName;
    AnswerStyle mStyle;
};

const NamedStyle kStyles[] = {
    {"Plain", {IdForm_Plain, false, HeaderCase_Usual, false, true}},
    {"PathIdsAbsoluteLocationLowerHeaders", {IdForm_Path, true, HeaderCase_Lower, true, false}},
    {"UrlOnlyUpperHeaders", {IdForm_UrlOnly, false, HeaderCase_Upper, false, true}},
};

class StyledSync : public FolderSync, public ::testing::WithParamInterface<NamedStyle> {};

TEST_P(StyledSync, ChangesTravelBothWaysAndWhatEitherSideDeletedComesBack)
{
    mService->SetAnswerStyle(GetParam().mStyle);
    for (const char* name : {"Local.txt", "Remote.txt", "Both.txt", "GoneLocally.txt", "GoneRemotely.txt"})
        Write(name, "v1");
    Write("Cold \u00e9t\u00e9 +?%.txt", "cold");
    WriteFileBytes(SettingsPath(), "{\"theme\":\"dark\"}");
    const RunResult first = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(first.Ok()) << first.mError;
    EXPECT_EQ(first.mMoved, 7);
    EXPECT_EQ(Groups(), (std::vector<std::string>{"Presets", "Settings"}));
    EXPECT_EQ(Items("Presets"), Local());
    EXPECT_EQ(Items("Settings"), (Files{{"settings", "{\"theme\":\"dark\"}"}}));
    for (SyncMode mode : {SyncMode_TwoWay, SyncMode_ServerWins, SyncMode_LocalWins}) {
        const RunResult again = Sync(mode);
        ASSERT_TRUE(again.Ok()) << mode << ": " << again.mError;
        EXPECT_EQ(again.mMoved, 0) << mode;
    }

    // A local change wins over a server change of the same file.
    Write("Local.txt", "v2 from the desk");
    Write("Both.txt", "local v2");
    Touch(Folder() / "Local.txt");
    Touch(Folder() / "Both.txt");
    PutItem("Presets", "Remote.txt", "v2 from elsewhere");
    PutItem("Presets", "Both.txt", "server v2");
    fs::remove(Folder() / "GoneLocally.txt");
    RemoveItem("Presets", "GoneRemotely.txt");
    TraceCapture trace("Tarnvault:8");
    const RunResult changed = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(changed.Ok()) << changed.mError;
    EXPECT_EQ(changed.mMoved, 5);
    EXPECT_EQ(Local(), (Files{{"Both.txt", "local v2"},
                              {"Cold \u00e9t\u00e9 +?%.txt", "cold"},
                              {"GoneLocally.txt", "v1"},
                              {"GoneRemotely.txt", "v1"},
                              {"Local.txt", "v2 from the desk"},
                              {"Remote.txt", "v2 from elsewhere"}}));
    EXPECT_EQ(Items("Presets"), Local());
    EXPECT_EQ(Backups(), (Files{{"Remote.txt", "v1"}}));
    // The download's completion line names its request, as the others do.
    const std::string line = trace.LineWith("Download, content-type: ");
    EXPECT_NE(line.find(", last_modified: "), std::string::npos) << line;
    EXPECT_GT(line.find(", requestUID: "), line.find(", last_modified: ")) << line;
    EXPECT_NE(line.find(", requestUID: "), std::string::npos) << line;
}

INSTANTIATE_TEST_SUITE_P(AnswerStyles, StyledSync, ::testing::ValuesIn(kStyles),
                         [](const ::testing::TestParamInfo<NamedStyle>& info) { return info.param.mName; });

using Scenarios = FolderSync;

mode_t ModeOf(const fs::path& path)
{
    struct stat info {};
    EXPECT_EQ(::stat(path.c_str(), &info), 0) << path;
    return info.st_mode & 07777;
}

TEST_F(Scenarios, DownloadsKeepTheReplacedFilesAccessAndNewFilesGetTheUmask)
{
    const mode_t mask = ::umask(0);  // read while nothing else makes files
    ::umask(mask);
    // A settings file holding a key is its owner's alone, and stays so.
    WriteFileBytes(SettingsPath(), "{\"key\":\"one\"}");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    fs::permissions(SettingsPath(), fs::perms::owner_read | fs::perms::owner_write);
    const bool root = ::geteuid() == 0;  // only root may give a file away
    if (root) {
        ASSERT_EQ(::chown(SettingsPath().c_str(), 65534, 65534), 0);
    }
    PutItem("Settings", "settings", "{\"key\":\"two\"}");
    PutItem("Presets", "New.txt", "new");

    const RunResult result = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(ReadFileBytes(SettingsPath()), "{\"key\":\"two\"}");
    EXPECT_EQ(ModeOf(SettingsPath()), 0600u);
    struct stat owner {};
    ASSERT_EQ(::stat(SettingsPath().c_str(), &owner), 0);
    if (root) {
        EXPECT_EQ(owner.st_uid, 65534u);
        EXPECT_EQ(owner.st_gid, 65534u);
    }
    EXPECT_EQ(Backups()["settings.json"], "{\"key\":\"one\"}");
    for (const auto& dir : fs::directory_iterator(mPrefs.Path() / "SyncBackup")) {
        if (fs::exists(dir.path() / "settings.json")) {
            EXPECT_EQ(ModeOf(dir.path() / "settings.json"), 0600u);
        }
    }
    EXPECT_EQ(ModeOf(Folder() / "New.txt"), 0666u & ~mask);
}

TEST_F(Scenarios, TheCacheFileIsSavedOnlyAfterEverySwapIsDurable)
{
    WriteFileBytes(SettingsPath(), "s1");
    Write("A.txt", "a1");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    PutItem("Settings", "settings", "s2");
    PutItem("Presets", "A.txt", "a2");
    testsupport::FileOpsRecorder disk;
    const RunResult result = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(ReadFileBytes(Folder() / "A.txt"), "a2");

    const int cacheSaved = disk.IndexOfPrefix("rename " + (mPrefs.Path() / ".tolmonetsynccache.json.tmsw-").string());
    ASSERT_GE(cacheSaved, 0);
    for (const fs::path& swapped : {Folder() / "A.txt", SettingsPath()}) {
        const int renamed = disk.IndexOf("rename " + swapped.string() + ".temp -> " + swapped.string());
        ASSERT_GE(renamed, 0) << swapped;
        const int written = disk.IndexOf("fsync " + swapped.string() + ".temp");
        EXPECT_TRUE(written >= 0 && written < renamed) << swapped << " was renamed before its bytes were synced";
        const int synced = disk.IndexOf("dirsync " + swapped.parent_path().string(), renamed);
        EXPECT_GT(synced, renamed) << swapped;
        EXPECT_LT(synced, cacheSaved) << swapped;
    }
    EXPECT_GT(disk.IndexOf("dirsync " + mPrefs.Path().string(), cacheSaved), cacheSaved);
}

TEST_F(Scenarios, EachSideWinsInItsModeAndNothingIsReplacedWithoutABackup)
{
    // Server-wins never empties a directory for an empty group.
    MakeGroup("Presets");
    Write("Doomed.txt", "x");
    Write("Kept.txt", "y");
    WriteFileBytes(SettingsPath(), "s1");
    ASSERT_TRUE(Sync(SyncMode_ServerWins).Ok());
    EXPECT_EQ(Local(), (Files{{"Doomed.txt", "x"}, {"Kept.txt", "y"}}));
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());

    // Local-wins deletes on the server what is gone here, and overrides.
    fs::remove(Folder() / "Doomed.txt");
    PutItem("Presets", "Kept.txt", "server's newer y");
    ASSERT_TRUE(Sync(SyncMode_LocalWins).Ok());
    EXPECT_EQ(Items("Presets"), (Files{{"Kept.txt", "y"}}));

    // Server-wins replaces local changes and removes extras, backing both up.
    Write("Kept.txt", "edited locally");
    Touch(Folder() / "Kept.txt");
    Write("Extra.txt", "only here");
    ASSERT_TRUE(Sync(SyncMode_ServerWins).Ok());
    EXPECT_EQ(Local(), (Files{{"Kept.txt", "y"}}));
    EXPECT_EQ(Backups()["Kept.txt"], "edited locally");
    EXPECT_EQ(Backups()["Extra.txt"], "only here");

    // Changed here and gone from the server: nothing moves, but the saved
    // cache must no longer vouch for the old server version.
    WriteFileBytes(SettingsPath(), "s2 from the desk");
    RemoveItem("Settings", "settings");
    const RunResult skipped = Sync(SyncMode_ServerWins);
    ASSERT_TRUE(skipped.Ok()) << skipped.mError;
    EXPECT_EQ(skipped.mMoved, 0);
    EXPECT_EQ(ReadFileBytes(SettingsPath()), "s2 from the desk");
    namespace json = tolmocore::serialization;
    std::vector<CachedSyncFile> records;
    json::JSONConvertStdVector<CachedSyncFile>::FromJSON(json::JSONParse(UTF8String(CacheFile())), records);
    const auto settings = std::find_if(records.begin(), records.end(),
                                       [](const CachedSyncFile& record) { return record.mName == u"settings"; });
    ASSERT_NE(settings, records.end());
    EXPECT_EQ(settings->mCachedServerEtag.ToStdString(), "");
}

TEST_F(Scenarios, PreviewPredictsThePassThatDeletesStaleGroupsAndLeavesHostileNamesOut)
{
    Write("Up.txt", "up");
    PutItem("Presets", "Down.txt", "down");
    PutItem("Presets", "../escape.txt", "outside");
    PutItem("Presets", "..", "dots");
    PutItem("Stale", "x.txt", "x");
    const std::vector<std::string> groupsBefore = Groups();

    const RunResult preview = NewHost()->Preview(SyncMode_TwoWay);
    ASSERT_TRUE(preview.Ok()) << preview.mError;
    EXPECT_EQ(Groups(), groupsBefore);
    EXPECT_FALSE(fs::exists(mPrefs.Path() / "SyncBackup"));
    EXPECT_EQ(Local(), (Files{{"Up.txt", "up"}}));
    EXPECT_EQ(preview.mPreview->mGroupsToDelete, GroupNameSet({u"Stale"}));
    Files predicted;
    const auto& records = preview.mPreview->mCache->mFiles;
    for (std::size_t i = 0; i < records.size(); ++i)
        predicted[tolmocore::utility::ToNarrow(records[i].mName)] = preview.mPreview->mDecisions[i].ActionName();
    EXPECT_EQ(predicted, (Files{{"Up.txt", "upload"}, {"Down.txt", "download"}, {"settings", "skip"}}));

    const RunResult result = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(result.mCache->mUploadCount, 1u);
    EXPECT_EQ(result.mCache->mDownloadCount, 1u);
    EXPECT_EQ(Groups(), (std::vector<std::string>{"Presets", "Settings"}));
    EXPECT_EQ(Local(), (Files{{"Down.txt", "down"}, {"Up.txt", "up"}}));
    EXPECT_FALSE(fs::exists(mDesk.Path() / "escape.txt"));
}

}  // namespace

}  // namespace synctest
