// What the host gives the engine and hears back from it: its progress
// callback through every batch, its itemToFile mapping, and a cache file that
// cannot be saved.

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <mutex>
#include <vector>

#include "FolderSync.h"
#include "support/FileOpsRecorder.h"

namespace synctest {

namespace {

namespace fs = std::filesystem;
using testsupport::WriteFileBytes;
using HostCallbacks = FolderSync;

TEST_F(HostCallbacks, ProgressRisesToOneInEachBatchOfThePrepareChainAndThePass)
{
    // Every batch has work: a stale group, a missing group, groups to list,
    // and uploads and a download in the pass.
    PutItem("Stale", "x.txt", "x");
    PutItem("Presets", "Down.txt", "down");
    for (const char* name : {"Up1.txt", "Up2.txt", "Up3.txt"}) Write(name, name);
    std::mutex mutex;
    std::vector<float> values;
    const RunResult result = NewHost()->Sync(SyncMode_TwoWay, [&](float done) {
        std::lock_guard<std::mutex> lock(mutex);
        values.push_back(done);
    });
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(result.mMoved, 4);

    // Each batch counts from 0 towards 1.0 and ends with 1.0.
    std::vector<std::vector<float>> batches(1);
    for (float done : values) {
        batches.back().push_back(done);
        if (done == 1.0f) batches.emplace_back();
    }
    ASSERT_FALSE(values.empty());
    EXPECT_EQ(values.back(), 1.0f);
    batches.pop_back();
    ASSERT_EQ(batches.size(), 4u);  // delete, create, list; the pass
    for (const std::vector<float>& batch : batches) {
        EXPECT_TRUE(std::is_sorted(batch.begin(), batch.end()));
        EXPECT_GE(batch.front(), 0.0f);
    }
    EXPECT_EQ(batches.back().size(), 5u);  // four requests, then the end
}

TEST_F(HostCallbacks, TheHostsItemToFileNamesTheFilesServerItemsArriveIn)
{
    PutItem("Presets", "Remote.txt", "remote");
    Write("Local.txt", "local");
    std::vector<std::string> asked;
    const ItemToFileCallback toFile = [&](const Dir& dir, const boost::shared_ptr<Item>& item) {
        asked.push_back(tolmocore::utility::ToNarrow(item->mName));
        return File(dir, UTF16String(u"host-") + item->mName);
    };
    const RunResult result = NewHost()->Sync(SyncMode_TwoWay, ProgressCallback(), toFile);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(asked, (std::vector<std::string>{"Remote.txt"}));
    EXPECT_EQ(Local(), (Files{{"Local.txt", "local"}, {"host-Remote.txt", "remote"}}));
}

TEST_F(HostCallbacks, ACacheFileThatCannotBeSavedReachesTheHostAndLosesNothing)
{
    struct Fault {
        const char* mOperation;
        const char* mPathEnd;
        int mError;
    };
    for (const Fault& fault : {Fault{"rename", "/tolmonetsynccache.json", EIO}, Fault{"write", "", ENOSPC}}) {
        SCOPED_TRACE(fault.mOperation);
        Write("A.txt", "a1");
        Touch(Folder() / "A.txt");
        ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
        const std::string cacheBefore = CacheFile();
        PutItem("Presets", "A.txt", "a2");
        const std::string swapped = (Folder() / "A.txt").string();

        RunResult failed;
        {
            // The cache file is saved after the download's swap.
            testsupport::FileOpsRecorder disk;
            disk.FailNext(fault.mOperation, fault.mPathEnd, fault.mError, "rename " + swapped + ".temp -> " + swapped);
            failed = Sync(SyncMode_TwoWay);
            EXPECT_TRUE(disk.AllFailuresMet());
        }
        EXPECT_FALSE(failed.mFinished);
        EXPECT_NE(failed.mError.find(std::strerror(fault.mError)), std::string::npos) << failed.mError;
        EXPECT_EQ(CacheFile(), cacheBefore);
        EXPECT_EQ(Local(), (Files{{"A.txt", "a2"}}));
        EXPECT_NE(Backups()["A.txt"].find("a1"), std::string::npos);

        const RunResult again = Sync(SyncMode_TwoWay);
        ASSERT_TRUE(again.Ok()) << again.mError;
        EXPECT_EQ(Items("Presets"), Local());
    }
}

}  // namespace

}  // namespace synctest
