// Every kind of request of a sync meets every kind of failure on the
// service's side. Each case starts from a synced state with changes on both
// sides, a stale server group and a new local group, so that every kind of
// request really occurs; then checks that the hook fired, that an error came
// (with the service's text where there is one), that no file was lost or torn
// and every replaced one was backed up, that the cache file is as it was, and
// that a sync without faults converges.

#include <gtest/gtest.h>

#include <cstdio>

#include "ServiceStage.h"

namespace {

using namespace tolmonetsync::server;
using namespace reliability;
using synctest::RunResult;

struct RequestKind {
    const char* mName;
    const char* mMethod;
    const char* mPath;
    const char* mQuery;  // searched for in the query; "" any
    bool mBodyRead;      // the client reads a JSON body from the answer
    bool mSendsBody;     // the request carries a body of its own
};

const RequestKind kKinds[] = {
    {"root", "GET", "/api/collections", "", true, false},
    // A collection's children come from a search scoped to it with no name.
    {"children", "POST", "/api/search", "q=%7b%22trashed", true, true},
    {"search", "POST", "/api/search", "%22name%22", true, true},
    {"create", "POST", "/api/collections", "", false, true},
    {"header after create", "GET", "/api/collections/[^/]+/header", "", true, false},
    {"add", "PUT", "/api/collections/[^/]+/members", "", false, true},
    {"delete by name", "DELETE", "/api/collections/[^/]+", "", false, false},
    {"delete", "DELETE", "/api/assets/[^/]+", "", false, false},
    {"upload", "POST", "/api/assets", "", false, true},
    {"metadata after upload", "GET", "/api/assets/[^/]+/metadata", "", true, false},
    {"download", "GET", "/api/assets/[^/]+", "", false, false},
};

struct Fault {
    const char* mName;
    FaultAction mAction;
    int mStatus;
    bool mBodyOnly;  // only for requests whose bodies the client reads
};

const Fault kFaults[] = {
    {"500 with a body", FaultAction_Status, 500, false},
    {"401", FaultAction_Status, 401, false},
    {"404", FaultAction_Status, 404, false},
    {"closed before an answer", FaultAction_CloseBeforeAnswer, 0, false},
    {"cut in the middle of its body", FaultAction_CloseMidBody, 0, false},
    {"no answer until the stall time-out", FaultAction_Delay, 0, false},
    {"not JSON", FaultAction_NotJson, 0, true},
    {"JSON of the wrong shape", FaultAction_WrongShapeJson, 0, true},
};

const char kBody[] = "injected failure";

class FaultMatrix : public ::testing::Test {
protected:
    static void SetUpTestSuite() { UseStageHost(); }
    static void TearDownTestSuite() { RestoreTimeouts(); }
};

TEST_F(FaultMatrix, EveryRequestKindMeetsEveryFault)
{
    int run = 0, passed = 0;
    std::string table;
    for (const RequestKind& kind : kKinds) {
        for (const Fault& fault : kFaults) {
            if (fault.mBodyOnly && !kind.mBodyRead) continue;
            const std::string label = std::string(kind.mName) + " / " + fault.mName;
            const int failuresBefore =
                ::testing::UnitTest::GetInstance()->current_test_info()->result()->total_part_count();
            ++run;
            Stage stage;
            stage.PrepareEveryRequestKind();
            if (HasFatalFailure()) return;
            const FileMap before = stage.Local();
            const FileMap serverBefore = stage.Server();
            const std::string cacheBefore = stage.CacheFile();

            FaultRule rule;
            rule.mMethod = kind.mMethod;
            rule.mPathPattern = kind.mPath;
            rule.mQueryPattern = kind.mQuery;
            rule.mAction = fault.mAction;
            rule.mStatus = fault.mStatus;
            rule.mBody = kBody;
            // libcurl judges a stall by the average speed over a few seconds,
            // which the bytes a request sent keep up for a while.
            rule.mDelay = std::chrono::milliseconds(kind.mSendsBody ? 11000 : 2500);
            const auto hook = stage.Service().Faults().Install(rule);
            const RunResult faulted = stage.Sync(true);
            stage.Service().Faults().Clear();

            EXPECT_TRUE(hook->Fired()) << label << ": the fault was never met";
            // A dropped kept-alive connection before any byte of the answer is
            // resent by libcurl on its own: the service then sees the request
            // twice and the sync may pass. Anything else must fail the sync.
            const bool resent = fault.mAction == FaultAction_CloseBeforeAnswer && hook->Seen() >= 2;
            if (!resent) {
                EXPECT_GT(faulted.mErrorCount, 0) << label << ": no error came";
                if (fault.mAction == FaultAction_Status) {
                    EXPECT_NE(faulted.mError.find(kBody), std::string::npos) << label << ": " << faulted.mError;
                }
                EXPECT_EQ(stage.CacheFile(), cacheBefore) << label << ": the cache file changed";
            }
            ExpectNothingLost(before, serverBefore, stage.Local(), stage.Backups(), label);

            const RunResult again = stage.Sync(true);
            EXPECT_TRUE(again.Ok()) << label << ": the sync after the fault failed: " << again.mError;
            EXPECT_EQ(stage.Local(), stage.Server()) << label << ": no convergence";
            EXPECT_NE(stage.CacheFile(), "<none>") << label;

            const bool ok =
                ::testing::UnitTest::GetInstance()->current_test_info()->result()->total_part_count() == failuresBefore;
            passed += ok ? 1 : 0;
            char line[160];
            std::snprintf(line, sizeof line, "  %-24s %-36s %s%s\n", kind.mName, fault.mName, ok ? "passed" : "FAILED",
                          resent ? " (resent by libcurl, sync passed)" : "");
            table += line;
        }
    }
    std::printf("fault matrix:\n%s%d cases run, %d passed\n", table.c_str(), run, passed);
    EXPECT_EQ(passed, run);
}

}  // namespace
