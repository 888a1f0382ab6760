// The client's configuration from the parameter list, and the service and
// cache that hold it.

#include "ClientTestSupport.h"

using namespace tvtest;

namespace {

ParameterList One(const ImmutableString& key, const char* value)
{
    ParameterList parameters;
    parameters.push_back(std::make_pair(key, UTF8String(value)));
    return parameters;
}

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
    EXPECT_EQ(service.Find("POST", "/api/search?").Header("Authorization"), "Bearer given");
}

TEST(Configuration, AnotherSetCookieValueTurnsAutoLoginOffAgain)
{
    ParameterList parameters;
    parameters.push_back(std::make_pair(tolmonet::kHEADER_SET_COOKIE, UTF8String("auto")));
    parameters.push_back(std::make_pair(tolmonet::kHEADER_SET_COOKIE, UTF8String("autox")));
    Tarnvault client(parameters);
    EXPECT_FALSE(client.AutoLoginRequested());
}

TEST(Configuration, AutoLoginWithoutATokenNeedsTheEnvironmentsNameAndPassword)
{
    unsetenv("TOLMONETSYNC_USERNAME");
    unsetenv("TOLMONETSYNC_PASSWORD");
    try {
        Tarnvault client(One(tolmonet::kHEADER_SET_COOKIE, "auto"));
        FAIL() << "no exception";
    } catch (const std::runtime_error& e) {
        EXPECT_STREQ(e.what(), "Missing env. variable TOLMONETSYNC_USERNAME and TOLMONETSYNC_PASSWORD");
    }
}

TEST(Service, TypeZeroMakesTheClientThatServiceAndCachesShare)
{
    PrefDirScope prefs;
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
}
