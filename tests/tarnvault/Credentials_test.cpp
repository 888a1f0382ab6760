// Signing in and out against the local service: tokens stored under the last
// user, proved by a probe of the root, and the states reported to the host.
// (The stored files' modes, and a shared directory allowed: the command and
// integration tests.)

#include "ClientTestSupport.h"
#include "foundation/core/Keychain.h"
#include "server/FaultHooks.h"
#include "support/CallRecorder.h"
#include "support/TestService.h"

using namespace tvtest;
using testsupport::kAliceToken;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
using StateList = std::vector<SyncServer_ConnectionState>;

namespace {

// The states reported to the callback `start` hands on, once one came (at most 30 s on).
StateList Reported(const std::function<bool(const ConnectionStateCallback&)>& start)
{
    testsupport::CallRecorder<SyncServer_ConnectionState> states;
    EXPECT_TRUE(start([states](SyncServer_ConnectionState state) { states.Add(state); }));
    states.WaitFor(1);
    return states.All();
}

OvraCredentials Credentials(const std::string& access, const char* refresh, const char* user)
{
    OvraCredentials credentials;
    credentials.accessToken = UTF8String(access);
    credentials.refreshToken = refresh;
    credentials.userID = user;
    return credentials;
}

UTF16String Domain(const char16_t* kind)
{
    return UTF16String(u"Co App 9.0 OVRA ") + kind;
}

class CredentialsTest : public ::testing::Test {
protected:
    StateList SignIn(const std::string& access, const char* user = "user-7")
    {
        return Reported(
            [&](const auto& report) { return mClient->SetCredentials(report, Credentials(access, "ref-1", user)); });
    }
    StateList Check()
    {
        return Reported([&](const auto& report) { return mClient->CheckConnection(report); });
    }
    std::filesystem::path LastUserFile() const { return mPrefs.Path() / "tarnvaultuser.txt"; }

    PrefDirScope mPrefs;
    HostIdentity mHost{u"Co", u"App", u"9.0"};
    testsupport::TestService mService;
    boost::shared_ptr<Tarnvault> mClient{new Tarnvault(Parameters(mService->AssetServiceUrl(), "", "client-1"))};
};

}  // namespace

TEST_F(CredentialsTest, SetCredentialsStoresThemPrivatelyAndProvesTheStoredToken)
{
    // A link planted at the last-user file's name is replaced, not written through.
    testsupport::TempDir elsewhere;
    WriteFileBytes(elsewhere / "victim", "not yours");
    std::filesystem::create_symlink(elsewhere / "victim", LastUserFile());
    EXPECT_EQ(SignIn(kAliceToken), StateList{SyncServer_Connected});
    EXPECT_EQ(ReadFileBytes(LastUserFile()), R"({"mUserID":"user-7"})");
    EXPECT_EQ(ReadFileBytes(elsewhere / "victim"), "not yours");
    EXPECT_FALSE(std::filesystem::is_symlink(LastUserFile()));
    EXPECT_EQ(tolmocore::Keychain::GetPassword(Domain(u"Access"), u"user-7"), tolmocore::utility::ToUTF16(kAliceToken));
    EXPECT_EQ(tolmocore::Keychain::GetPassword(Domain(u"Refresh"), u"user-7"), UTF16String(u"ref-1"));
    EXPECT_EQ(mClient->mAccessToken, kAliceToken);
    EXPECT_EQ(mClient->mUserID, "user-7");
    // The probe's root stays with the probe.
    EXPECT_FALSE(mClient->CachedRoot());

    // Signing out forgets the user and leaves the keychain; checking then asks nothing.
    EXPECT_EQ(Reported([&](const auto& report) { return mClient->Logout(report); }), StateList{SyncServer_NotLoggedIn});
    EXPECT_TRUE(mClient->mAccessToken.empty() && mClient->mUserID.empty());
    EXPECT_FALSE(std::filesystem::exists(LastUserFile()));
    EXPECT_FALSE(tolmocore::Keychain::GetPassword(Domain(u"Access"), u"user-7").empty());
    const auto requests = testsupport::CountRequests(*mService);
    EXPECT_EQ(Check(), StateList{SyncServer_NotLoggedIn});
    EXPECT_EQ(requests->Seen(), 0);
}

TEST_F(CredentialsTest, NothingUsableStoredIsNotLoggedInAtOnceWithoutARequest)
{
    const auto requests = testsupport::CountRequests(*mService);
    EXPECT_EQ(Check(), StateList{SyncServer_NotLoggedIn});
    EXPECT_EQ(SignIn(""), StateList{SyncServer_NotLoggedIn});
    EXPECT_FALSE(std::filesystem::exists(LastUserFile()));

    WriteFileBytes(LastUserFile(), "");
    EXPECT_EQ(Check(), StateList{SyncServer_NotLoggedIn});
    EXPECT_TRUE(std::filesystem::exists(LastUserFile()));

    TraceCapture trace("Tarnvault:1");
    for (const char* damaged : {"not json", "[]", R"({"mUserID":5})"}) {
        SCOPED_TRACE(damaged);
        WriteFileBytes(LastUserFile(), damaged);
        EXPECT_EQ(Check(), StateList{SyncServer_NotLoggedIn});
        EXPECT_FALSE(std::filesystem::exists(LastUserFile()));
    }
    EXPECT_TRUE(trace.Contains("loadCredentials error: "));
    EXPECT_EQ(requests->Seen(), 0);

    // A token stored by another host version is not this one's.
    EXPECT_EQ(SignIn(kAliceToken), StateList{SyncServer_Connected});
    HostIdentity newer(u"Co", u"App", u"10.0");
    EXPECT_EQ(Check(), StateList{SyncServer_NotLoggedIn});
}

TEST_F(CredentialsTest, ARejectedTokenFailsAndStaysStoredForTheNextCheck)
{
    server::FaultRule expired;
    expired.mMethod = "GET";
    expired.mPathPattern = "/api/collections";
    expired.mStatus = 401;
    const auto fault = mService->Faults().Install(expired);
    EXPECT_EQ(SignIn(kAliceToken), StateList{SyncServer_ConnectionFailed});
    EXPECT_TRUE(fault->Fired());
    EXPECT_EQ(Check(), StateList{SyncServer_Connected});
    EXPECT_EQ(SignIn("not-a-token"), StateList{SyncServer_ConnectionFailed});

    const std::string closed = "http://127.0.0.1:" + std::to_string(testsupport::ClosedLoopbackPort()) + "/api";
    mClient.reset(new Tarnvault(Parameters(closed, "", "c")));
    EXPECT_EQ(SignIn(kAliceToken), StateList{SyncServer_ConnectionFailed});
}

TEST_F(CredentialsTest, APreferenceDirectoryOthersCanWriteIsRefusedWithoutSigningOut)
{
    ASSERT_EQ(SignIn(kAliceToken), StateList{SyncServer_Connected});
    std::filesystem::permissions(mPrefs.Path(), std::filesystem::perms::all);
    const auto requests = testsupport::CountRequests(*mService);
    TraceCapture trace("Tarnvault:1");
    EXPECT_EQ(Check(), StateList{SyncServer_ConnectionFailed});
    EXPECT_EQ(SignIn(kAliceToken, "user-8"), StateList{SyncServer_ConnectionFailed});
    EXPECT_EQ(requests->Seen(), 0);
    const std::string named = "Refusing the preference directory " + mPrefs.Path().string() + ": it is writable";
    EXPECT_TRUE(trace.Contains("CheckConnectionError: " + named));
    EXPECT_TRUE(trace.Contains("OvraLogin error: " + named));
    // Nobody was signed out, and nobody new was stored.
    EXPECT_EQ(ReadFileBytes(LastUserFile()), R"({"mUserID":"user-7"})");
    EXPECT_EQ(tolmocore::Keychain::GetPassword(Domain(u"Access"), u"user-8"), UTF16String());
}

// Tokens, URL queries, answer bodies and answer headers reach trace lines blanked.
TEST_F(ClientTest, TraceLinesShowNoSecret)
{
    PrefDirScope prefs;
    HostIdentity host(u"Co", u"App", u"9.0");
    TraceCapture trace("8");
    mService.Push(Answer(200, "[" + CollectionJSON("r", "client-1", kRootMedia) + "]"));
    mService.Push(Answer(404, R"({"access_token":"secret-body-7"})", {{"Authorization", "Bearer secret-header-7"}}));
    ASSERT_EQ(Reported([&](const auto& report) {
                  return mClient->SetCredentials(report, Credentials("secret-access-7", "secret-refresh-7", "u"));
              }),
              StateList{SyncServer_Connected});
    Outcome outcome;
    mClient->DownloadAsync(outcome.Success(), outcome.Error(), Make<Item>("i1?token=secret-url-7"),
                           File(u"/nonexistent/x"), "", Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    EXPECT_TRUE(trace.Contains("SetCredentials: inAccessToken: <obfuscated>"));
    EXPECT_TRUE(trace.Contains("GetRoot, name: <obfuscated>"));
    // The URL's query is blanked (the asset's own description still names it).
    EXPECT_TRUE(trace.Contains("/api/assets/i1?token=***, etag: "));
    EXPECT_TRUE(trace.Contains(R"(Download, status_code: 404, body: {"access_token":"***"})"));
    EXPECT_TRUE(trace.Contains("AUTHORIZATION: ***"));
    for (const char* secret :
         {"secret-access", "secret-refresh", "secret-body", "secret-header", "assets/i1?token=secret-url"})
        EXPECT_FALSE(trace.Contains(secret)) << trace.LineWith(secret);
}
