// The sync scenarios against the in-memory server.

#include "InMemoryScenarioServer.h"
#include "SyncScenarios.h"

namespace synctest {

INSTANTIATE_TEST_SUITE_P(InMemory, SyncScenarios, ::testing::Values(ScenarioServerFactory([] {
                             return std::unique_ptr<ScenarioServer>(new InMemoryScenarioServer);
                         })),
                         [](const ::testing::TestParamInfo<ScenarioServerFactory>&) { return "Server"; });

}  // namespace synctest
