// The sync scenarios against the real client and the local service over
// loopback, once for each way the service may spell its answers.

#include "SyncScenarios.h"

namespace synctest {

namespace {

using namespace tolmonetsync::server;

struct NamedStyle {
    const char* mName;
    AnswerStyle mStyle;
};

NamedStyle Style(const char* name, IdForm ids, bool absoluteLocation, HeaderCase headers, bool sizeAsString,
                 bool fractions)
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
    Style("Plain", IdForm_Plain, false, HeaderCase_Usual, false, true),
    Style("PathIdsAbsoluteLocationLowerHeaders", IdForm_Path, true, HeaderCase_Lower, true, false),
    Style("UrlOnlyUpperHeaders", IdForm_UrlOnly, false, HeaderCase_Upper, false, true),
};

std::vector<AnswerStyle> Styles()
{
    std::vector<AnswerStyle> styles;
    for (const NamedStyle& named : kStyles) styles.push_back(named.mStyle);
    return styles;
}

}  // namespace

INSTANTIATE_TEST_SUITE_P(LocalService, SyncScenarios, ::testing::ValuesIn(Styles()),
                         [](const ::testing::TestParamInfo<AnswerStyle>& info) { return kStyles[info.index].mName; });

}  // namespace synctest
