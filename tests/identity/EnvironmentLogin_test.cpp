// The environment sign-in keeps its state for the whole process and never
// resets it, so each case needs a process of its own: ctest runs every test
// of this binary as a process of its own. Run by hand, only the first case of
// a process runs; the others skip and say why.

#include <gtest/gtest.h>

#include <climits>
#include <cstdlib>

#include "server/FaultHooks.h"
#include "support/IdentityService.h"

namespace {

using namespace testsupport;
using namespace tolmonetsync;

bool sProcessUsed = false;

class EnvironmentLogin : public ::testing::Test {
protected:
    void SetUp() override
    {
        if (sProcessUsed) GTEST_SKIP() << "process-wide sign-in already used in this process; run under ctest";
        sProcessUsed = true;
        setenv("TOLMONETSYNC_USERNAME", "ann", 1);
        setenv("TOLMONETSYNC_PASSWORD", "secret", 1);
    }
    void TearDown() override
    {
        unsetenv("TOLMONETSYNC_USERNAME");
        unsetenv("TOLMONETSYNC_PASSWORD");
    }

    // Counts the sign-ins the service sees; never fires.
    std::shared_ptr<const server::FaultHandle> CountSignIns(IdentityService& service)
    {
        server::FaultRule counter;
        counter.mPathPattern = "/ovra/login/.*";
        counter.mNth = INT_MAX;
        return service.Service().Faults().Install(counter);
    }
};

TEST_F(EnvironmentLogin, OneSignInServesEveryClientOfTheProcess)
{
    IdentityService service;
    const auto signIns = CountSignIns(service);
    const auto first = service.Client(true);
    const auto second = service.Client(true);
    EXPECT_EQ(signIns->Seen(), 1);
    EXPECT_EQ(RootStatus(second), 200);
    // Such a client holds a working token, yet nothing is stored for a check.
    EXPECT_EQ(WaitForState([&](const ConnectionStateCallback& report) { return second->CheckConnection(report); }),
              SyncServer_NotLoggedIn);
}

TEST_F(EnvironmentLogin, SignsInAgainOnceTheServiceRefusesTheKeptToken)
{
    IdentityService service;
    const auto signIns = CountSignIns(service);
    service.Client(true);
    service.Service().GetAccounts().ExpireTokensOf("ann");
    const auto later = service.Client(true);
    EXPECT_EQ(signIns->Seen(), 2);
    EXPECT_EQ(RootStatus(later), 200);
}

TEST_F(EnvironmentLogin, ARefusedSignInLeavesNoClient)
{
    IdentityService service;
    setenv("TOLMONETSYNC_PASSWORD", "wrong", 1);
    try {
        service.Client(true);
        FAIL() << "no exception";
    } catch (const std::runtime_error& e) {
        EXPECT_STREQ(e.what(), "doOvraLogin failed");
    }
    setenv("TOLMONETSYNC_PASSWORD", "secret", 1);  // the next try signs in
    EXPECT_EQ(RootStatus(service.Client(true)), 200);
}

}  // namespace
