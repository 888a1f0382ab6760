// The disk fails under a download or under the cache file, through the
// file-operation seam (as root, permissions prove nothing, so the failure is
// an injected errno). After each fault: the host hears of it, every local
// file holds its old or its new bytes, what was replaced is in a backup, the
// cache file is as it was, and the next sync without faults converges.

#include <gtest/gtest.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <filesystem>

#include "FolderSync.h"
#include "support/FileOpsRecorder.h"

namespace synctest {

namespace {

namespace fs = std::filesystem;

struct DiskFault {
    const char* mName;
    const char* mOperation;
    // The first operation of that kind in the pass whose path ends so. The
    // downloads write their ".temp" files on worker threads in no set order,
    // so an empty end meets whichever download's operation comes first.
    const char* mPathEnd;
    int mError;
};

const DiskFault kDiskFaults[] = {
    {"no space while writing a download", "write", "", ENOSPC},
    {"a download's fsync fails", "fsync", "", EIO},
    {"A's fsync fails", "fsync", "Presets/A.txt.temp", EIO},
    {"the mode change before the swap fails", "chmod", "Presets/A.txt.temp", EIO},
    {"the swap's rename fails", "rename", "Presets/A.txt", EIO},
    {"syncing the folder after the swaps fails", "dirsync", "Presets", EIO},
    {"read-only file system", "open", "", EROFS},
    {"directory not writable", "open", "", EACCES},
    {"the cache file cannot be saved", "rename", "/tolmonetsynccache.json", EIO},
};

using DiskFaults = FolderSync;

TEST_F(DiskFaults, AFailedWriteLosesNothingAndTheNextSyncConverges)
{
    for (const DiskFault& fault : kDiskFaults) {
        SCOPED_TRACE(fault.mName);
        // Two files come down in the faulted pass; only A meets the fault.
        Write("A.txt", std::string("a old ") + fault.mName);
        Write("B.txt", std::string("b old ") + fault.mName);
        Touch(Folder() / "A.txt");
        Touch(Folder() / "B.txt");
        ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
        const std::string cacheBefore = CacheFile();
        const Files before = Local();
        PutItem("Presets", "A.txt", std::string("a new ") + fault.mName);
        PutItem("Presets", "B.txt", std::string("b new ") + fault.mName);

        RunResult failed;
        {
            testsupport::FileOpsRecorder disk;
            disk.FailNext(fault.mOperation, fault.mPathEnd, fault.mError);
            failed = Sync(SyncMode_TwoWay);
            EXPECT_TRUE(disk.AllFailuresMet()) << "the fault was never met";
        }
        EXPECT_FALSE(failed.mFinished);
        EXPECT_GT(failed.mErrorCount, 0);
        EXPECT_NE(failed.mError.find(std::strerror(fault.mError)), std::string::npos) << failed.mError;
        EXPECT_EQ(CacheFile(), cacheBefore);

        const Files after = Local();
        const Files server = Items("Presets");
        const Files backups = Backups();
        // A failed swap leaves its ".temp" for the next download to overwrite;
        // nothing else new may appear.
        for (const auto& file : after) {
            const bool swapTemp = file.first.size() > 5 && file.first.compare(file.first.size() - 5, 5, ".temp") == 0;
            EXPECT_TRUE(before.count(file.first) || swapTemp) << file.first << " was left behind";
        }
        for (const auto& old : before) {
            const auto now = after.find(old.first);
            ASSERT_NE(now, after.end()) << old.first << " is gone";
            if (now->second == old.second) continue;
            EXPECT_EQ(now->second, server.at(old.first)) << old.first << " is torn";
            EXPECT_NE(backups.count(old.first) ? backups.at(old.first).find(old.second) : std::string::npos,
                      std::string::npos)
                << old.first << " was replaced without a backup";
        }

        const RunResult again = Sync(SyncMode_TwoWay);
        EXPECT_TRUE(again.Ok()) << again.mError;
        EXPECT_EQ(Local(), server);
    }
}

}  // namespace

}  // namespace synctest
