// The environment sign-in keeps its state for the whole process and never
// resets it, so its whole life is one test: a refusal keeps nothing, one
// sign-in serves every client, and a refused token brings a new sign-in.

#include <gtest/gtest.h>

#include <climits>
#include <cstdlib>

#include "server/FaultHooks.h"
#include "support/IdentityService.h"

namespace {

using namespace testsupport;
using namespace tolmonetsync;

TEST(EnvironmentLogin, OneSignInServesTheProcessUntilTheServiceRefusesItsToken)
{
    IdentityService service;
    // Counts the sign-ins the service sees; never fires.
    server::FaultRule counter;
    counter.mPathPattern = "/ovra/login/.*";
    counter.mNth = INT_MAX;
    const auto signIns = service.Service().Faults().Install(counter);
    setenv("TOLMONETSYNC_USERNAME", "ann", 1);

    setenv("TOLMONETSYNC_PASSWORD", "wrong", 1);
    try {
        service.Client(true);
        FAIL() << "no exception";
    } catch (const std::runtime_error& e) {
        EXPECT_STREQ(e.what(), "doOvraLogin failed");
    }

    setenv("TOLMONETSYNC_PASSWORD", "secret", 1);  // the next try signs in
    const auto first = service.Client(true);
    const auto second = service.Client(true);
    EXPECT_EQ(signIns->Seen(), 2);
    EXPECT_EQ(RootStatus(second), 200);
    // Such a client holds a working token, yet nothing is stored for a check.
    EXPECT_EQ(WaitForState([&](const ConnectionStateCallback& report) { return second->CheckConnection(report); }),
              SyncServer_NotLoggedIn);

    service.Service().GetAccounts().ExpireTokensOf("ann");
    const auto later = service.Client(true);
    EXPECT_EQ(signIns->Seen(), 3);
    EXPECT_EQ(RootStatus(later), 200);
    unsetenv("TOLMONETSYNC_USERNAME");
    unsetenv("TOLMONETSYNC_PASSWORD");
}

}  // namespace
