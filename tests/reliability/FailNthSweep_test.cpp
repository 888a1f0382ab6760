// Fails the Nth request of a whole sync on the service's side, for N = 1, 2,
// 3, ... until a sync passes with no fault left to inject: for the first pass
// of a new computer and for a later pass with changes on both sides. Every N
// runs on a stage of its own, so that each fails the same sync at another
// request (as a client of its own on one service). After every run: the error callback got the fault's text first, no
// file was lost or torn and whatever was replaced or removed is in the run's
// backup directory, the cache file is as it was, and a sync without faults
// converges.

#include <gtest/gtest.h>

#include <cstdio>
#include <functional>

#include "ServiceStage.h"

namespace {

using namespace tolmonetsync::server;
using namespace reliability;
using synctest::RunResult;
using testsupport::WriteFileBytes;

const int kKeepFiles = 12;
const int kFreshFiles = 4;
// Far above the requests of either pass; reaching it means the sweep never ended.
const int kMaxRequests = 300;

std::string KeepName(int index)
{
    return (index < 10 ? "k0" : "k") + std::to_string(index) + ".txt";
}

std::string FreshName(int index)
{
    return "f" + std::to_string(index) + ".txt";
}

class FailNthSweep : public ::testing::Test {
protected:
    static void SetUpTestSuite() { UseStageHost(); }
    static void TearDownTestSuite() { RestoreTimeouts(); }

    // Stages the sync to fail; returns both sides' contents once it has run.
    using Staging = std::function<FileMap(Stage&)>;

    // Fails request N of the staged sync for every N in turn; the count of
    // faults injected, or -1 if the sweep did not end.
    int Sweep(const std::string& pass, const Staging& staging)
    {
        const testsupport::TempDir data;
        const std::unique_ptr<LocalService> service = StartStageService(data.Path());
        for (int n = 1; n <= kMaxRequests; ++n) {
            const std::string label = pass + ", request " + std::to_string(n);
            Stage stage(*service, "sweep" + std::to_string(n));
            const FileMap expected = staging(stage);
            if (HasFailure()) return -1;
            const FileMap before = stage.Local();
            const FileMap serverBefore = stage.Server();
            const std::string cacheBefore = stage.CacheFile();
            const std::set<std::string> backupDirsBefore = stage.BackupDirs();

            FaultRule rule;
            rule.mPathPattern = ".*";
            rule.mNth = n;
            rule.mAction = FaultAction_Status;
            rule.mStatus = 500;
            rule.mBody = "injected failure " + std::to_string(n);
            const auto hook = stage.Service().Faults().Install(rule);
            const RunResult faulted = stage.Sync(true);
            stage.Service().Faults().Clear();

            if (!hook->Fired()) {
                // Every request of the sync has failed once: this one must pass.
                EXPECT_TRUE(faulted.Ok()) << label << ": " << faulted.mError;
                EXPECT_EQ(stage.Local(), expected) << label;
                EXPECT_EQ(stage.Server(), expected) << label;
                EXPECT_NE(stage.CacheFile(), "<none>") << label;
                return n - 1;
            }
            EXPECT_GT(faulted.mErrorCount, 0) << label << ": no error came";
            EXPECT_EQ(faulted.mError, rule.mBody) << label;
            EXPECT_EQ(stage.CacheFile(), cacheBefore) << label << ": the cache file changed";
            ExpectNothingLost(before, serverBefore, stage.Local(), stage.Backups(backupDirsBefore), label);

            const RunResult again = stage.Sync(true);
            EXPECT_TRUE(again.Ok()) << label << ": the sync after the fault failed: " << again.mError;
            EXPECT_EQ(stage.Local(), expected) << label << ": no convergence";
            EXPECT_EQ(stage.Server(), expected) << label << ": no convergence";
            EXPECT_NE(stage.CacheFile(), "<none>") << label;
            if (HasFailure()) return -1;  // one broken N tells enough
        }
        ADD_FAILURE() << pass << ": still failing requests after " << kMaxRequests;
        return -1;
    }
};

TEST_F(FailNthSweep, FirstPassOfANewComputer)
{
    const int faults = Sweep("first pass", [](Stage& stage) {
        FileMap expected;
        for (int i = 1; i <= kKeepFiles; ++i) {
            WriteFileBytes(stage.Keep() / KeepName(i), KeepName(i) + " here");
            expected["Keep/" + KeepName(i)] = KeepName(i) + " here";
        }
        for (int i = 1; i <= kFreshFiles; ++i) {
            WriteFileBytes(stage.Fresh() / FreshName(i), FreshName(i) + " here");
            expected["Fresh/" + FreshName(i)] = FreshName(i) + " here";
        }
        return expected;
    });
    std::printf("first pass: %d requests failed in turn, each run checked\n", faults);
    EXPECT_GT(faults, kKeepFiles + kFreshFiles);  // at least an upload each
}

TEST_F(FailNthSweep, LaterPassWithChangesOnBothSides)
{
    const int faults = Sweep("later pass", [](Stage& stage) {
        FileMap expected;
        for (int i = 1; i <= kKeepFiles; ++i) {
            WriteFileBytes(stage.Keep() / KeepName(i), KeepName(i) + " old");
            expected["Keep/" + KeepName(i)] = KeepName(i) + " old";
        }
        const RunResult first = stage.Sync(false);
        EXPECT_TRUE(first.Ok()) << first.mError;
        if (!first.Ok()) return expected;
        // Another computer replaced two, removed one and added one. A two-way
        // sync brings a removed file back, on either side.
        for (const std::string& name : {KeepName(1), KeepName(2), std::string("n1.txt")}) {
            stage.PutOnServer("Keep", name, name + " from the server");
            expected["Keep/" + name] = name + " from the server";
        }
        stage.RemoveFromServer("Keep", KeepName(3));
        // Here two changed, one removed, one new and a new group.
        for (const std::string& name : {KeepName(4), KeepName(5), KeepName(kKeepFiles + 1)}) {
            WriteFileBytes(stage.Keep() / name, name + " changed here");
            expected["Keep/" + name] = name + " changed here";
        }
        std::filesystem::remove(stage.Keep() / KeepName(6));
        for (int i = 1; i <= kFreshFiles; ++i) {
            WriteFileBytes(stage.Fresh() / FreshName(i), FreshName(i) + " new");
            expected["Fresh/" + FreshName(i)] = FreshName(i) + " new";
        }
        stage.AddStaleGroup();
        return expected;
    });
    std::printf("later pass: %d requests failed in turn, each run checked\n", faults);
    EXPECT_GT(faults, 8);  // a transfer for each change at least
}

}  // namespace
