// The whole way of a native sign-in: the library hands out a real access
// token of the local service, and the credentials a host builds from the
// connection open the asset service.

#include <gtest/gtest.h>

#include "FakeOvraLibrary.h"
#include "support/IdentityService.h"
#include "support/TestScopes.h"

namespace {

using namespace nativetest;
using tolmonetsync::OvraConnection;

TEST(NativeSignIn, TheLibrarysTokenOpensTheAssetService)
{
    testsupport::PrefDirScope prefs;
    testsupport::IdentityService service;
    const testsupport::Answered signedIn = testsupport::SignIn("ann", "secret");
    ASSERT_EQ(signedIn.Status(), 200);
    const std::string token = signedIn.mAnswer.access_token.ToStdString();

    FakeOvraState& fake = LoadFake(FAKE_OVRA_LIB);
    fake.SetText("OVRA_fetchDefaultUserInfoForClientId", "<UserInfo><UserID>ann</UserID></UserInfo>");
    fake.SetText("OVRA_fetchAccessToken",
                 ("{\"access_token\": \"" + token + "\", \"email\": \"ann@example.test\"}").c_str());
    fake.HoldCallbacks(true);  // the answer comes after the call has returned
    auto connection = Connect(FAKE_OVRA_LIB);
    ASSERT_TRUE(connection->GetUserInfoAndFetchToken(true, UTF8String(), UTF8String(), UTF8String(), UTF8String()));
    fake.HoldCallbacks(false);
    ASSERT_TRUE(fake.WaitUntilIdle());
    ASSERT_EQ(connection->GetFetchState(), OvraConnection::kFetchState_Received);

    tolmonetsync::OvraCredentials credentials;
    credentials.accessToken = connection->GetAccessToken();
    credentials.userID = connection->GetEmail();
    const auto client = service.Client();
    EXPECT_EQ(testsupport::SetCredentials(client, credentials), tolmonetsync::SyncServer_Connected);
    EXPECT_EQ(testsupport::RootStatus(client), 200);

    // A token the service never gave is refused the same way.
    auto stranger = Connect(FAKE_OVRA_LIB);
    fake.SetText("OVRA_fetchAccessToken", "{\"access_token\": \"forged\", \"email\": \"ann@example.test\"}");
    ASSERT_TRUE(stranger->GetUserInfoAndFetchToken(true, Text("ann"), UTF8String(), UTF8String(), UTF8String()));
    ASSERT_TRUE(fake.WaitUntilIdle());
    credentials.accessToken = stranger->GetAccessToken();
    const auto refused = service.Client();
    EXPECT_EQ(testsupport::SetCredentials(refused, credentials), tolmonetsync::SyncServer_ConnectionFailed);
    EXPECT_EQ(testsupport::RootStatus(refused), 401);
}

}  // namespace
