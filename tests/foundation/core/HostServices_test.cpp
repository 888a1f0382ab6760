// What the host sets and what the library hands to the desktop.

#include <gtest/gtest.h>

#include <stdexcept>
#include <thread>
#include <vector>

#include "foundation/core/HostConfig.h"
#include "foundation/core/Localizer.h"
#include "foundation/core/ThrowError.h"
#include "support/OpenerRecorder.h"

using namespace tolmocore;

TEST(Localizer, DefaultTextAfterTheEqualsSignUnlessATranslationIsInstalledForTheKey)
{
    config::Localizer& localizer = config::Localizer::Get();
    localizer.AddTranslations({{"tolmonetsync/Login/Title", UTF16String(u"Anmelden")}});
    const std::pair<const char*, const char16_t*> rows[] = {{"$$$/tolmonetsync/Login/Title=Sign In", u"Anmelden"},
                                                            {"$$$/tolmonetsync/Login/Other=Other", u"Other"},
                                                            {"$$$/tolmonetsync/Empty=", u""},
                                                            {"$$$/tolmonetsync/Math=1 + 1 = 2", u"1 + 1 = 2"},
                                                            {"plain text", u"plain text"},
                                                            {nullptr, u""}};
    for (const auto& row : rows) EXPECT_EQ(localizer.Localize(row.first), UTF16String(row.second));
    localizer.ClearTranslations();
    EXPECT_EQ(localizer.Localize(rows[0].first), UTF16String(u"Sign In"));
}

TEST(HostConfig, AReferenceHeldByAReaderSurvivesALateSetter)
{
    config::SetClientName(UTF16String(u"Cinderal"));
    const UTF16String& held = config::GetClientName();
    // A reader on another thread copies the name while the host sets it again;
    // under ThreadSanitizer a reference escaping a lock shows as a race.
    std::thread reader([] {
        for (int i = 0; i < 2000; ++i) {
            const UTF16String copy = config::GetClientName();
            ASSERT_TRUE(copy == UTF16String(u"Cinderal") || copy.size() == 40) << i;
        }
    });
    for (int i = 0; i < 200; ++i) config::SetClientName(UTF16String(std::u16string(40, u'a' + i % 26)));
    reader.join();
    EXPECT_EQ(held, UTF16String(u"Cinderal"));
    EXPECT_EQ(config::GetClientName(), UTF16String(std::u16string(40, u'a' + 199 % 26)));
}

TEST(ThrowError, AMessageOfTheWrongKindRaisesTheLocalisedConversionError)
{
    const char kKey[] = "$$$/tolmocore/utility/Error/InvalidTypeConversion=Invalid type conversion.";
    const std::runtime_error click("click");
    const std::exception* message = &click;
    EXPECT_EQ(utility::NonOptionalDynamicCast<const std::runtime_error>(message, kKey, 105, 21), &click);
    for (const std::exception* wrong : {static_cast<const std::exception*>(nullptr), message}) {
        try {
            utility::NonOptionalDynamicCast<const std::logic_error>(wrong, kKey, 105, 21);
            ADD_FAILURE() << "no error";
        } catch (const utility::LocalizedError& e) {
            EXPECT_STREQ(e.what(), "Invalid type conversion.");
            EXPECT_EQ(e.Code(), 105u);
            EXPECT_EQ(e.Detail(), 21);
        }
    }
}

TEST(Opener, BrowserGetsASchemeWhenTheTextHasNone)
{
    testsupport::OpenerRecorder opener;
    EXPECT_TRUE(utility::OpenURLInDefaultBrowser(UTF16String(u"example.test/login")));
    EXPECT_TRUE(utility::OpenURLInDefaultBrowser(UTF16String(u"https://example.test/a?b=c")));
    EXPECT_FALSE(utility::OpenURLInDefaultBrowser(UTF16String()));
    EXPECT_TRUE(utility::OpenFileInDefaultApplication(UTF16String(u"/tmp/file.txt")));
    EXPECT_EQ(opener.Opened(),
              (std::vector<std::string>{"http://example.test/login", "https://example.test/a?b=c", "/tmp/file.txt"}));
}
