// The sync scenarios against the real client and the local service over
// loopback: the same suite the in-memory server passes, once for each way the
// service may spell its answers.

#include "LocalScenarioServer.h"
#include "SyncScenarios.h"

namespace synctest {

namespace {

using tolmonetsync::server::AnswerStyle;

struct NamedStyle {
    const char* mName;
    AnswerStyle mStyle;
};

NamedStyle Style(const char* name, tolmonetsync::server::IdForm ids, bool absoluteLocation,
                 tolmonetsync::server::HeaderCase headers, bool sizeAsString, bool fractions)
{
    AnswerStyle style;
    style.mIdForm = ids;
    style.mAbsoluteLocation = absoluteLocation;
    style.mHeaderCase = headers;
    style.mSizeAsString = sizeAsString;
    style.mFractionalSeconds = fractions;
    return {name, style};
}

const NamedStyle kStyles[] = {
    Style("Plain", tolmonetsync::server::IdForm_Plain, false, tolmonetsync::server::HeaderCase_Usual, false, true),
    Style("PathIdsAbsoluteLocationLowerHeaders", tolmonetsync::server::IdForm_Path, true,
          tolmonetsync::server::HeaderCase_Lower, true, false),
    Style("UrlOnlyUpperHeaders", tolmonetsync::server::IdForm_UrlOnly, false, tolmonetsync::server::HeaderCase_Upper,
          false, true),
};

std::string StyleName(const ScenarioServerFactory&, std::size_t index) { return kStyles[index].mName; }

std::vector<ScenarioServerFactory> Factories()
{
    std::vector<ScenarioServerFactory> factories;
    for (const NamedStyle& named : kStyles) {
        const AnswerStyle style = named.mStyle;
        factories.push_back([style] { return std::unique_ptr<ScenarioServer>(new LocalScenarioServer(style)); });
    }
    return factories;
}

}  // namespace

INSTANTIATE_TEST_SUITE_P(LocalService, SyncScenarios, ::testing::ValuesIn(Factories()),
                         [](const ::testing::TestParamInfo<ScenarioServerFactory>& info) {
                             return StyleName(info.param, info.index);
                         });

}  // namespace synctest
