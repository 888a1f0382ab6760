// The password dialog driven through its modal loop as a user would: what
// enables OK, what the validator's refusals show, what comes back, the links;
// and as a host uses it, signing in against the local service.

#include <gtest/gtest.h>

#include "DialogDriver.h"
#include "foundation/core/Strings.h"
#include "foundation/ui/UI_NodeManager.h"
#include "support/IdentityService.h"
#include "support/OpenerRecorder.h"
#include "support/TestScopes.h"

namespace {

using namespace uitest;
using tolmocore::utility::ToNarrow;
using tolmocore::utility::UTF16to8;

std::string N(const UTF16String& text)
{
    return ToNarrow(text);
}

// Without a validator OK never closes; Cancel and the close box give false
// and hand back what was typed.
TEST(PasswordDialog, ShowsTheStartingValuesAndGivesBackTheTypedOnesOnCancelOrClose)
{
    for (const bool closeBox : {false, true}) {
        SCOPED_TRACE(closeBox ? "close box" : "cancel");
        DialogRun run((DialogArguments()));
        ASSERT_TRUE(run.Do([&](UI_MessageBox& box) {
            EXPECT_EQ(N(box.GetTitle()), "Sign in");
            EXPECT_EQ(N(MessageText(box)), "Sign in with your Halvane ID.");
            EXPECT_TRUE(box.GetSpecificButton(kDialogResponse_OK)->IsDefault());
            EXPECT_EQ(UI_NodeManager::GetModalScopeDepth(), 1);

            const auto userName = Edit(box, "UserNameTextEdit");
            const auto password = Edit(box, "PasswordTextEdit");
            ASSERT_TRUE(userName && password);
            EXPECT_EQ(N(userName->GetValue()), "ann");
            EXPECT_TRUE(userName->IsAllSelected());
            EXPECT_EQ(N(password->GetValue()), "secret");
            EXPECT_EQ(password->GetFlags(), 0x20);  // masked
            EXPECT_EQ(N(box.FindDescendantAs<UI_StaticText>("UserNameStaticText")->GetValue()), "User name:");
            EXPECT_EQ(N(box.FindDescendantAs<UI_StaticText>("PasswordStaticText")->GetValue()), "Password:");
            EXPECT_FALSE(Link(box, "UserNameLinkHotTextButton") || Link(box, "PasswordLinkHotTextButton"));
            EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_OK));
            EXPECT_TRUE(MessageText(box).empty());  // the empty error
            EXPECT_TRUE(box.IsInModalLoop());

            SimulateTyping(*Edit(box, "UserNameTextEdit"), UTF16String(u"carla"));
            SimulateTyping(*Edit(box, "PasswordTextEdit"), UTF16String(u"hunter2"));
            if (closeBox)
                box.HandleCloseBox();
            else
                EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_Cancel));
        }));
        EXPECT_FALSE(run.Finish());
        EXPECT_EQ(UI_NodeManager::GetModalScopeDepth(), 0);
        EXPECT_EQ(N(run.Arguments().userName), "carla");
        EXPECT_EQ(N(run.Arguments().password), "hunter2");
    }
}

TEST(PasswordDialog, OneEmptyValueDisablesOKUntilBothHoldTextAndAnAcceptingValidatorCloses)
{
    DialogArguments arguments;
    arguments.password = UTF16String();
    std::vector<std::string> asked;  // written on the UI thread, read after it ended
    arguments.validator = Validator([&](const UTF16String& user, const UTF16String& password, UTF16String&) {
        asked.push_back(N(user) + ":" + N(password));
        return true;
    });
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        EXPECT_FALSE(OkEnabled(box));
        EXPECT_FALSE(box.HandleButtonClick(kDialogResponse_OK));  // cannot be pressed
        SimulateTyping(*Edit(box, "PasswordTextEdit"), UTF16String(u"s"));
        EXPECT_TRUE(OkEnabled(box));
        SimulateTyping(*Edit(box, "UserNameTextEdit"), UTF16String());
        EXPECT_FALSE(OkEnabled(box));
        SimulateTyping(*Edit(box, "UserNameTextEdit"), UTF16String(u"bob"));
        EXPECT_TRUE(OkEnabled(box));
        EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_OK));
    }));
    EXPECT_TRUE(run.Finish());
    EXPECT_EQ(asked, std::vector<std::string>{"bob:s"});
    EXPECT_EQ(N(run.Arguments().userName), "bob");
    EXPECT_EQ(N(run.Arguments().password), "s");
}

TEST(PasswordDialog, ARefusalShowsItsErrorUntilTheUserTypesAndKeepsTheDialogOpen)
{
    std::vector<std::string> asked;  // written on the UI thread, read inside the loop
    DialogArguments arguments;
    // Refuses: "first refusal" the first time, "second refusal" after.
    arguments.validator = Validator([&](const UTF16String& user, const UTF16String& password, UTF16String& error) {
        asked.push_back(N(user) + ":" + N(password));
        error = UTF16String(asked.size() == 1 ? u"first refusal" : u"second refusal");
        return false;
    });
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([&](UI_MessageBox& box) {
        EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_OK));
        EXPECT_EQ(N(MessageText(box)), "first refusal");
        EXPECT_EQ(asked, std::vector<std::string>{"ann:secret"});
        // A second OK without a change keeps the first error.
        box.HandleButtonClick(kDialogResponse_OK);
        EXPECT_EQ(asked.size(), 2u);
        EXPECT_EQ(N(MessageText(box)), "first refusal");
        // A change that is not the user's edit leaves the error; typing puts the message back.
        Edit(box, "PasswordTextEdit")->HandleUserChange(kInteractiveChange_None);
        EXPECT_EQ(N(MessageText(box)), "first refusal");
        SimulateTyping(*Edit(box, "PasswordTextEdit"), UTF16String(u"secret2"));
        EXPECT_EQ(N(MessageText(box)), "Sign in with your Halvane ID.");
        // And the next refusal shows again, until the user name changes.
        box.HandleButtonClick(kDialogResponse_OK);
        EXPECT_EQ(N(MessageText(box)), "second refusal");
        SimulateTyping(*Edit(box, "UserNameTextEdit"), UTF16String(u"an"));
        EXPECT_EQ(N(MessageText(box)), "Sign in with your Halvane ID.");
    }));
    // Still open: the loop runs the next action.
    EXPECT_TRUE(run.Do([](UI_MessageBox& box) { EXPECT_TRUE(box.IsInModalLoop()); }));
}

TEST(PasswordDialog, ALinkOpensItsOwnURLAndOneWithoutAURLOpensNothing)
{
    testsupport::OpenerRecorder opener;
    DialogArguments arguments;
    arguments.userNameLinkText = UTF16String(u"Create an account");
    arguments.passwordLinkText = UTF16String(u"Forgot your password?");
    arguments.passwordLinkURL = UTF16String(u"https://id.example.test/reset");
    {
        DialogRun run(arguments);
        ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
            const auto link = Link(box, "PasswordLinkHotTextButton");
            ASSERT_TRUE(link && Link(box, "UserNameLinkHotTextButton"));
            EXPECT_EQ(N(link->GetText()), "Forgot your password?");
            EXPECT_TRUE(Link(box, "UserNameLinkHotTextButton")->HandleUserChange(kInteractiveChange_Click));
            EXPECT_TRUE(box.IsInModalLoop());
            link->HandleUserChange(kInteractiveChange_Click);
        }));
    }
    EXPECT_EQ(opener.Opened(), std::vector<std::string>{"https://id.example.test/reset"});

    // A URL without a scheme is opened as http.
    arguments.userNameLinkURL = UTF16String(u"id.example.test/new");
    DialogRun second(arguments);
    ASSERT_TRUE(second.Do([](UI_MessageBox& box) {
        Link(box, "UserNameLinkHotTextButton")->HandleUserChange(kInteractiveChange_Click);
    }));
    ASSERT_EQ(opener.Opened().size(), 2u);
    EXPECT_EQ(opener.Opened()[1], "http://id.example.test/new");
}

// The password dialog as a host uses it: its validator signs in against the
// local service and hands the credentials to a client of the asset service.

// Accepts once `client` reports itself connected with the new tokens; a
// refusal shows the service's text. Blocks the UI thread, as a host's would.
boost::shared_ptr<SyncAuthenticationValidator> SignInValidator(
    const boost::shared_ptr<tolmonetsync::tarnvault::Tarnvault>& client)
{
    return Validator([client](const UTF16String& userName, const UTF16String& password, UTF16String& error) {
        const testsupport::Answered answered =
            testsupport::SignIn(UTF16to8(userName).ToStdString(), UTF16to8(password).ToStdString());
        error = answered.mAnswer.errorMessage;
        return !answered.mAnswer.access_token.empty() &&
               testsupport::SetCredentials(client, testsupport::CredentialsOf(answered.mAnswer)) ==
                   tolmonetsync::SyncServer_Connected;
    });
}

TEST(SignInDialog, AWrongPasswordShowsTheServicesTextAndTheRightOneGetsIn)
{
    testsupport::PrefDirScope prefs;
    testsupport::IdentityService service;
    const auto client = service.Client();
    DialogArguments arguments;
    arguments.password = UTF16String(u"wrong");
    arguments.validator = SignInValidator(client);
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_OK));
        EXPECT_EQ(N(MessageText(box)), testsupport::kFailedText);
        EXPECT_TRUE(box.IsInModalLoop());
    }));
    EXPECT_EQ(testsupport::RootStatus(client), 401);  // no token yet
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        SimulateTyping(*Edit(box, "PasswordTextEdit"), UTF16String(u"secret"));
        box.HandleButtonClick(kDialogResponse_OK);
    }));
    EXPECT_TRUE(run.Finish());
    EXPECT_EQ(N(run.Arguments().userName), "ann");
    EXPECT_EQ(testsupport::RootStatus(client), 200);
}

}  // namespace
