// What a host sees of the service before and around a sync.

#include <gtest/gtest.h>

#include "support/SyncHarness.h"
#include "sync/SyncFilesService.h"

using namespace synctest;
using testsupport::WriteFileBytes;

namespace {

// A service whose server is never asked: registration and the small queries.
class FrameService final : public SyncFilesService {
public:
    FrameService() : SyncFilesService(ParameterList()) {}
    const boost::shared_ptr<SyncServer>& GetApi() const override { return mNoServer; }
    SyncServiceType GetType() const override { return SyncServiceType_Tarnvault; }
    boost::shared_ptr<SyncCache> CreateCache(const std::vector<SyncFile>& files, const std::vector<SyncDir>& dirs,
                                             const ProgressCallback&, const ItemToFileCallback&) override
    {
        return boost::shared_ptr<SyncCache>(new TestCache(files, dirs));
    }

private:
    boost::shared_ptr<SyncServer> mNoServer;
};

class ServiceFrameTest : public ::testing::Test {
protected:
    SyncFile FileNamed(const char* name, const char* group = "G")
    {
        return SyncFile(FileAt(mWork / name), tolmocore::utility::ToUTF16(name), tolmocore::utility::ToUTF16(group),
                        ImmutableString::CreateStatic("text/plain"), SyncMetadata_ModDate, 100);
    }
    SyncDir DirWith(const char* extension)
    {
        return SyncDir(DirAt(mWork.Path()), tolmocore::utility::ToUTF16(extension), u"G",
                       ImmutableString::CreateStatic("text/plain"), SyncMetadata_ModDate, 100);
    }

    PrefDirScope mPrefs;
    testsupport::TempDir mWork;
    FrameService mService;
};

}  // namespace

TEST_F(ServiceFrameTest, ASecondRegistrationOfAFileOrDirectoryKeepsTheFirst)
{
    EXPECT_TRUE(mService.RegisterSyncFile(FileNamed("a.txt", "First")));
    EXPECT_FALSE(mService.RegisterSyncFile(FileNamed("a.txt", "Second")));
    ASSERT_EQ(mService.SyncFiles().size(), 1u);
    EXPECT_EQ(mService.SyncFiles()[0].mCollectionName, UTF16String(u"First"));
    EXPECT_TRUE(mService.UnregisterSyncFile(FileAt(mWork / "a.txt")));
    EXPECT_FALSE(mService.UnregisterSyncFile(FileAt(mWork / "a.txt")));

    EXPECT_TRUE(mService.RegisterSyncDirectory(DirWith(".xmp")));
    EXPECT_FALSE(mService.RegisterSyncDirectory(DirWith(".txt")));
    EXPECT_EQ(mService.SyncDirs()[0].mExtension, UTF16String(u".xmp"));
    EXPECT_FALSE(mService.UnregisterSyncDirectory(DirAt(mWork / "elsewhere")));
    EXPECT_TRUE(mService.UnregisterSyncDirectory(DirAt(mWork.Path())));
}

TEST_F(ServiceFrameTest, LatestSyncDateFollowsTheCacheFile)
{
    EXPECT_TRUE(mService.GetLatestSyncDate().is_not_a_date_time());
    mService.DeleteCaches();  // no file: nothing happens
    WriteFileBytes(mPrefs.Path() / "tolmonetsynccache.json", "[]");
    EXPECT_FALSE(mService.GetLatestSyncDate().is_not_a_date_time());
    mService.DeleteCaches();
    EXPECT_FALSE(std::filesystem::exists(mPrefs.Path() / "tolmonetsynccache.json"));
    EXPECT_TRUE(mService.GetLatestSyncDate().is_not_a_date_time());
}

TEST_F(ServiceFrameTest, ScanGivesDirectoryFilesRecordsWithinTheirLimit)
{
    WriteFileBytes(mWork / "small.xmp", std::string(99, 'x'));
    WriteFileBytes(mWork / "limit.xmp", std::string(100, 'x'));  // exactly the limit: no record
    WriteFileBytes(mWork / "other.txt", "x");
    TestCache cache({FileNamed("registered.txt")}, {DirWith(".xmp")});
    cache.PrepareSync();
    ASSERT_EQ(cache.mFiles.size(), 2u);
    EXPECT_EQ(cache.mFiles[0].mName, UTF16String(u"registered.txt"));
    EXPECT_EQ(cache.mFiles[1].mName, UTF16String(u"small.xmp"));
    EXPECT_EQ(cache.mStatus.load(), SyncStatus_Prepared);
}

TEST_F(ServiceFrameTest, ServerItemsGetRecordsWithServerLimitsAndHostileNamesAreLeftOut)
{
    WriteFileBytes(mWork / "local.xmp", "x");
    TestCache cache({}, {DirWith(".xmp")});
    boost::shared_ptr<Collection> group(new Collection);
    group->mName = u"G";
    for (const char16_t* name : {u"local.xmp", u"remote.png", u"../escape.xmp", u"a/b.xmp", u""}) {
        boost::shared_ptr<Item> item(new Item);
        item->mName = name;
        item->mContentType = "image/png";
        group->mChildren.push_back(item);
    }
    boost::shared_ptr<Collection> nested(new Collection);
    nested->mName = u"nested";
    group->mChildren.push_back(nested);
    cache.mCollections.push_back(group);

    TraceCapture trace("tolmonetsync:1");
    cache.PrepareSync();
    ASSERT_EQ(cache.mFiles.size(), 2u);
    EXPECT_EQ(cache.mFiles[0].mName, UTF16String(u"local.xmp"));  // the directory's record, no twin
    const CachedSyncFile& remote = cache.mFiles[1];
    EXPECT_EQ(remote.mName, UTF16String(u"remote.png"));  // another extension still gets one
    EXPECT_EQ(remote.mMaxSize, kServerRecordMaxSize);
    EXPECT_EQ(remote.mMimeType.ToStdString(), "image/png");
    EXPECT_FALSE(std::filesystem::exists(mWork.Path().parent_path() / "escape.xmp"));
    EXPECT_TRUE(trace.Contains("escape.xmp"));
    EXPECT_TRUE(trace.Contains("Unexpected collection: "));

    // A lookup by name finds the first item so named, as a walk would, also
    // after uploads append and after a fetch replaces the children.
    EXPECT_FALSE(cache.GetItem(FileNamed("nested")));
    boost::shared_ptr<Item> first(new Item), later(new Item);
    first->mName = later->mName = u"twin.xmp";
    group->mChildren.push_back(first);
    group->mChildren.push_back(later);
    EXPECT_EQ(cache.GetItem(FileNamed("twin.xmp")), first);
    group->mChildren = {later};
    EXPECT_EQ(cache.GetItem(FileNamed("twin.xmp")), later);
}
