// The password dialog as a host uses it: its validator signs in against the
// local service and hands the credentials to a client of the asset service.

#include <gtest/gtest.h>

#include "DialogDriver.h"
#include "support/IdentityService.h"
#include "support/TestScopes.h"

namespace {

using namespace uitest;
using tolmocore::utility::ToNarrow;
using tolmocore::utility::UTF16to8;

const char kFailedText[] =
    "Authentication failed. Check network connection, Halvane ID, and password. Please try again.";

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
    arguments.userName = UTF16String(u"ann");
    arguments.password = UTF16String(u"wrong");
    arguments.validator = SignInValidator(client);
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_OK));
        EXPECT_EQ(ToNarrow(MessageText(box)), kFailedText);
        EXPECT_TRUE(box.IsInModalLoop());
    }));
    EXPECT_EQ(testsupport::RootStatus(client), 401);  // no token yet
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        SimulateTyping(*Edit(box, "PasswordTextEdit"), UTF16String(u"secret"));
        box.HandleButtonClick(kDialogResponse_OK);
    }));
    EXPECT_TRUE(run.Finish());
    EXPECT_EQ(ToNarrow(run.Arguments().userName), "ann");
    EXPECT_EQ(testsupport::RootStatus(client), 200);
}

}  // namespace
