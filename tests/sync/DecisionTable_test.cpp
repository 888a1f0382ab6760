// Every row of the pass's decision tables, in all three modes, for records
// watched by date and by content.

#include <gtest/gtest.h>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "support/SyncHarness.h"
#include "sync/SyncDecision.h"

using namespace synctest;
using testsupport::WriteFileBytes;

namespace {

// Touched: a new date, the same bytes; Changed: both new.
enum Local { Missing, Unchanged, Touched, Changed };
enum Remote { NoItem, ItemSameDate, ItemNewerDate };

struct Row {
    SyncMode mMode;
    Local mLocal;
    Remote mRemote;
    bool mHistory;
    SyncAction mAction;
    bool mDropsTag;
    bool mByContent = false;
};

std::ostream& operator<<(std::ostream& out, const Row& row)
{
    return out << "mode " << row.mMode << ", local " << row.mLocal << ", remote " << row.mRemote << ", history "
               << row.mHistory << ", by content " << row.mByContent;
}

class DecisionTable : public ::testing::TestWithParam<Row> {
protected:
    const boost::posix_time::ptime kServerDate = boost::posix_time::time_from_string("2024-02-03 04:05:06");
    const boost::posix_time::ptime kLocalDate = boost::posix_time::time_from_string("2024-02-01 00:00:00");
    const Guid kChecksum = Guid(1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11);
    PrefDirScope mPrefs;
    testsupport::TempDir mWork;
};

}  // namespace

TEST_P(DecisionTable, ActionFollowsTheTable)
{
    const Row row = GetParam();
    TestCache cache({}, {});
    boost::shared_ptr<Collection> group(new Collection);
    group->mName = u"G";
    cache.mCollections.push_back(group);

    CachedSyncFile record(SyncFile(FileAt(mWork / "f.xmp"), u"f.xmp", u"G", ImmutableString::CreateStatic("t/x"),
                                   SyncMetadata_ModDate, 1000));
    if (row.mLocal != Missing) WriteFileBytes(mWork / "f.xmp", "bytes");
    if (row.mRemote != NoItem) {
        boost::shared_ptr<Item> item(new Item);
        item->mName = u"f.xmp";
        item->mModified = row.mRemote == ItemSameDate ? kServerDate : kServerDate + boost::posix_time::hours(1);
        group->mChildren.push_back(item);
        record.mServerModDate = item->mModified;
    }
    if (row.mHistory) {
        record.mCachedServerModDate = kServerDate;
        record.mCachedServerEtag = "\"kept\"";
        record.mCachedLocalModDate = kLocalDate;
    }
    record.mOptions = row.mByContent ? SyncMetadata_Checksum : SyncMetadata_ModDate;
    record.mCachedLocalChecksum = kChecksum;
    if (row.mLocal != Missing) {
        // Dates compare by equality to the microsecond: an earlier one is a change too.
        record.mLocalModDate = row.mLocal == Unchanged ? kLocalDate : kLocalDate - boost::posix_time::microseconds(1);
        record.mLocalChecksum = row.mLocal == Changed ? Guid(9, 9, 9, 9, 9, 9, 9, 9, 9, 9, 9) : kChecksum;
    }

    const SyncDecision decision = DecideRecord(cache, record, row.mMode);
    EXPECT_EQ(decision.mAction, row.mAction) << row << " (" << decision.ActionName() << ")";
    EXPECT_EQ(decision.mDropCachedEtag, row.mDropsTag) << row;
    EXPECT_NE(std::string(decision.Reason()), "");
}

// History means a kept server date and an item now; a missing local file
// never has history at plan time.
INSTANTIATE_TEST_SUITE_P(
    TwoWay, DecisionTable,
    ::testing::Values(Row{SyncMode_TwoWay, Changed, ItemNewerDate, true, SyncAction_Upload, false},
                      Row{SyncMode_TwoWay, Unchanged, ItemSameDate, true, SyncAction_Download, false},
                      Row{SyncMode_TwoWay, Unchanged, ItemNewerDate, false, SyncAction_Upload, false},
                      Row{SyncMode_TwoWay, Unchanged, NoItem, true, SyncAction_Upload, false},
                      Row{SyncMode_TwoWay, Missing, ItemSameDate, false, SyncAction_Download, false},
                      Row{SyncMode_TwoWay, Missing, NoItem, false, SyncAction_SkipMissingRemote, false}));

INSTANTIATE_TEST_SUITE_P(
    ServerWins, DecisionTable,
    ::testing::Values(Row{SyncMode_ServerWins, Unchanged, NoItem, true, SyncAction_SkipMissingRemote, true},
                      Row{SyncMode_ServerWins, Changed, ItemSameDate, true, SyncAction_Download, true},
                      Row{SyncMode_ServerWins, Unchanged, ItemSameDate, false, SyncAction_Download, true},
                      Row{SyncMode_ServerWins, Unchanged, ItemNewerDate, true, SyncAction_Download, false},
                      Row{SyncMode_ServerWins, Missing, ItemSameDate, false, SyncAction_Download, false},
                      Row{SyncMode_ServerWins, Missing, NoItem, false, SyncAction_SkipMissingRemote, false}));

INSTANTIATE_TEST_SUITE_P(
    LocalWins, DecisionTable,
    ::testing::Values(Row{SyncMode_LocalWins, Unchanged, ItemSameDate, true, SyncAction_Nothing, false},
                      Row{SyncMode_LocalWins, Changed, ItemSameDate, true, SyncAction_Upload, false},
                      Row{SyncMode_LocalWins, Unchanged, ItemNewerDate, true, SyncAction_Upload, false},
                      Row{SyncMode_LocalWins, Unchanged, NoItem, false, SyncAction_Upload, false},
                      Row{SyncMode_LocalWins, Missing, ItemSameDate, false, SyncAction_DeleteRemote, false},
                      Row{SyncMode_LocalWins, Missing, NoItem, false, SyncAction_SkipMissingLocal, false},
                      Row{SyncMode_LocalWins, Touched, ItemSameDate, true, SyncAction_Upload, false},
                      Row{SyncMode_LocalWins, Touched, ItemSameDate, true, SyncAction_Nothing, false, true},
                      Row{SyncMode_LocalWins, Changed, ItemSameDate, true, SyncAction_Upload, false, true}));

TEST(DecisionLimits, UploadAtTheSizeLimitIsSkippedOneByteLessGoes)
{
    PrefDirScope prefs;
    testsupport::TempDir work;
    TestCache cache({}, {});
    CachedSyncFile record(SyncFile(FileAt(work / "big.bin"), u"big.bin", u"G", ImmutableString::CreateStatic("t/x"),
                                   SyncMetadata_ModDate, 10));
    WriteFileBytes(work / "big.bin", std::string(10, 'x'));
    EXPECT_EQ(DecideRecord(cache, record, SyncMode_LocalWins).mAction, SyncAction_SkipTooBig);
    WriteFileBytes(work / "big.bin", std::string(9, 'x'));
    EXPECT_EQ(DecideRecord(cache, record, SyncMode_LocalWins).mAction, SyncAction_Upload);
}
