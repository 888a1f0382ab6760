// Syncs failed on the service's side: every kind of request meets every kind
// of failure, and each request of a pass fails in turn. After each
// failed run: the hook fired, an error came (with the service's text where
// there is one), no file was lost or torn and every replaced or removed one
// was backed up, the cache file is as it was, and a sync without faults
// converges.

#include <gtest/gtest.h>

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

class FaultMatrix : public ::testing::Test {
protected:
    static void SetUpTestSuite() { UseStageHost(); }
    static void TearDownTestSuite() { RestoreTimeouts(); }

    // Syncs both folders with `rule` installed, checks what the run left, and
    // then that a sync without faults converges (on `expected` when given).
    // False if the rule never fired: the run then had to pass.
    bool SyncFailing(Stage& stage, const FaultRule& rule, const std::string& label, const FileMap* expected = nullptr)
    {
        const FileMap before = stage.Local();
        const FileMap serverBefore = stage.Server();
        const std::string cacheBefore = stage.CacheFile();
        const std::set<std::string> earlierBackups = stage.BackupDirs();
        const auto hook = stage.Service().Faults().Install(rule);
        const RunResult faulted = stage.Sync(true);
        stage.Service().Faults().Clear();

        // A dropped kept-alive connection before any byte of the answer is
        // resent by libcurl on its own: the service then sees the request
        // twice and the sync may pass. Anything else must fail the sync.
        const bool resent = rule.mAction == FaultAction_CloseBeforeAnswer && hook->Seen() >= 2;
        if (!hook->Fired()) {
            EXPECT_TRUE(faulted.Ok()) << label << ": " << faulted.mError;
        } else if (!resent) {
            EXPECT_GT(faulted.mErrorCount, 0) << label << ": no error came";
            if (rule.mAction == FaultAction_Status) {
                EXPECT_EQ(faulted.mError, rule.mBody) << label;
            }
            EXPECT_EQ(stage.CacheFile(), cacheBefore) << label << ": the cache file changed";
        }
        ExpectNothingLost(before, serverBefore, stage.Local(), stage.Backups(earlierBackups), label);

        const RunResult again = stage.Sync(true);
        EXPECT_TRUE(again.Ok()) << label << ": the sync after the fault failed: " << again.mError;
        EXPECT_EQ(stage.Local(), stage.Server()) << label << ": no convergence";
        if (expected) {
            EXPECT_EQ(stage.Local(), *expected) << label;
        }
        EXPECT_NE(stage.CacheFile(), "<none>") << label;
        return hook->Fired();
    }
};

TEST_F(FaultMatrix, EveryRequestKindMeetsEveryFault)
{
    testsupport::TestService service;
    int cases = 0;
    for (const RequestKind& kind : kKinds) {
        for (const Fault& fault : kFaults) {
            if (fault.mBodyOnly && !kind.mBodyRead) continue;
            const std::string label = std::string(kind.mName) + " / " + fault.mName;
            Stage stage(service, "matrix" + std::to_string(cases));
            stage.PrepareEveryRequestKind();
            if (HasFatalFailure()) return;
            FaultRule rule;
            rule.mMethod = kind.mMethod;
            rule.mPathPattern = kind.mPath;
            rule.mQueryPattern = kind.mQuery;
            rule.mAction = fault.mAction;
            rule.mStatus = fault.mStatus;
            // libcurl judges a stall by the average speed over a few seconds,
            // which the bytes a request sent keep up for a while.
            rule.mDelay = std::chrono::milliseconds(kind.mSendsBody ? 11000 : 2500);
            EXPECT_TRUE(SyncFailing(stage, rule, label)) << label << ": the fault was never met";
            ++cases;
        }
    }
    std::printf("fault matrix: %d cases\n", cases);
}

// Fails request N of the same pass for N = 1, 2, ... until a run passes with
// no fault left to inject; each N on a stage of its own, as a client of its
// own on one shared service, and all of them must end as a run without faults.
TEST_F(FaultMatrix, EachRequestOfAPassFailsInTurn)
{
    testsupport::TestService service;
    FileMap expected;
    for (int n = 0; n <= 300; ++n) {
        Stage stage(service, "sweep" + std::to_string(n));
        stage.PrepareEveryRequestKind();
        std::filesystem::remove(stage.Keep() / "k3.txt");  // two-way brings it back
        if (n == 0) {
            ASSERT_TRUE(stage.Sync(true).Ok());
            expected = stage.Local();
            continue;
        }
        FaultRule rule;
        rule.mPathPattern = ".*";
        rule.mNth = n;
        rule.mBody = "injected failure " + std::to_string(n);
        if (!SyncFailing(stage, rule, "request " + std::to_string(n), &expected)) {
            std::printf("%d requests failed in turn, each run checked\n", n - 1);
            EXPECT_GT(n, 8);  // a transfer for each change at least
            return;
        }
        if (HasFailure()) return;  // one broken N tells enough
    }
    ADD_FAILURE() << "still failing requests after 300";
}

}  // namespace
