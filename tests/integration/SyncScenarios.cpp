#include "SyncScenarios.h"

#include <sys/stat.h>
#include <unistd.h>

#include <fstream>

#include "support/FileOpsRecorder.h"

namespace synctest {

namespace fs = std::filesystem;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;

void SyncScenarios::SetUp()
{
    fs::create_directories(mDesk.Path() / "Presets");
    mServer.reset(new LocalScenarioServer(GetParam()));
}

void SyncScenarios::WritePreset(const std::string& name, const std::string& bytes)
{
    WriteFileBytes(PresetPath(name), bytes);
}

std::string SyncScenarios::ReadLocal(const fs::path& path) const
{
    return fs::exists(path) ? ReadFileBytes(path) : std::string("<missing>");
}

std::map<std::string, std::string> SyncScenarios::LocalPresets() const
{
    std::map<std::string, std::string> presets;
    for (const auto& entry : fs::directory_iterator(mDesk.Path() / "Presets"))
        if (entry.path().extension() == ".xmp") presets[entry.path().filename().string()] = ReadFileBytes(entry.path());
    return presets;
}

std::map<std::string, std::string> SyncScenarios::Backups() const
{
    std::map<std::string, std::string> saved;
    const fs::path root = mPrefs.Path() / "SyncBackup";
    if (!fs::exists(root)) return saved;
    for (const auto& dir : fs::directory_iterator(root))
        for (const auto& file : fs::directory_iterator(dir.path()))
            saved[file.path().filename().string()] = ReadFileBytes(file.path());
    return saved;
}

std::string SyncScenarios::CacheFileText() const
{
    const fs::path path = mPrefs.Path() / "tolmonetsynccache.json";
    return fs::exists(path) ? ReadFileBytes(path) : std::string();
}

std::unique_ptr<SyncHarness> SyncScenarios::NewHost()
{
    std::unique_ptr<SyncHarness> host(new SyncHarness(mServer->Client()));
    const ImmutableString xml = ImmutableString::CreateStatic("application/rdf+xml");
    host->Service().RegisterSyncDirectory(
        SyncDir(DirAt(mDesk.Path() / "Presets"), u".xmp", u"Presets", xml, SyncMetadata_ModDate, 1 << 20));
    host->Service().RegisterSyncFile(SyncFile(FileAt(SettingsPath()), u"settings", u"Settings",
                                              ImmutableString::CreateStatic("application/json"), SyncMetadata_Checksum,
                                              1 << 20));
    return host;
}

namespace {

using Files = std::map<std::string, std::string>;

struct stat StatOf(const fs::path& path)
{
    struct stat info {};
    EXPECT_EQ(::stat(path.c_str(), &info), 0) << path;
    return info;
}

// Gives a file a modification date clearly apart from the last one, so a
// change shows even on file systems with coarse timestamps.
void Touch(const fs::path& path)
{
    fs::last_write_time(path, fs::last_write_time(path) + std::chrono::seconds(5));
}

}  // namespace

TEST_P(SyncScenarios, FirstSyncUploadsEverythingIntoNewGroups)
{
    WritePreset("Warm.xmp", "warm");
    WritePreset("Cold \u00e9t\u00e9 +?%.xmp", "cold");
    WriteFileBytes(SettingsPath(), "{\"theme\":\"dark\"}");
    const RunResult result = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(result.mMoved, 3);
    EXPECT_EQ(mServer->Groups(), (std::vector<std::string>{"Presets", "Settings"}));
    EXPECT_EQ(mServer->Items("Presets"), LocalPresets());
    EXPECT_EQ(mServer->Items("Settings"), (Files{{"settings", "{\"theme\":\"dark\"}"}}));
    EXPECT_NE(CacheFileText().find("Warm.xmp"), std::string::npos);
}

TEST_P(SyncScenarios, NothingChangedMovesNothingInEveryMode)
{
    WritePreset("A.xmp", "a");
    WriteFileBytes(SettingsPath(), "s");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    for (SyncMode mode : {SyncMode_TwoWay, SyncMode_ServerWins, SyncMode_LocalWins}) {
        const RunResult again = Sync(mode);
        ASSERT_TRUE(again.Ok()) << mode << ": " << again.mError;
        EXPECT_EQ(again.mMoved, 0) << mode;
    }
    EXPECT_EQ(mServer->Items("Presets"), LocalPresets());
}

TEST_P(SyncScenarios, ChangesTravelBothWaysAndReplacedFilesAreBackedUp)
{
    WritePreset("Local.xmp", "v1");
    WritePreset("Remote.xmp", "v1");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());

    WritePreset("Local.xmp", "v2 from the desk");
    Touch(PresetPath("Local.xmp"));
    mServer->PutItem("Presets", "Remote.xmp", "v2 from elsewhere");
    const RunResult result = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(result.mMoved, 2);
    EXPECT_EQ(mServer->Items("Presets")["Local.xmp"], "v2 from the desk");
    EXPECT_EQ(ReadLocal(PresetPath("Remote.xmp")), "v2 from elsewhere");
    EXPECT_EQ(Backups()["Remote.xmp"], "v1");
    EXPECT_FALSE(fs::exists(PresetPath("Remote.xmp.temp")));
}

TEST_P(SyncScenarios, DownloadsKeepTheReplacedFilesAccessAndNewFilesGetTheUmask)
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
    mServer->PutItem("Settings", "settings", "{\"key\":\"two\"}");
    mServer->PutItem("Presets", "New.xmp", "new");

    const RunResult result = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(ReadLocal(SettingsPath()), "{\"key\":\"two\"}");
    const struct stat replaced = StatOf(SettingsPath());
    EXPECT_EQ(replaced.st_mode & 07777, 0600u);
    if (root) {
        EXPECT_EQ(replaced.st_uid, 65534u);
        EXPECT_EQ(replaced.st_gid, 65534u);
    }
    fs::path backup;
    for (const auto& dir : fs::directory_iterator(mPrefs.Path() / "SyncBackup"))
        if (fs::exists(dir.path() / "settings.json")) backup = dir.path() / "settings.json";
    ASSERT_FALSE(backup.empty());
    EXPECT_EQ(ReadFileBytes(backup), "{\"key\":\"one\"}");
    EXPECT_EQ(StatOf(backup).st_mode & 07777, 0600u);
    EXPECT_EQ(StatOf(PresetPath("New.xmp")).st_mode & 07777, 0666u & ~mask);
}

TEST_P(SyncScenarios, TheCacheFileIsSavedOnlyAfterEverySwapIsDurable)
{
    WriteFileBytes(SettingsPath(), "s1");
    WritePreset("A.xmp", "a1");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    mServer->PutItem("Settings", "settings", "s2");
    mServer->PutItem("Presets", "A.xmp", "a2");
    testsupport::FileOpsRecorder disk;
    const RunResult result = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(ReadLocal(PresetPath("A.xmp")), "a2");

    const int cacheSaved = disk.IndexOfPrefix("rename " + (mPrefs.Path() / ".tolmonetsynccache.json.tmsw-").string());
    ASSERT_GE(cacheSaved, 0);
    for (const fs::path& swapped : {PresetPath("A.xmp"), SettingsPath()}) {
        const int renamed = disk.IndexOf("rename " + swapped.string() + ".temp -> " + swapped.string());
        ASSERT_GE(renamed, 0) << swapped;
        const int synced = disk.IndexOf("dirsync " + swapped.parent_path().string(), renamed);
        EXPECT_GT(synced, renamed) << swapped;
        EXPECT_LT(synced, cacheSaved) << swapped;
    }
    EXPECT_GT(disk.IndexOf("dirsync " + mPrefs.Path().string(), cacheSaved), cacheSaved);
}

TEST_P(SyncScenarios, TwoWayLetsALocalChangeWinOverAServerChange)
{
    WritePreset("Both.xmp", "v1");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    WritePreset("Both.xmp", "local v2");
    Touch(PresetPath("Both.xmp"));
    mServer->PutItem("Presets", "Both.xmp", "server v2");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    EXPECT_EQ(mServer->Items("Presets")["Both.xmp"], "local v2");
    EXPECT_EQ(ReadLocal(PresetPath("Both.xmp")), "local v2");
}

TEST_P(SyncScenarios, TwoWayBringsBackWhatEitherSideDeleted)
{
    WritePreset("GoneLocally.xmp", "keep");
    WritePreset("GoneRemotely.xmp", "keep too");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    fs::remove(PresetPath("GoneLocally.xmp"));
    mServer->RemoveItem("Presets", "GoneRemotely.xmp");
    const RunResult result = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(ReadLocal(PresetPath("GoneLocally.xmp")), "keep");
    EXPECT_EQ(mServer->Items("Presets")["GoneRemotely.xmp"], "keep too");
}

TEST_P(SyncScenarios, LocalWinsDeletesOnTheServerWhatIsGoneLocally)
{
    WritePreset("Doomed.xmp", "x");
    WritePreset("Kept.xmp", "y");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    fs::remove(PresetPath("Doomed.xmp"));
    mServer->PutItem("Presets", "Kept.xmp", "server's newer y");
    const RunResult result = Sync(SyncMode_LocalWins);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(mServer->Items("Presets"), (Files{{"Kept.xmp", "y"}}));
}

TEST_P(SyncScenarios, ServerWinsReplacesLocalChangesAndRemovesExtrasWithBackups)
{
    WritePreset("Shared.xmp", "server's");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    WritePreset("Shared.xmp", "edited locally");
    Touch(PresetPath("Shared.xmp"));
    WritePreset("Extra.xmp", "only here");
    const RunResult result = Sync(SyncMode_ServerWins);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(LocalPresets(), (Files{{"Shared.xmp", "server's"}}));
    EXPECT_EQ(Backups()["Shared.xmp"], "edited locally");
    EXPECT_EQ(Backups()["Extra.xmp"], "only here");
}

TEST_P(SyncScenarios, ServerWinsNeverEmptiesADirectoryForAnEmptyGroup)
{
    mServer->MakeGroup("Presets");
    WritePreset("Mine.xmp", "mine");
    ASSERT_TRUE(Sync(SyncMode_ServerWins).Ok());
    EXPECT_EQ(LocalPresets(), (Files{{"Mine.xmp", "mine"}}));
}

TEST_P(SyncScenarios, GroupsNobodyRegistersAreDeletedAndItemsFromElsewhereArrive)
{
    mServer->PutItem("Stale", "old.xmp", "old");
    mServer->PutItem("Presets", "FromOtherMachine.xmp", "other");
    WritePreset("Here.xmp", "here");
    const RunResult result = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(mServer->Groups(), (std::vector<std::string>{"Presets", "Settings"}));
    EXPECT_EQ(ReadLocal(PresetPath("FromOtherMachine.xmp")), "other");
    EXPECT_EQ(mServer->Items("Presets")["Here.xmp"], "here");
}

TEST_P(SyncScenarios, HostileServerNamesAreLeftOutAndTheSyncSucceeds)
{
    mServer->PutItem("Presets", "../escape.xmp", "outside");
    mServer->PutItem("Presets", "..", "dots");
    mServer->PutItem("Presets", "Fine.xmp", "fine");
    const RunResult result = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(LocalPresets(), (Files{{"Fine.xmp", "fine"}}));
    EXPECT_FALSE(fs::exists(mDesk.Path() / "escape.xmp"));
}

TEST_P(SyncScenarios, PreviewPredictsThePassAndChangesNothing)
{
    WritePreset("Up.xmp", "up");
    mServer->PutItem("Presets", "Down.xmp", "down");
    mServer->PutItem("Stale", "x.xmp", "x");
    const std::vector<std::string> groupsBefore = mServer->Groups();

    const RunResult preview = NewHost()->Preview(SyncMode_TwoWay);
    ASSERT_TRUE(preview.Ok()) << preview.mError;
    EXPECT_EQ(mServer->Groups(), groupsBefore);
    EXPECT_FALSE(fs::exists(mPrefs.Path() / "SyncBackup"));
    EXPECT_FALSE(fs::exists(PresetPath("Down.xmp")));
    EXPECT_EQ(preview.mPreview->mGroupsToDelete, GroupNameSet({u"Stale"}));
    std::map<std::string, std::string> predicted;
    const auto& records = preview.mPreview->mCache->mFiles;
    for (std::size_t i = 0; i < records.size(); ++i)
        predicted[tolmocore::utility::ToNarrow(records[i].mName)] = preview.mPreview->mDecisions[i].ActionName();
    EXPECT_EQ(predicted, (Files{{"Up.xmp", "upload"}, {"Down.xmp", "download"}, {"settings", "skip"}}));

    const RunResult result = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(result.mCache->mUploadCount, 1u);
    EXPECT_EQ(result.mCache->mDownloadCount, 1u);
}

}  // namespace synctest
