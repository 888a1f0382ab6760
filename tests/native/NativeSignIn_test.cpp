// The whole way of a native sign-in for the library's default user: the
// library hands out a real access token of the local service on its own
// thread, and the credentials a host builds from the connection open the
// asset service.

#include <gtest/gtest.h>

#include "FakeOvraLibrary.h"
#include "identity/OvraAuth.h"
#include "support/IdentityService.h"
#include "support/TestScopes.h"

namespace {

using namespace nativetest;
using tolmonetsync::OvraConnection;

const char kUserInfo[] = "OVRA_fetchDefaultUserInfoForClientId";
const char kFetch[] = "OVRA_fetchAccessToken";

TEST(NativeSignIn, TheLibrarysTokenForTheDefaultUserOpensTheAssetService)
{
    testsupport::PrefDirScope prefs;
    testsupport::IdentityService service;
    const testsupport::Answered signedIn = testsupport::SignIn("ann", "secret");
    ASSERT_EQ(signedIn.Status(), 200);
    const std::string token = signedIn.mAnswer.access_token.ToStdString();

    FakeOvraState& fake = LoadFake(FAKE_OVRA_LIB);
    fake.SetText(kUserInfo, "<UserInfo><UserID>u-42</UserID><Name>Ann</Name></UserInfo>");
    fake.SetText(kFetch, ("{\"access_token\": \"" + token + "\", \"email\": \"ann@example.test\"}").c_str());
    fake.HoldCallbacks(true);  // the answer comes after the call has returned
    auto connection = Connect(FAKE_OVRA_LIB);
    EXPECT_EQ(connection->GetFetchState(), OvraConnection::kFetchState_None);
    ASSERT_TRUE(connection->GetUserInfoAndFetchToken(true, UTF8String(), UTF8String(), UTF8String(), UTF8String()));
    EXPECT_EQ(connection->GetFetchState(), OvraConnection::kFetchState_Fetching);
    EXPECT_EQ(connection->GetUserID(), Text("u-42"));
    fake.HoldCallbacks(false);
    ASSERT_TRUE(fake.WaitUntilIdle());
    ASSERT_EQ(connection->GetFetchState(), OvraConnection::kFetchState_Received);
    EXPECT_EQ(connection->GetEmail(), Text("ann@example.test"));

    // Production, the built-in client and its production secret, the default scope.
    EXPECT_EQ(fake.Arguments("OVRA_createRef"), (Strings{"context", "1"}));
    const std::string client = tolmonetsync::kTOLMO_OVRA_CLIENT_ID.ToStdString();
    EXPECT_EQ(fake.Arguments(kUserInfo), Strings{client});
    EXPECT_EQ(fake.Arguments(kFetch), (Strings{client, tolmonetsync::kTOLMO_OVRA_CLIENT_SECRET_GM.ToStdString(), "u-42",
                                               "", "openid,HalvaneID,pellucid"}));

    tolmonetsync::OvraCredentials credentials;
    credentials.accessToken = connection->GetAccessToken();
    credentials.userID = connection->GetEmail();
    const auto assets = service.Client();
    EXPECT_EQ(testsupport::SetCredentials(assets, credentials), tolmonetsync::SyncServer_Connected);
    EXPECT_EQ(testsupport::RootStatus(assets), 200);
}

}  // namespace
