// What the host gives the engine: its progress callback, told through every
// batch, and its itemToFile mapping.

#include <algorithm>
#include <mutex>
#include <vector>

#include "FolderSync.h"

namespace synctest {

namespace {

namespace fs = std::filesystem;
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

}  // namespace

}  // namespace synctest
