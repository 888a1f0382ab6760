// The cache file: what survives between runs, and that a bad file is traced
// and ignored, never a crash.

#include <gtest/gtest.h>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "assets/ChildrenMutex.h"
#include "support/SyncHarness.h"

using namespace synctest;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
namespace fs = std::filesystem;
using boost::posix_time::time_from_string;

namespace {

class CacheFileTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        WriteFileBytes(mWork / "a.xmp", "a");
        WriteFileBytes(mWork / "b.xmp", "b");
    }

    std::vector<SyncFile> Registered()
    {
        return {SyncFile(FileAt(mWork / "a.xmp"), u"a.xmp", u"Group", ImmutableString::CreateStatic("text/xml"),
                         SyncMetadata_ModDate, 1000),
                SyncFile(FileAt(mWork / "b.xmp"), u"b.xmp", u"Group", ImmutableString::CreateStatic("text/xml"),
                         SyncMetadata_Checksum, 1000)};
    }
    // A plan whose group on the server holds an item for a.xmp.
    std::unique_ptr<TestCache> Plan()
    {
        std::unique_ptr<TestCache> cache(new TestCache(Registered(), {}));
        boost::shared_ptr<Collection> group(new Collection);
        group->mName = u"Group";
        boost::shared_ptr<Item> item(new Item);
        item->mName = u"a.xmp";
        item->mModified = kServerDate;
        group->mChildren.push_back(item);
        cache->mCollections.push_back(group);
        return cache;
    }
    fs::path CacheFilePath() { return mPrefs.Path() / "tolmonetsynccache.json"; }

    const boost::posix_time::ptime kServerDate = time_from_string("2024-05-06 07:08:09.123456");
    PrefDirScope mPrefs;
    testsupport::TempDir mWork;
};

}  // namespace

TEST_F(CacheFileTest, SavedValuesComeBackThroughTheRealReader)
{
    auto first = Plan();
    first->LoadCache();
    first->mFiles[0].mCachedServerEtag = "\"etag-1\"";
    first->mFiles[0].mCachedServerModDate = kServerDate;
    first->SaveCache();
    const std::string text = ReadFileBytes(CacheFilePath());
    EXPECT_EQ(text.front(), '[');
    EXPECT_NE(text.find("2024-May-06 07:08:09.123456"), std::string::npos);

    auto second = Plan();
    second->LoadCache();
    const CachedSyncFile& a = second->mFiles[0];
    EXPECT_EQ(a.mCachedServerEtag.ToStdString(), "\"etag-1\"");
    EXPECT_EQ(a.mCachedServerModDate, kServerDate);
    EXPECT_EQ(a.mCachedLocalModDate, first->mFiles[0].mLocalModDate);
    EXPECT_EQ(a.mServerModDate, kServerDate);  // from the item, not the file
    const CachedSyncFile& b = second->mFiles[1];
    EXPECT_FALSE(b.mCachedLocalChecksum.IsNil());
    EXPECT_EQ(b.mCachedLocalChecksum, first->mFiles[1].mLocalChecksum);
    EXPECT_TRUE(b.mCachedLocalModDate.is_not_a_date_time());  // the checksum record keeps no date
    EXPECT_TRUE(b.mServerModDate.is_not_a_date_time());       // no item on the server
}

TEST_F(CacheFileTest, BadOrHugeFilesAreTracedAndIgnoredAndLeftInPlace)
{
    const std::string good = R"([{"mName":"a.xmp","mMimeType":"text/xml","mCollectionName":"Group",
        "mCachedServerEtag":"e","mCachedServerModDate":"2024-May-06 07:08:09","mCachedLocalModDate":"",
        "mCachedLocalChecksum":"00000000-0000-0000-0000-000000000000"}])";
    const std::vector<std::string> bad = {
        good.substr(0, good.size() / 2),                                         // truncated
        R"({"mName":"a.xmp"})",                                                  // not an array
        R"([{"mName":"a.xmp","mCachedServerEtag":7}])",                          // not a string
        R"([{"mName":"a.xmp","mCachedLocalChecksum":"ABC"}])",                   // identifier of the wrong length
        R"([{"mName":"a.xmp","mCachedServerModDate":"soon"}])",                  // no date
        R"([{"mName":"a.xmp","mCachedServerModDate":"9999-Dec-31 48:00:00"}])",  // reads past year 9999
        R"([{"mName":"a.xmp","mCachedServerModDate":"4084-May-06 000000557100000-"}])",    // wraps out of range
        R"([{"mName":"a.xmp","mCachedServerModDate":"2024-May-06 -0000-000/00000001"}])",  // not the written form
        std::string("\xFF\xFE[", 3),                                                       // not text
        std::string(200000, '['),                                                          // nested past any sane depth
    };
    for (const std::string& text : bad) {
        WriteFileBytes(CacheFilePath(), text);
        TraceCapture trace("tolmonetsync:1");
        auto cache = Plan();
        cache->LoadCache();
        EXPECT_TRUE(trace.Contains("LoadCache error: ")) << text.substr(0, 60);
        EXPECT_TRUE(cache->mFiles[0].mCachedServerEtag.empty());
        EXPECT_FALSE(cache->mFiles[0].mLocalModDate.is_not_a_date_time());  // present state still read
        EXPECT_EQ(ReadFileBytes(CacheFilePath()), text);
    }
    fs::resize_file(CacheFilePath(), 65ull * 1024 * 1024);  // sparse: costs no disk
    TraceCapture trace("tolmonetsync:1");
    Plan()->LoadCache();
    EXPECT_TRUE(trace.Contains("LoadCache error: ")) << "a huge file was read";
}

TEST_F(CacheFileTest, EntriesMatchByNameGroupAndMediaTypeFirstOneWins)
{
    WriteFileBytes(CacheFilePath(), R"([
        {"mName":"a.xmp","mMimeType":"image/png","mCollectionName":"Group","mCachedServerEtag":"other type"},
        {"mName":"a.xmp","mCachedServerEtag":"dropped","mMimeType":"text/xml","mCollectionName":"Group",
         "mCachedServerEtag":"first"},
        {"mName":"a.xmp","mMimeType":"text/xml","mCollectionName":"Group","mCachedServerEtag":"second"},
        {"mName":"b.xmp","mMimeType":"text/xml","mCollectionName":"Group","mCachedServerEtag":"b's"}])");
    fs::remove(mWork / "b.xmp");
    auto cache = Plan();
    cache->LoadCache();
    EXPECT_EQ(cache->mFiles[0].mCachedServerEtag.ToStdString(), "first") << "the last of a key wins";
    // A matching entry whose local file is gone is ignored: the record stays blank.
    EXPECT_TRUE(cache->mFiles[1].mCachedServerEtag.empty());
}

TEST_F(CacheFileTest, SavedFileIsPrivateAndReplacesALinkPlantedAtItsName)
{
    WriteFileBytes(mWork / "victim", "someone else's");
    fs::permissions(mWork / "victim", static_cast<fs::perms>(0644));
    fs::create_symlink(mWork / "victim", CacheFilePath());
    Plan()->SaveCache();
    EXPECT_FALSE(fs::is_symlink(CacheFilePath()));
    EXPECT_EQ(fs::status(CacheFilePath()).permissions(), fs::perms::owner_read | fs::perms::owner_write);
    EXPECT_NE(ReadFileBytes(CacheFilePath()).find("a.xmp"), std::string::npos);
    EXPECT_EQ(ReadFileBytes(mWork / "victim"), "someone else's");
    EXPECT_EQ(fs::status(mWork / "victim").permissions(), static_cast<fs::perms>(0644));
}
