// Backups, swaps, safe deletes and checksums: nothing local is replaced or
// removed without a copy.

#include <gtest/gtest.h>

#include <sys/stat.h>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "support/SyncHarness.h"

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
        for (const auto& entry : fs::directory_iterator(mPrefs.Path() / "SyncBackup")) dirs.push_back(entry.path());
        std::sort(dirs.begin(), dirs.end());
        return dirs;
    }

    PrefDirScope mPrefs;
    testsupport::TempDir mWork;
};

}  // namespace

TEST_F(SafeFileOpsTest, BackupDirectoryIsNamedByTheLocalTimeToTheMicrosecond)
{
    SyncCache::SetBackupClock([] { return boost::posix_time::time_from_string("2026-11-23 17:04:05.000123"); });
    const Dir backup = SyncCache::NewBackupDir();
    EXPECT_EQ(tolmocore::utility::ToNarrow(backup.GetName()), "Backup_20261123-170405_000123");
    EXPECT_TRUE(fs::is_directory(mPrefs.Path() / "SyncBackup" / "Backup_20261123-170405_000123"));
}

TEST_F(SafeFileOpsTest, PruningDeletesTheTenOldestAtElevenAndClimbsAgain)
{
    const boost::posix_time::ptime base = boost::posix_time::time_from_string("2020-01-01 00:00:00");
    int made = 0;
    auto makeCache = [&] {
        ++made;
        SyncCache::SetBackupClock([=] { return base + boost::posix_time::seconds(made); });
        OfflineCache cache({}, {});
        // Backups that hold files count like empty ones; their dates decide the order.
        WriteFileBytes(fs::path(tolmocore::utility::ToNarrow(cache.mBackupDir.FullPath())) / "saved.xmp",
                       "copy " + std::to_string(made));
        cache.mBackupDir.SetModified(base + boost::posix_time::seconds(made));
        return tolmocore::utility::ToNarrow(cache.mBackupDir.GetName());
    };
    for (int i = 0; i < 10; ++i) makeCache();
    EXPECT_EQ(BackupDirs().size(), 10u);
    const std::string eleventh = makeCache();
    ASSERT_EQ(BackupDirs().size(), 1u);
    EXPECT_EQ(BackupDirs()[0].filename().string(), eleventh);
    EXPECT_EQ(ReadFileBytes(BackupDirs()[0] / "saved.xmp"), "copy 11");
    makeCache();
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

TEST_F(SafeFileOpsTest, SwapBacksUpTheOldFileAndPutsTheDownloadInPlace)
{
    const Dir backup = SyncCache::NewBackupDir();
    CachedSyncFile record = RecordAt(mWork / "prefs.xmp");
    WriteFileBytes(mWork / "prefs.xmp", "old bytes");
    WriteFileBytes(mWork / "prefs.xmp.temp", "new bytes");
    record.SafeRenameSwap(backup);
    EXPECT_EQ(ReadFileBytes(mWork / "prefs.xmp"), "new bytes");
    EXPECT_FALSE(fs::exists(mWork / "prefs.xmp.temp"));
    EXPECT_EQ(ReadFileBytes(fs::path(tolmocore::utility::ToNarrow(backup.FullPath())) / "prefs.xmp"), "old bytes");
}

TEST_F(SafeFileOpsTest, SwapWithoutATargetJustRenames)
{
    const Dir backup = SyncCache::NewBackupDir();
    CachedSyncFile record = RecordAt(mWork / "fresh.xmp");
    WriteFileBytes(mWork / "fresh.xmp.temp", "downloaded");
    record.SafeRenameSwap(backup);
    EXPECT_EQ(ReadFileBytes(mWork / "fresh.xmp"), "downloaded");
    EXPECT_TRUE(fs::is_empty(fs::path(tolmocore::utility::ToNarrow(backup.FullPath()))));
}

TEST_F(SafeFileOpsTest, SwapWithoutADownloadFailsAndKeepsTheTarget)
{
    const Dir backup = SyncCache::NewBackupDir();
    CachedSyncFile record = RecordAt(mWork / "kept.xmp");
    WriteFileBytes(mWork / "kept.xmp", "still here");
    EXPECT_THROW(record.SafeRenameSwap(backup), std::exception);
    EXPECT_EQ(ReadFileBytes(mWork / "kept.xmp"), "still here");
}

TEST_F(SafeFileOpsTest, SafeDeleteCopiesFirstAndIgnoresMissingFiles)
{
    OfflineCache cache({}, {});
    WriteFileBytes(mWork / "gone.xmp", "keep me somewhere");
    File file = FileAt(mWork / "gone.xmp");
    cache.SafeDelete(file);
    EXPECT_FALSE(fs::exists(mWork / "gone.xmp"));
    const fs::path backup(tolmocore::utility::ToNarrow(cache.mBackupDir.FullPath()));
    EXPECT_EQ(ReadFileBytes(backup / "gone.xmp"), "keep me somewhere");

    TraceCapture trace("tolmonetsync:8");
    cache.SafeDelete(file);
    EXPECT_EQ(trace.Count(), 0u);
}

TEST_F(SafeFileOpsTest, BackupsAreFlatSoALaterSameNameCopyWinsWithinARun)
{
    // The design keeps no source directory in a backup's path: two files of
    // one name removed in one run leave only the later copy.
    OfflineCache cache({}, {});
    fs::create_directories(mWork / "a");
    fs::create_directories(mWork / "b");
    WriteFileBytes(mWork / "a" / "same.xmp", "from a, longer text");
    WriteFileBytes(mWork / "b" / "same.xmp", "from b");
    File first = FileAt(mWork / "a" / "same.xmp"), second = FileAt(mWork / "b" / "same.xmp");
    cache.SafeDelete(first);
    cache.SafeDelete(second);
    const fs::path backup(tolmocore::utility::ToNarrow(cache.mBackupDir.FullPath()));
    EXPECT_EQ(ReadFileBytes(backup / "same.xmp"), "from b");
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

TEST_F(SafeFileOpsTest, FreshenReadsOnlyTheWatchedProperty)
{
    WriteFileBytes(mWork / "watched.xmp", "x");
    CachedSyncFile byDate = RecordAt(mWork / "watched.xmp");
    byDate.FreshenModDate();
    EXPECT_FALSE(byDate.mLocalModDate.is_not_a_date_time());
    EXPECT_TRUE(byDate.mLocalChecksum.IsNil());

    CachedSyncFile byContent = RecordAt(mWork / "watched.xmp");
    byContent.mOptions = SyncMetadata_Checksum;
    byContent.FreshenModDate();
    EXPECT_TRUE(byContent.mLocalModDate.is_not_a_date_time());
    EXPECT_FALSE(byContent.mLocalChecksum.IsNil());

    CachedSyncFile missing = RecordAt(mWork / "missing.xmp");
    missing.mLocalModDate = boost::posix_time::second_clock::universal_time();
    missing.FreshenModDate();
    EXPECT_TRUE(missing.mLocalModDate.is_not_a_date_time());
}
