// What the host sets and what the library hands to the desktop.

#include <gtest/gtest.h>

#include <thread>
#include <vector>

#include "foundation/core/HostConfig.h"
#include "foundation/core/Localizer.h"
#include "foundation/core/Opener.h"
#include "foundation/core/ThrowError.h"

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
    struct Message {
        virtual ~Message() = default;
    };
    struct Click : Message {};
    struct Edit : Message {};
    const char kKey[] = "$$$/tolmocore/utility/Error/InvalidTypeConversion=Invalid type conversion.";
    Click click;
    const Message* message = &click;
    EXPECT_EQ(utility::NonOptionalDynamicCast<const Click>(message, kKey, 105, 21), &click);
    for (const Message* wrong : {static_cast<const Message*>(nullptr), message}) {
        try {
            utility::NonOptionalDynamicCast<const Edit>(wrong, kKey, 105, 21);
            ADD_FAILURE() << "no error";
        } catch (const utility::LocalizedError& e) {
            EXPECT_STREQ(e.what(), "Invalid type conversion.");
            EXPECT_EQ(e.Code(), 105u);
            EXPECT_EQ(e.Detail(), 21);
        }
    }
}

TEST(Opener, BrowserGetsASchemeWhenTheTextHasNoneAndFailuresAreReported)
{
    std::vector<std::string> opened;
    bool answer = true;
    utility::SetOpener([&](const UTF16String& target) {
        opened.push_back(utility::ToNarrow(target));
        return answer;
    });
    EXPECT_TRUE(utility::OpenURLInDefaultBrowser(UTF16String(u"example.test/login")));
    EXPECT_TRUE(utility::OpenURLInDefaultBrowser(UTF16String(u"https://example.test/a?b=c")));
    EXPECT_FALSE(utility::OpenURLInDefaultBrowser(UTF16String()));
    answer = false;
    EXPECT_FALSE(utility::OpenFileInDefaultApplication(UTF16String(u"/tmp/file.txt")));
    utility::SetOpener(utility::Opener());
    EXPECT_EQ(opened,
              (std::vector<std::string>{"http://example.test/login", "https://example.test/a?b=c", "/tmp/file.txt"}));
}
