// The decision a record makes about itself, in every combination of history,
// local change and mode.

#include <gtest/gtest.h>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "support/TempDir.h"
#include "sync/SyncRecords.h"

using namespace tolmonetsync;
using boost::posix_time::ptime;
using boost::posix_time::time_from_string;

namespace {

class GetStateTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        mRecord.mFile = File(UTF16String(tolmocore::utility::ToUTF16((mDir / "prefs.xmp").string())));
        mRecord.mOptions = SyncMetadata_ModDate;
    }
    void CreateFile() { testsupport::WriteFileBytes(mDir / "prefs.xmp", "content"); }
    // History on both sides, the local side unchanged.
    void GiveHistory()
    {
        mRecord.mCachedServerModDate = mRecord.mServerModDate = kServerDate;
        mRecord.mCachedLocalModDate = mRecord.mLocalModDate = kLocalDate;
        mRecord.mCachedLocalChecksum = mRecord.mLocalChecksum = kChecksum;
    }

    const ptime kServerDate = time_from_string("2024-01-02 03:04:05.000006");
    const ptime kLocalDate = time_from_string("2024-01-01 00:00:00.5");
    const Guid kChecksum = Guid(1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11);
    testsupport::TempDir mDir;
    CachedSyncFile mRecord;
};

}  // namespace

TEST_F(GetStateTest, NoHistoryOnEitherSidePushesAnExistingFileAndPullsAMissingOne)
{
    for (SyncMode mode : {SyncMode_TwoWay, SyncMode_ServerWins, SyncMode_LocalWins}) {
        GiveHistory();
        mRecord.mServerModDate = ptime();  // no item on the server now
        EXPECT_EQ(mRecord.GetState(mode), CachedSyncFile::State_Pull) << mode;
        mRecord.mServerModDate = kServerDate;
        mRecord.mCachedServerModDate = ptime();  // never synchronised
        EXPECT_EQ(mRecord.GetState(mode), CachedSyncFile::State_Pull) << mode;
    }
    CreateFile();
    for (SyncMode mode : {SyncMode_TwoWay, SyncMode_ServerWins, SyncMode_LocalWins})
        EXPECT_EQ(mRecord.GetState(mode), CachedSyncFile::State_Push) << mode;
}

TEST_F(GetStateTest, ChangedModificationDatePushesInEveryMode)
{
    GiveHistory();
    // Earlier than the kept date still counts: dates compare by equality.
    mRecord.mLocalModDate = kLocalDate - boost::posix_time::hours(24);
    for (SyncMode mode : {SyncMode_TwoWay, SyncMode_ServerWins, SyncMode_LocalWins})
        EXPECT_EQ(mRecord.GetState(mode), CachedSyncFile::State_Push) << mode;
}

TEST_F(GetStateTest, ChecksumOptionIgnoresDatesAndWatchesContent)
{
    GiveHistory();
    mRecord.mOptions = SyncMetadata_Checksum;
    mRecord.mLocalModDate = kLocalDate + boost::posix_time::seconds(1);  // touched, same bytes
    EXPECT_EQ(mRecord.GetState(SyncMode_LocalWins), CachedSyncFile::State_Current);
    mRecord.mLocalChecksum = Guid(9, 9, 9, 9, 9, 9, 9, 9, 9, 9, 9);
    EXPECT_EQ(mRecord.GetState(SyncMode_LocalWins), CachedSyncFile::State_Push);
    // A nil checksum (gone or unreadable) counts as unchanged.
    mRecord.mLocalChecksum = Guid();
    EXPECT_EQ(mRecord.GetState(SyncMode_LocalWins), CachedSyncFile::State_Current);
    EXPECT_EQ(mRecord.GetState(SyncMode_TwoWay), CachedSyncFile::State_Pull);
}

TEST_F(GetStateTest, ModDateOptionSeesATouchWithTheSameContent)
{
    GiveHistory();
    mRecord.mLocalModDate = kLocalDate + boost::posix_time::microseconds(1);
    EXPECT_EQ(mRecord.GetState(SyncMode_TwoWay), CachedSyncFile::State_Push);
    // A blank local date (file gone) is no change.
    mRecord.mLocalModDate = ptime();
    EXPECT_EQ(mRecord.GetState(SyncMode_LocalWins), CachedSyncFile::State_Current);
}

TEST_F(GetStateTest, UnchangedLocallyIsCurrentOnlyWhenTheLocalSideWinsAndTheServerDateHolds)
{
    GiveHistory();
    EXPECT_EQ(mRecord.GetState(SyncMode_LocalWins), CachedSyncFile::State_Current);
    EXPECT_EQ(mRecord.GetState(SyncMode_TwoWay), CachedSyncFile::State_Pull);
    EXPECT_EQ(mRecord.GetState(SyncMode_ServerWins), CachedSyncFile::State_Pull);
    mRecord.mServerModDate = kServerDate + boost::posix_time::seconds(1);
    EXPECT_EQ(mRecord.GetState(SyncMode_LocalWins), CachedSyncFile::State_Pull);
}
