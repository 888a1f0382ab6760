// The password dialog as a host uses it: its validator signs in against the
// local service and hands the credentials to a client of the asset service.

#include <gtest/gtest.h>

#include "DialogDriver.h"
#include "SignInService.h"
#include "support/TestScopes.h"

namespace {

using namespace uitest;
using tolmocore::utility::ToNarrow;

const char kFailedText[] =
    "Authentication failed. Check network connection, Halvane ID, and password. Please try again.";

class SignInDialog : public ::testing::Test {
protected:
    testsupport::PrefDirScope mPrefs;
    idtest::IdentityService mService;
};

TEST_F(SignInDialog, TheRightPasswordSignsInAndTheClientReachesItsRoot)
{
    const auto client = mService.Client();
    DialogArguments arguments;
    arguments.validator = SignInValidator(client);
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        SimulateTyping(*Edit(box, "UserNameTextEdit"), UTF16String(u"ann"));
        SimulateTyping(*Edit(box, "PasswordTextEdit"), UTF16String(u"secret"));
        EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_OK));
    }));
    EXPECT_TRUE(run.Finish());
    EXPECT_EQ(ToNarrow(run.Arguments().userName), "ann");
    EXPECT_EQ(idtest::RootStatus(client), 200);
}

TEST_F(SignInDialog, AWrongPasswordShowsTheServicesTextAndTheNextTryGetsIn)
{
    const auto client = mService.Client();
    DialogArguments arguments;
    arguments.userName = UTF16String(u"ann");
    arguments.password = UTF16String(u"wrong");
    arguments.validator = SignInValidator(client);
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_OK));
        EXPECT_EQ(ToNarrow(MessageText(box)), kFailedText);
        EXPECT_TRUE(box.IsInModalLoop());
    }));
    EXPECT_EQ(idtest::RootStatus(client), 401);  // no token yet
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        SimulateTyping(*Edit(box, "PasswordTextEdit"), UTF16String(u"secret"));
        EXPECT_EQ(ToNarrow(MessageText(box)), "Sign in with your Halvane ID.");
        box.HandleButtonClick(kDialogResponse_OK);
    }));
    EXPECT_TRUE(run.Finish());
    EXPECT_EQ(idtest::RootStatus(client), 200);
}

}  // namespace
