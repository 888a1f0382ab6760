// The client's configuration from the parameter list, the connection state
// it reports, the service and cache that hold it, and what its traces show.

#include "ClientTestSupport.h"

using namespace tvtest;

namespace {

ParameterList One(const ImmutableString& key, const char* value)
{
    ParameterList parameters;
    parameters.push_back(std::make_pair(key, UTF8String(value)));
    return parameters;
}

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

}  // namespace

TEST(Configuration, EmptyListGivesTheProductionServiceAndNothingElse)
{
    Tarnvault client((ParameterList()));
    EXPECT_EQ(client.mServerURL.ToStdString(), kProduction.ToStdString());
    EXPECT_TRUE(client.mClientID.empty());
    EXPECT_TRUE(client.mAccessToken.empty());
    EXPECT_FALSE(client.mMigrateMajor);
    EXPECT_FALSE(client.mMigratePreviousMajor);
    EXPECT_EQ(client.mConnectionState, SyncServer_Unknown);
    EXPECT_FALSE(client.AutoLoginRequested());
}

TEST(Configuration, BaseUrlsAreHttpsUnderApiAndDistinct)
{
    for (const ImmutableString* url : {&kProduction, &kStaging}) {
        const std::string text = url->ToStdString();
        EXPECT_EQ(text.substr(0, 8), "https://");
        EXPECT_EQ(text.substr(text.size() - 4), "/api");
    }
    EXPECT_NE(kProduction.ToStdString(), kStaging.ToStdString());
    EXPECT_EQ(Tarnvault(One(tolmonet::kHEADER_LOCATION, "")).mServerURL.ToStdString(), kProduction.ToStdString());
    EXPECT_EQ(Tarnvault(One(tolmonet::kHEADER_LOCATION, kStaging.c_str())).mServerURL.ToStdString(),
              kStaging.ToStdString());
}

TEST(Configuration, KeysAreTheConstantsThemselvesNotEqualText)
{
    TraceLines trace("Tarnvault:1");
    const ImmutableString lookalike = ImmutableString::CreateDynamic(tolmonet::kHEADER_USER_AGENT.ToStdString());
    Tarnvault client(One(lookalike, "client-x"));
    EXPECT_TRUE(client.mClientID.empty());
    EXPECT_TRUE(trace.Contains("Unknown form parameter: " + lookalike.ToStdString()));
}

TEST(Configuration, LaterEntriesWinAndMigrationSwitchesOnlyTurnOn)
{
    ParameterList parameters;
    parameters.push_back(std::make_pair(tolmonet::kHEADER_USER_AGENT, UTF8String("first")));
    parameters.push_back(std::make_pair(tolmonet::kHEADER_USER_AGENT, UTF8String("second")));
    parameters.push_back(std::make_pair(tolmonet::kHEADER_CACHECONTROL, UTF8String("migrate-previous-major")));
    parameters.push_back(std::make_pair(tolmonet::kHEADER_CACHECONTROL, UTF8String("migrate-major")));
    Tarnvault client(parameters);
    EXPECT_EQ(client.mClientID, "second");
    EXPECT_TRUE(client.mMigrateMajor);
    EXPECT_TRUE(client.mMigratePreviousMajor);
}

TEST(Configuration, UnknownMigrationFormIsTracedAndIgnored)
{
    TraceLines trace("Tarnvault:1");
    Tarnvault client(One(tolmonet::kHEADER_CACHECONTROL, "migrate"));
    EXPECT_FALSE(client.mMigrateMajor);
    EXPECT_FALSE(client.mMigratePreviousMajor);
    EXPECT_TRUE(trace.Contains("Unknown form parameter: " + tolmonet::kHEADER_CACHECONTROL.ToStdString()));
}

TEST(Configuration, AutoLoginWithAGivenTokenUsesTheToken)
{
    ScriptedService service;
    ParameterList parameters = Parameters(service.ApiUrl(), "given", "c");
    parameters.push_back(std::make_pair(tolmonet::kHEADER_SET_COOKIE, UTF8String("auto")));
    boost::shared_ptr<Tarnvault> client(new Tarnvault(parameters));
    EXPECT_TRUE(client->AutoLoginRequested());
    service.Script(200, "[]");
    Outcome outcome;
    client->SearchAsync(outcome.Assets(), outcome.Error(), SearchQuery(), Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    EXPECT_EQ(service.Request(0).Header("Authorization"), "Bearer given");
}

TEST(Configuration, AnotherSetCookieValueTurnsAutoLoginOffAgain)
{
    ParameterList parameters;
    parameters.push_back(std::make_pair(tolmonet::kHEADER_SET_COOKIE, UTF8String("auto")));
    parameters.push_back(std::make_pair(tolmonet::kHEADER_SET_COOKIE, UTF8String("autox")));
    Tarnvault client(parameters);
    EXPECT_FALSE(client.AutoLoginRequested());
}

TEST(Configuration, AutoLoginWithoutATokenIsRefusedPlainly)
{
    try {
        Tarnvault client(One(tolmonet::kHEADER_SET_COOKIE, "auto"));
        FAIL() << "no exception";
    } catch (const std::runtime_error& e) {
        EXPECT_STREQ(e.what(), "Environment login is not available in this build");
    }
}

TEST(Connection, WithoutATokenIsNotLoggedInAtOnce)
{
    ScriptedService service;
    boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(service.ApiUrl(), "", "c")));
    States states;
    EXPECT_TRUE(client->CheckConnection(states.Callback()));
    EXPECT_EQ(states.Seen(), std::vector<SyncServer_ConnectionState>{SyncServer_NotLoggedIn});
    EXPECT_TRUE(service.Requests().empty());
}

TEST(Connection, TheTokenIsProvedByAskingForTheRoot)
{
    ScriptedService service;
    boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(service.ApiUrl(), "tok", "client-1")));
    service.Script(200, "[" + CollectionJSON("r", "client-1", kRootMedia) + "]");
    States good;
    EXPECT_TRUE(client->CheckConnection(good.Callback()));
    ASSERT_TRUE(good.Wait());
    EXPECT_EQ(good.Seen(), std::vector<SyncServer_ConnectionState>{SyncServer_Connected});
    EXPECT_EQ(service.Request(0).mTarget, "/api/collections?name=client-1");
    EXPECT_EQ(service.Request(0).Header("Authorization"), "Bearer tok");
    // The probe's root is its own.
    EXPECT_FALSE(client->CachedRoot());

    service.Script(401, "expired");
    States bad;
    EXPECT_TRUE(client->CheckConnection(bad.Callback()));
    ASSERT_TRUE(bad.Wait());
    EXPECT_EQ(bad.Seen(), std::vector<SyncServer_ConnectionState>{SyncServer_ConnectionFailed});
}

TEST(Connection, SetCredentialsChecksTheNewTokenAndLogoutForgetsIt)
{
    ScriptedService service;
    boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(service.ApiUrl(), "", "client-1")));
    service.Script(200, "[" + CollectionJSON("r", "client-1", kRootMedia) + "]");
    OvraCredentials credentials;
    credentials.accessToken = "new-token";
    credentials.refreshToken = "refresh";
    credentials.userID = "user-7";
    States set;
    EXPECT_TRUE(client->SetCredentials(set.Callback(), credentials));
    ASSERT_TRUE(set.Wait());
    EXPECT_EQ(set.Seen(), std::vector<SyncServer_ConnectionState>{SyncServer_Connected});
    EXPECT_EQ(service.Request(0).Header("Authorization"), "Bearer new-token");
    EXPECT_EQ(client->mUserID, "user-7");

    States out;
    EXPECT_TRUE(client->Logout(out.Callback()));
    EXPECT_EQ(out.Seen(), std::vector<SyncServer_ConnectionState>{SyncServer_NotLoggedIn});
    EXPECT_TRUE(client->mAccessToken.empty());
    EXPECT_TRUE(client->mUserID.empty());
}

TEST(Connection, ProbeThatCannotConnectReportsConnectionFailed)
{
    const std::string url = "http://127.0.0.1:" + std::to_string(testsupport::ClosedLoopbackPort()) + "/api";
    boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(url, "tok", "c")));
    States states;
    EXPECT_TRUE(client->CheckConnection(states.Callback()));
    ASSERT_TRUE(states.Wait());
    EXPECT_EQ(states.Seen(), std::vector<SyncServer_ConnectionState>{SyncServer_ConnectionFailed});
}

TEST(Tracing, NoLineShowsTheBearerToken)
{
    TraceLines trace("8");
    ScriptedService service;
    boost::shared_ptr<Tarnvault> client(new Tarnvault(Parameters(service.ApiUrl(), "", "client-1")));
    service.Script(200, "[" + CollectionJSON("r", "client-1", kRootMedia) + "]");
    service.Script(404, "missing");
    OvraCredentials credentials;
    credentials.accessToken = "secret-access-7";
    credentials.refreshToken = "secret-refresh-7";
    States states;
    client->SetCredentials(states.Callback(), credentials);
    ASSERT_TRUE(states.Wait());
    Outcome outcome;
    client->DownloadAsync(outcome.Downloaded(), outcome.Error(), MakeItem("i1"), File(u"/nonexistent/x"), "",
                          Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    EXPECT_TRUE(trace.Contains("GetRoot, name: <obfuscated>"));
    EXPECT_TRUE(trace.Contains("Download, status_code: 404, body: missing"));
    EXPECT_FALSE(trace.Contains("secret-access-7"));
    EXPECT_FALSE(trace.Contains("secret-refresh-7"));
}

TEST(Service, TypeZeroMakesTheClientThatServiceAndCachesShare)
{
    testsupport::TempDir prefs;
    const tolmocore::filesupport::Dir previous = tolmocore::filesupport::Dir::PrefDir();
    tolmocore::filesupport::Dir::SetPrefDir(
        tolmocore::filesupport::Dir(tolmocore::utility::ToUTF16(prefs.Path().string())));
    {
        boost::shared_ptr<SyncFilesService> service =
            CreateSyncFilesService(SyncServiceType_Tarnvault, One(tolmonet::kHEADER_USER_AGENT, "client-9"));
        EXPECT_EQ(service->GetType(), SyncServiceType_Tarnvault);
        boost::weak_ptr<Tarnvault> client = boost::dynamic_pointer_cast<Tarnvault>(service->GetApi());
        ASSERT_FALSE(client.expired());
        EXPECT_EQ(client.lock()->mClientID, "client-9");
        boost::shared_ptr<SyncCache> cache = service->CreateCache(std::vector<SyncFile>(), std::vector<SyncDir>(),
                                                                  ProgressCallback(), ItemToFileCallback());
        EXPECT_TRUE(boost::dynamic_pointer_cast<TarnvaultCache>(cache));
        EXPECT_EQ(cache->GetApi(), service->GetApi());

        // The client lives until the service and its last cache are gone.
        service.reset();
        EXPECT_FALSE(client.expired());
        cache.reset();
        EXPECT_TRUE(client.expired());
    }
    tolmocore::filesupport::Dir::SetPrefDir(previous);
}
