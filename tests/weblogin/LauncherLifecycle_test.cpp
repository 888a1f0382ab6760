// The launcher's life: what the extension is told when it is ready, which
// unloaded events end the launcher, and what a second sign-in finds.

#include <boost/json.hpp>

#include "WebSignInHarness.h"
#include "foundation/tessel/RuvexEvent.h"

namespace {

using namespace weblogin;

const std::string kUnloaded = ruvex::event::EVENT_TYPE_RUVEX_EXTENSION_UNLOADED;

TEST_F(WebSignIn, TheExtensionIsToldWhereToSignIn)
{
    Extension(boost::none);
    const std::pair<OvraAuth_Scheme, std::string> cases[] = {{OvraAuth_Stage, "stg1"}, {OvraAuth_GM, "prod"}};
    int round = 0;
    for (const auto& schemeAndEndpoint : cases) {
        ++round;
        SignInRun run(mRecorder, schemeAndEndpoint.first, "client-x", "de_DE");
        ASSERT_TRUE(OpenAndInitialise(round));
        const tessel::OwnedEvent sent = mExtension->mInitializations.All().at(round - 1);
        EXPECT_EQ(sent.Scope(), 1);
        EXPECT_EQ(sent.AppId().value_or(""), "CINDERAL");
        EXPECT_FALSE(sent.ExtensionId());
        const boost::json::object expected{{"endpoint", schemeAndEndpoint.second},
                                           {"client_id", "client-x"},
                                           {"scope", "openid,HalvaneID,pellucid"},
                                           {"locale", "de_DE"},
                                           {"force_reauth", true}};
        EXPECT_EQ(boost::json::parse(sent.Data().value_or("")), expected);

        // The user closing the window: no credentials, and the launcher goes.
        ASSERT_TRUE(CloseByHand());
        EXPECT_FALSE(run.Result());
        EXPECT_EQ(mRecorder.Count(), 0u);
        ASSERT_TRUE(LauncherGoneAfter(*mExtension, round));
    }
    EXPECT_EQ(mExtension->mLoads.Count(), 2u);
}

// While the extension is still unloading, the launcher stays: other unloaded
// events leave it, and a second sign-in finds and keeps it.
TEST_F(WebSignIn, TheLauncherLastsUntilTheUnloadedEventNamingTheExtension)
{
    Extension(TokenEvent("token-1", "user-1", "ann@example.test"), true);
    boost::intrusive_ptr<tolmoui::UI_Dialog> firstDialog;
    {
        SignInRun first(mRecorder);
        firstDialog = OpenAndInitialise(1);
        ASSERT_TRUE(firstDialog);
        ASSERT_TRUE(first.Result());
    }
    ASSERT_TRUE(mExtension->mUnloads.WaitFor(1));
    const boost::shared_ptr<MerrowExtensionLauncher> launcher = CurrentMerrowExtensionLauncher();
    ASSERT_TRUE(launcher);

    tessel::SendHostEvent(kUnloaded, std::string("<ExtensionUnloaded><Id>com.example.other</Id></ExtensionUnloaded>"));
    tessel::SendHostEvent(kUnloaded, std::string(kMerrowExtensionID));  // no tags
    tessel::SendHostEvent(kUnloaded, std::string("<Id>") + kMerrowExtensionID);
    tessel::SendHostEvent(kUnloaded, std::string(kMerrowExtensionID) + "</Id>");
    tessel::SendHostEvent(kUnloaded, boost::none);
    ASSERT_TRUE(tessel::FlushHost());
    EXPECT_EQ(CurrentMerrowExtensionLauncher(), launcher);

    CredentialsRecorder second;
    SignInRun run(second);
    const auto secondDialog = WaitForSignInDialog();
    ASSERT_TRUE(secondDialog);
    EXPECT_NE(secondDialog, firstDialog);
    EXPECT_EQ(CurrentMerrowExtensionLauncher(), launcher);
    EXPECT_EQ(launcher->dialog, firstDialog);
    ASSERT_TRUE(tessel::FlushHost());
    EXPECT_EQ(mExtension->mLoads.Count(), 1u);  // the extension was not loaded again

    // Only the hand closes it, and Execute reads the kept launcher's result.
    ASSERT_TRUE(CloseByHand());
    EXPECT_TRUE(run.Result());
    EXPECT_EQ(second.Count(), 0u);

    mExtension->ReleaseUnloaded();
    EXPECT_TRUE(LauncherGoneAfter(*mExtension, 1));
}

}  // namespace
