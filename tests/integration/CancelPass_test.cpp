// CancelAll in the middle of a pass against the real service: the service
// holds every download, the host cancels, and each request ends as cancelled.
// The cancel is told, nothing local changed, the cache file is byte for byte
// the same, no ".temp" is left, and the next sync converges.

#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <thread>

#include "FolderSync.h"
#include "server/FaultHooks.h"

namespace synctest {

namespace {

using tolmonetsync::server::FaultAction_Delay;
using tolmonetsync::server::FaultHandle;
using tolmonetsync::server::FaultRule;

const char* const kNames[] = {"A.txt", "B.txt", "C.txt"};

using CancelPass = FolderSync;

TEST_F(CancelPass, CancelAllEndsEveryHeldDownloadAndChangesNothing)
{
    for (const char* name : kNames) Write(name, std::string("old ") + name);
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    for (const char* name : kNames) PutItem("Presets", name, std::string("new ") + name);
    const std::string cacheBefore = CacheFile();
    const Files before = Local();

    // The service holds each download far longer than the cancel takes to
    // land; a download that the cancel misses comes through and is seen.
    std::vector<std::shared_ptr<const FaultHandle>> holds;
    for (int nth = 1; nth <= 3; ++nth) {
        FaultRule rule;
        rule.mMethod = "GET";
        rule.mPathPattern = "/api/assets/[^/]+";
        rule.mNth = nth;
        rule.mAction = FaultAction_Delay;
        rule.mDelay = std::chrono::seconds(8);
        holds.push_back(mService->Faults().Install(rule));
    }

    const std::unique_ptr<SyncHarness> host = NewHost();
    const RunResult prepared = host->Prepare();
    ASSERT_TRUE(prepared.Ok()) << prepared.mError;
    testsupport::TraceCapture trace("Tarnvault:1");
    RunResult cancelled;
    std::thread pass([&] { cancelled = host->Pass(prepared.mCache, SyncMode_TwoWay); });
    // Waits until the service holds all three; the bound only keeps a lost
    // request from hanging the test.
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(30);
    while (!(holds[0]->Fired() && holds[1]->Fired() && holds[2]->Fired()) &&
           std::chrono::steady_clock::now() < deadline)
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    prepared.mCache->CancelAll();
    pass.join();
    mService->Faults().Clear();

    for (const auto& hold : holds) EXPECT_TRUE(hold->Fired());
    EXPECT_FALSE(cancelled.mFinished);
    EXPECT_NE(cancelled.mError.find("Request cancelled"), std::string::npos) << cancelled.mError;
    // Each download's answer was the cancel, none the service's.
    EXPECT_EQ(trace.CountWith("body: Request cancelled"), 3u);
    EXPECT_EQ(CacheFile(), cacheBefore);
    EXPECT_EQ(Local(), before);  // old bytes, and no ".temp" beside them

    const RunResult again = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(again.Ok()) << again.mError;
    EXPECT_EQ(again.mMoved, 3);
    EXPECT_EQ(Local(), Items("Presets"));
}

}  // namespace

}  // namespace synctest
