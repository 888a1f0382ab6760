// The sync scenarios against the real client and the local service over
// loopback: the same suite the in-memory server passes.

#include "LocalScenarioServer.h"
#include "SyncScenarios.h"

namespace synctest {

INSTANTIATE_TEST_SUITE_P(LocalService, SyncScenarios, ::testing::Values(ScenarioServerFactory([] {
                             return std::unique_ptr<ScenarioServer>(new LocalScenarioServer);
                         })),
                         [](const ::testing::TestParamInfo<ScenarioServerFactory>&) { return "Http"; });

}  // namespace synctest
