// What the host sets and what the library hands to the desktop.

#include <gtest/gtest.h>

#include <vector>

#include "foundation/core/HostConfig.h"
#include "foundation/core/Localizer.h"
#include "foundation/core/Opener.h"

using namespace tolmocore;

TEST(Localizer, DefaultTextAfterTheEqualsSign)
{
    config::Localizer& localizer = config::Localizer::Get();
    EXPECT_EQ(localizer.Localize("$$$/tolmonetsync/Login/Title=Sign In"), UTF16String(u"Sign In"));
    EXPECT_EQ(localizer.Localize("$$$/tolmonetsync/Empty="), UTF16String());
    EXPECT_EQ(localizer.Localize("$$$/tolmonetsync/Math=1 + 1 = 2"), UTF16String(u"1 + 1 = 2"));
    EXPECT_EQ(localizer.Localize("plain text"), UTF16String(u"plain text"));
    EXPECT_EQ(localizer.Localize(nullptr), UTF16String());
}

TEST(Localizer, InstalledTranslationWinsForItsKeyOnly)
{
    config::Localizer& localizer = config::Localizer::Get();
    localizer.AddTranslations({{"tolmonetsync/Login/Title", UTF16String(u"Anmelden")}});
    EXPECT_EQ(localizer.Localize("$$$/tolmonetsync/Login/Title=Sign In"), UTF16String(u"Anmelden"));
    EXPECT_EQ(localizer.Localize("$$$/tolmonetsync/Login/Other=Other"), UTF16String(u"Other"));
    localizer.ClearTranslations();
    EXPECT_EQ(localizer.Localize("$$$/tolmonetsync/Login/Title=Sign In"), UTF16String(u"Sign In"));
}

TEST(HostConfig, ValuesSetByTheHostAreRead)
{
    config::SetCompanyName(UTF16String(u"Example Co"));
    config::SetClientName(UTF16String(u"Cinderal"));
    config::SetClientInternalVersion(UTF16String(u"9.2"));
    EXPECT_EQ(config::GetCompanyName(), UTF16String(u"Example Co"));
    EXPECT_EQ(config::GetClientName(), UTF16String(u"Cinderal"));
    EXPECT_EQ(config::GetClientInternalVersion(), UTF16String(u"9.2"));
}

class OpenerTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        utility::SetOpener([this](const UTF16String& target) {
            mOpened.push_back(utility::ToNarrow(target));
            return mAnswer;
        });
    }
    void TearDown() override { utility::SetOpener(utility::Opener()); }

    std::vector<std::string> mOpened;
    bool mAnswer = true;
};

TEST_F(OpenerTest, BrowserGetsASchemeWhenTheTextHasNone)
{
    EXPECT_TRUE(utility::OpenURLInDefaultBrowser(UTF16String(u"example.test/login")));
    EXPECT_TRUE(utility::OpenURLInDefaultBrowser(UTF16String(u"https://example.test/a?b=c")));
    EXPECT_EQ(mOpened, (std::vector<std::string>{"http://example.test/login", "https://example.test/a?b=c"}));
}

TEST_F(OpenerTest, EmptyTextOpensNothingAndFailuresAreReported)
{
    EXPECT_FALSE(utility::OpenURLInDefaultBrowser(UTF16String()));
    EXPECT_TRUE(mOpened.empty());
    mAnswer = false;
    EXPECT_FALSE(utility::OpenFileInDefaultApplication(UTF16String(u"/tmp/file.txt")));
    EXPECT_EQ(mOpened.size(), 1u);
}
