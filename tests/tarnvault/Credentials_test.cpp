// Signing in and out: tokens stored under the last user, proved by a probe of
// the root, and the states reported to the host.

#include "ClientTestSupport.h"
#include "foundation/core/Keychain.h"

using namespace tvtest;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;

namespace {

// Records the reported states.
struct States {
    std::mutex mMutex;
    std::condition_variable mChanged;
    std::vector<SyncServer_ConnectionState> mSeen;

    ConnectionStateCallback Callback()
    {
        return [this](SyncServer_ConnectionState state) {
            std::lock_guard<std::mutex> lock(mMutex);
            mSeen.push_back(state);
            mChanged.notify_all();
        };
    }
    bool Wait()
    {
        std::unique_lock<std::mutex> lock(mMutex);
        return mChanged.wait_for(lock, std::chrono::seconds(30), [&] { return !mSeen.empty(); });
    }
    std::vector<SyncServer_ConnectionState> Seen()
    {
        std::lock_guard<std::mutex> lock(mMutex);
        return mSeen;
    }
};

using StateList = std::vector<SyncServer_ConnectionState>;

const std::string kRoot = CollectionJSON("r", "client-1", kRootMedia);

OvraCredentials Credentials(const char* access, const char* refresh, const char* user)
{
    OvraCredentials credentials;
    credentials.accessToken = access;
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
    CredentialsTest()
        : mHost(u"Co", u"App", u"9.0"), mClient(new Tarnvault(Parameters(mService.ApiUrl(), "", "client-1")))
    {
    }

    PrefDirScope mPrefs;
    HostIdentity mHost;
    ScriptedService mService;
    boost::shared_ptr<Tarnvault> mClient;
};

}  // namespace

TEST_F(CredentialsTest, NothingStoredIsNotLoggedInAtOnceWithoutARequest)
{
    States states;
    EXPECT_TRUE(mClient->CheckConnection(states.Callback()));
    EXPECT_EQ(states.Seen(), StateList{SyncServer_NotLoggedIn});
    EXPECT_TRUE(mService.Requests().empty());
}

TEST_F(CredentialsTest, SetCredentialsStoresThemAndProvesTheStoredToken)
{
    mService.Script(200, "[" + kRoot + "]");
    States states;
    EXPECT_TRUE(mClient->SetCredentials(states.Callback(), Credentials("acc-1", "ref-1", "user-7")));
    ASSERT_TRUE(states.Wait());
    EXPECT_EQ(states.Seen(), StateList{SyncServer_Connected});
    EXPECT_EQ(mService.Find("GET", "/api/collections?name=client-1").Header("Authorization"), "Bearer acc-1");
    EXPECT_EQ(ReadFileBytes(mPrefs.Path() / "tarnvaultuser.txt"), R"({"mUserID":"user-7"})");
    EXPECT_EQ(tolmocore::Keychain::GetPassword(Domain(u"Access"), u"user-7"), UTF16String(u"acc-1"));
    EXPECT_EQ(tolmocore::Keychain::GetPassword(Domain(u"Refresh"), u"user-7"), UTF16String(u"ref-1"));
    EXPECT_EQ(mClient->mAccessToken, "acc-1");
    EXPECT_EQ(mClient->mUserID, "user-7");
    // The probe's root stays with the probe.
    EXPECT_FALSE(mClient->CachedRoot());
}

TEST_F(CredentialsTest, StoredSignInIsPrivateAndNeverWrittenThroughALink)
{
    testsupport::TempDir elsewhere;
    WriteFileBytes(elsewhere / "victim", "not yours");
    std::filesystem::create_symlink(elsewhere / "victim", mPrefs.Path() / "tarnvaultuser.txt");
    mService.Script(200, "[" + kRoot + "]");
    States states;
    EXPECT_TRUE(mClient->SetCredentials(states.Callback(), Credentials("acc-1", "ref-1", "user-7")));
    ASSERT_TRUE(states.Wait());
    EXPECT_EQ(states.Seen(), StateList{SyncServer_Connected});
    EXPECT_FALSE(std::filesystem::is_symlink(mPrefs.Path() / "tarnvaultuser.txt"));
    EXPECT_EQ(ReadFileBytes(elsewhere / "victim"), "not yours");
    for (const char* name : {"tarnvaultuser.txt", "keychain.store"})
        EXPECT_EQ(std::filesystem::status(mPrefs.Path() / name).permissions(),
                  std::filesystem::perms::owner_read | std::filesystem::perms::owner_write)
            << name;
}

TEST_F(CredentialsTest, APreferenceDirectoryOthersCanWriteIsRefusedWithoutSigningOut)
{
    mService.Script(200, "[" + kRoot + "]");
    States stored;
    ASSERT_TRUE(mClient->SetCredentials(stored.Callback(), Credentials("acc-1", "ref-1", "user-7")));
    ASSERT_TRUE(stored.Wait());
    std::filesystem::permissions(mPrefs.Path(), std::filesystem::perms::all);
    const std::size_t requests = mService.Requests().size();
    testsupport::TraceCapture trace("Tarnvault:1");
    States checked, set;
    EXPECT_TRUE(mClient->CheckConnection(checked.Callback()));
    EXPECT_TRUE(mClient->SetCredentials(set.Callback(), Credentials("acc-2", "ref-2", "user-8")));
    EXPECT_EQ(checked.Seen(), StateList{SyncServer_ConnectionFailed});
    EXPECT_EQ(set.Seen(), StateList{SyncServer_ConnectionFailed});
    EXPECT_EQ(mService.Requests().size(), requests);
    const std::string named = "Refusing the preference directory " + mPrefs.Path().string() + ": it is writable";
    EXPECT_TRUE(trace.Contains("CheckConnectionError: " + named));
    EXPECT_TRUE(trace.Contains("OvraLogin error: " + named));
    // Nobody was signed out, and nobody new was stored.
    EXPECT_EQ(ReadFileBytes(mPrefs.Path() / "tarnvaultuser.txt"), R"({"mUserID":"user-7"})");
    EXPECT_EQ(tolmocore::Keychain::GetPassword(Domain(u"Access"), u"user-8"), UTF16String());

    tolmocore::filesupport::Dir::SetAllowSharedPrefDir(true);
    mService.Script(200, "[" + kRoot + "]");
    States allowed;
    EXPECT_TRUE(mClient->CheckConnection(allowed.Callback()));
    const bool came = allowed.Wait();
    tolmocore::filesupport::Dir::SetAllowSharedPrefDir(false);
    ASSERT_TRUE(came);
    EXPECT_EQ(allowed.Seen(), StateList{SyncServer_Connected});
}

TEST_F(CredentialsTest, AStoredTokenMakesAClientWithoutOneUsable)
{
    WriteFileBytes(mPrefs.Path() / "tarnvaultuser.txt", R"({"mUserID":"u"})");
    ASSERT_TRUE(tolmocore::Keychain::SetPassword(Domain(u"Access"), u"u", u"stored"));
    mService.Script(200, "[" + kRoot + "]");
    mService.Script(200, "[]");
    States states;
    EXPECT_TRUE(mClient->CheckConnection(states.Callback()));
    ASSERT_TRUE(states.Wait());
    EXPECT_EQ(states.Seen(), StateList{SyncServer_Connected});
    Outcome outcome;
    mClient->SearchAsync(outcome.Assets(), outcome.Error(), SearchQuery(), Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    EXPECT_EQ(mService.Find("POST", "/api/search?").Header("Authorization"), "Bearer stored");
}

TEST_F(CredentialsTest, RejectedTokenFailsAndStaysStoredForTheNextCheck)
{
    mService.Script(401, "expired");
    States rejected;
    EXPECT_TRUE(mClient->SetCredentials(rejected.Callback(), Credentials("acc-1", "", "u")));
    ASSERT_TRUE(rejected.Wait());
    EXPECT_EQ(rejected.Seen(), StateList{SyncServer_ConnectionFailed});

    mService.Script(200, "[" + kRoot + "]");
    States later;
    EXPECT_TRUE(mClient->CheckConnection(later.Callback()));
    ASSERT_TRUE(later.Wait());
    EXPECT_EQ(later.Seen(), StateList{SyncServer_Connected});
}

TEST_F(CredentialsTest, ProbeWithoutAServiceIsAConnectionFailure)
{
    const std::string url = "http://127.0.0.1:" + std::to_string(testsupport::ClosedLoopbackPort()) + "/api";
    boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(url, "", "c")));
    States states;
    EXPECT_TRUE(client->SetCredentials(states.Callback(), Credentials("acc", "ref", "u")));
    ASSERT_TRUE(states.Wait());
    EXPECT_EQ(states.Seen(), StateList{SyncServer_ConnectionFailed});
}

TEST_F(CredentialsTest, EmptyTokenStoresNothingAndReportsWhatIsStored)
{
    States states;
    EXPECT_TRUE(mClient->SetCredentials(states.Callback(), Credentials("", "ref", "u")));
    EXPECT_EQ(states.Seen(), StateList{SyncServer_NotLoggedIn});
    EXPECT_FALSE(std::filesystem::exists(mPrefs.Path() / "tarnvaultuser.txt"));
}

TEST_F(CredentialsTest, LogoutForgetsTheUserButLeavesTheKeychain)
{
    mService.Script(200, "[" + kRoot + "]");
    States in;
    mClient->SetCredentials(in.Callback(), Credentials("acc-1", "ref-1", "u"));
    ASSERT_TRUE(in.Wait());
    States out;
    EXPECT_TRUE(mClient->Logout(out.Callback()));
    EXPECT_EQ(out.Seen(), StateList{SyncServer_NotLoggedIn});
    EXPECT_TRUE(mClient->mAccessToken.empty());
    EXPECT_TRUE(mClient->mUserID.empty());
    EXPECT_FALSE(std::filesystem::exists(mPrefs.Path() / "tarnvaultuser.txt"));
    EXPECT_EQ(tolmocore::Keychain::GetPassword(Domain(u"Access"), u"u"), UTF16String(u"acc-1"));
    States check;
    mClient->CheckConnection(check.Callback());
    EXPECT_EQ(check.Seen(), StateList{SyncServer_NotLoggedIn});
    EXPECT_EQ(mService.Requests().size(), 1u);
}

TEST_F(CredentialsTest, EmptyOrDamagedLastUserFile)
{
    WriteFileBytes(mPrefs.Path() / "tarnvaultuser.txt", "");
    States empty;
    mClient->CheckConnection(empty.Callback());
    EXPECT_EQ(empty.Seen(), StateList{SyncServer_NotLoggedIn});
    EXPECT_TRUE(std::filesystem::exists(mPrefs.Path() / "tarnvaultuser.txt"));

    TraceLines trace("Tarnvault:1");
    for (const char* text : {"not json", "[]", R"({"mUserID":5})"}) {
        SCOPED_TRACE(text);
        WriteFileBytes(mPrefs.Path() / "tarnvaultuser.txt", text);
        States damaged;
        mClient->CheckConnection(damaged.Callback());
        EXPECT_EQ(damaged.Seen(), StateList{SyncServer_NotLoggedIn});
        EXPECT_FALSE(std::filesystem::exists(mPrefs.Path() / "tarnvaultuser.txt"));
    }
    EXPECT_TRUE(trace.Contains("loadCredentials error: "));
    EXPECT_TRUE(mService.Requests().empty());
}

TEST_F(CredentialsTest, AnotherHostVersionFindsNoToken)
{
    mService.Script(200, "[" + kRoot + "]");
    States in;
    mClient->SetCredentials(in.Callback(), Credentials("acc-1", "ref-1", "u"));
    ASSERT_TRUE(in.Wait());
    HostIdentity newer(u"Co", u"App", u"10.0");
    States check;
    mClient->CheckConnection(check.Callback());
    EXPECT_EQ(check.Seen(), StateList{SyncServer_NotLoggedIn});
}

TEST_F(CredentialsTest, NoTraceLineShowsATokenOfTheSignIn)
{
    TraceLines trace("8");
    mService.Script(200, "[" + kRoot + "]");
    mService.Script(404, "missing");
    States states;
    mClient->SetCredentials(states.Callback(), Credentials("secret-access-7", "secret-refresh-7", "u"));
    ASSERT_TRUE(states.Wait());
    Outcome outcome;
    mClient->DownloadAsync(outcome.Downloaded(), outcome.Error(), MakeItem("i1"), File(u"/nonexistent/x"), "",
                           Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    EXPECT_TRUE(trace.Contains("SetCredentials: inAccessToken: <obfuscated>"));
    EXPECT_TRUE(trace.Contains("GetRoot, name: <obfuscated>"));
    EXPECT_TRUE(trace.Contains("Download, status_code: 404, body: missing"));
    EXPECT_FALSE(trace.Contains("secret-access-7"));
    EXPECT_FALSE(trace.Contains("secret-refresh-7"));
}
