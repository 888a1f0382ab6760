// Backup directories, a swap without its download, and checksums.

#include <gtest/gtest.h>

#include <sys/stat.h>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "support/SyncHarness.h"
#include "sync/BackupRestore.h"

using namespace synctest;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
namespace fs = std::filesystem;

namespace {

class SafeFileOpsTest : public ::testing::Test {
protected:
    void TearDown() override { SyncCache::SetBackupClock(SyncCache::Clock()); }

    CachedSyncFile RecordAt(const fs::path& path)
    {
        CachedSyncFile record;
        record.mFile = FileAt(path);
        record.mName = Path(path.filename());
        return record;
    }
    std::vector<fs::path> BackupDirs()
    {
        std::vector<fs::path> dirs;
        for (const auto& entry : fs::directory_iterator(mPrefs.Path() / "SyncBackup"))
            if (entry.is_directory()) dirs.push_back(entry.path());
        std::sort(dirs.begin(), dirs.end());
        return dirs;
    }

    PrefDirScope mPrefs;
    testsupport::TempDir mWork;
};

}  // namespace

TEST_F(SafeFileOpsTest, PruningDeletesTheTenOldestAtElevenAndClimbsAgain)
{
    const boost::posix_time::ptime base = boost::posix_time::time_from_string("2020-01-01 00:00:00");
    int made = 0;
    auto makeCache = [&](bool noteACopy) {
        ++made;
        SyncCache::SetBackupClock([=] { return base + boost::posix_time::seconds(made); });
        TestCache cache({}, {});
        // Backups that hold files count like empty ones; their dates decide the order.
        WriteFileBytes(fs::path(tolmocore::utility::ToNarrow(cache.mBackupDir.FullPath())) / "saved.xmp",
                       "copy " + std::to_string(made));
        cache.mBackupDir.SetModified(base + boost::posix_time::seconds(made));
        BackupEntry entry;
        entry.mRun = tolmocore::utility::ToNarrow(cache.mBackupDir.GetName());
        entry.mCopy = entry.mPath = "saved.xmp";
        if (noteACopy) cache.NoteBackup(entry);
        cache.FinishPass();
        return tolmocore::utility::ToNarrow(cache.mBackupDir.GetName());
    };
    for (int i = 0; i < 10; ++i) makeCache(true);
    EXPECT_EQ(BackupDirs().size(), 10u);
    ASSERT_EQ(ReadBackupIndex().size(), 10u);
    const std::string eleventh = makeCache(false);
    ASSERT_EQ(BackupDirs().size(), 1u);
    EXPECT_EQ(eleventh, "Backup_20200101-000011_000000");  // the local time, to the microsecond
    EXPECT_EQ(BackupDirs()[0].filename().string(), eleventh);
    EXPECT_EQ(ReadFileBytes(BackupDirs()[0] / "saved.xmp"), "copy 11");
    EXPECT_TRUE(ReadBackupIndex().empty());  // pruned runs leave the backup index
    makeCache(true);
    EXPECT_EQ(BackupDirs().size(), 2u);
}

TEST_F(SafeFileOpsTest, BackupDirectoriesArePrivateAndPruningTouchesOnlyItsOwn)
{
    // What the library makes is 0700, the preference directory included.
    testsupport::TempDir temp;
    Dir::SetPrefDir(DirAt(temp / "made"));
    const mode_t oldMask = ::umask(0);
    const Dir made = SyncCache::NewBackupDir();
    ::umask(oldMask);
    for (const fs::path& path :
         {temp / "made", temp / "made" / "SyncBackup", fs::path(tolmocore::utility::ToNarrow(made.FullPath()))})
        EXPECT_EQ(fs::status(path).permissions(), fs::perms::owner_all) << path;
    Dir::SetPrefDir(DirAt(mPrefs.Path()));

    // A link named like a backup and a directory of someone else's stay, and
    // so does everything behind the link.
    const fs::path root = mPrefs.Path() / "SyncBackup";
    fs::create_directories(root / "Keep");
    fs::create_directories(mWork / "elsewhere");
    WriteFileBytes(mWork / "elsewhere" / "precious", "p");
    fs::create_directory_symlink(mWork / "elsewhere", root / "Backup_00000000-000000_000000");
    for (int i = 0; i < 12; ++i) SyncCache::NewBackupDir();
    EXPECT_TRUE(fs::is_symlink(root / "Backup_00000000-000000_000000"));
    EXPECT_TRUE(fs::is_directory(root / "Keep"));
    EXPECT_EQ(ReadFileBytes(mWork / "elsewhere" / "precious"), "p");
}

TEST_F(SafeFileOpsTest, BackupIndexRecordsCollisionsSurvivesDamageAndLeadsRestoresBack)
{
    // Two removed files of one name in one run: the second copy overwrites
    // the first, and the index says so.
    fs::create_directories(mWork / "one");
    fs::create_directories(mWork / "two");
    WriteFileBytes(mWork / "one" / "p.xmp", "first");
    WriteFileBytes(mWork / "two" / "p.xmp", "second");
    fs::create_directories(mPrefs.Path() / "SyncBackup");
    WriteFileBytes(mPrefs.Path() / "SyncBackup" / "index.json", "{not json");  // a damaged index
    TraceCapture trace("tolmonetsync:1");
    {
        TestCache cache({}, {SyncDir(DirAt(mWork / "two"), u".xmp", u"G", ImmutableString(), SyncMetadata_ModDate, 0)});
        for (const char* dir : {"one", "two"}) {
            File file = FileAt(mWork / dir / "p.xmp");
            cache.SafeDelete(file);
        }
        // A sync holds the lock: no restore while it runs.
        EXPECT_THROW(RestoreFromBackup(FileAt(mWork / "two" / "p.xmp")), SyncRunning);
    }  // the end of the pass writes the index
    EXPECT_TRUE(trace.Contains("Backup index unreadable"));
    const std::vector<BackupEntry> index = ReadBackupIndex();
    ASSERT_EQ(index.size(), 2u);
    EXPECT_EQ(index[1].mReason, "removed-by-server-wins");
    EXPECT_EQ(index[1].mGroup, "G");
    EXPECT_EQ(index[1].mReplaces, (mWork / "one" / "p.xmp").string());
    EXPECT_EQ(fs::status(mPrefs.Path() / "SyncBackup" / "index.json").permissions(),
              fs::perms::owner_read | fs::perms::owner_write);

    EXPECT_THROW(RestoreFromBackup(FileAt(mWork / "one" / "p.xmp")), NoBackupCopy);  // its copy is gone
    EXPECT_EQ(RestoreFromBackup(FileAt(mWork / "two" / "p.xmp")).mFrom.mRun, index[1].mRun);
    EXPECT_EQ(ReadFileBytes(mWork / "two" / "p.xmp"), "second");
    ASSERT_EQ(ListBackups().size(), 1u);  // nothing was there to back up first
}

TEST_F(SafeFileOpsTest, ChecksumFollowsContentInBlocksOf10240)
{
    std::string content(10240, '\0');
    for (std::size_t i = 0; i < content.size(); ++i) content[i] = static_cast<char>(i * 31 + 7);
    WriteFileBytes(mWork / "one.bin", content);
    WriteFileBytes(mWork / "two.bin", content);
    const Guid one = RecordAt(mWork / "one.bin").ComputeChecksum();
    // The same value the foundation's fold pins for these bytes.
    EXPECT_EQ(one.AsStdString(), "3B3611E2-E2F7-6F92-5C4F-AEBA17BECDF5");
    EXPECT_EQ(RecordAt(mWork / "two.bin").ComputeChecksum(), one);

    WriteFileBytes(mWork / "empty.bin", "");
    EXPECT_EQ(RecordAt(mWork / "empty.bin").ComputeChecksum().AsStdString(), "258FA239-3494-D72F-1472-296CEA713D18");
    EXPECT_TRUE(RecordAt(mWork / "missing.bin").ComputeChecksum().IsNil());
}
