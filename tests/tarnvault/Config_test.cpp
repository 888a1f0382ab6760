// The client's configuration from the parameter list, and the service and
// cache that hold it.

#include "ClientTestSupport.h"
#include "support/TestService.h"

using namespace tvtest;

namespace {

ParameterList List(std::initializer_list<std::pair<ImmutableString, const char*> > entries)
{
    ParameterList parameters;
    for (const auto& entry : entries) parameters.push_back(std::make_pair(entry.first, UTF8String(entry.second)));
    return parameters;
}

}  // namespace

TEST(Configuration, EachKeyAndWhatAnUnknownOrRepeatedEntryDoes)
{
    TraceCapture trace("Tarnvault:1");
    const Tarnvault none((ParameterList()));
    EXPECT_EQ(none.mServerURL.ToStdString(), kProduction.ToStdString());
    EXPECT_TRUE(none.mClientID.empty());
    EXPECT_FALSE(none.mMigrateMajor || none.mMigratePreviousMajor || none.AutoLoginRequested());
    EXPECT_EQ(Tarnvault(List({{tolmonet::kHEADER_LOCATION, ""}})).mServerURL.ToStdString(), kProduction.ToStdString());
    EXPECT_EQ(Tarnvault(List({{tolmonet::kHEADER_LOCATION, kStaging.c_str()}})).mServerURL.ToStdString(),
              kStaging.ToStdString());

    // Keys are the constants themselves, not equal text.
    const ImmutableString lookalike = ImmutableString::CreateDynamic(tolmonet::kHEADER_USER_AGENT.ToStdString());
    EXPECT_TRUE(Tarnvault(List({{lookalike, "client-x"}})).mClientID.empty());
    EXPECT_TRUE(trace.Contains("Unknown form parameter: " + lookalike.ToStdString()));

    // Later entries win; the migration switches only turn on.
    const Tarnvault repeated(List({{tolmonet::kHEADER_USER_AGENT, "first"},
                                   {tolmonet::kHEADER_USER_AGENT, "second"},
                                   {tolmonet::kHEADER_CACHECONTROL, "migrate-previous-major"},
                                   {tolmonet::kHEADER_CACHECONTROL, "migrate-major"},
                                   {tolmonet::kHEADER_SET_COOKIE, "auto"},
                                   {tolmonet::kHEADER_SET_COOKIE, "autox"},
                                   {tolmonet::kHEADER_COOKIE, "t"}}));
    EXPECT_EQ(repeated.mClientID, "second");
    EXPECT_TRUE(repeated.mMigrateMajor && repeated.mMigratePreviousMajor);
    EXPECT_FALSE(repeated.AutoLoginRequested());

    const Tarnvault unknownForm(List({{tolmonet::kHEADER_CACHECONTROL, "migrate"}}));
    EXPECT_FALSE(unknownForm.mMigrateMajor || unknownForm.mMigratePreviousMajor);
    EXPECT_TRUE(trace.Contains("Unknown form parameter: " + tolmonet::kHEADER_CACHECONTROL.ToStdString()));
}

TEST(Configuration, AutoLoginUsesAGivenTokenAndOtherwiseNeedsTheEnvironment)
{
    testsupport::TestService service;
    ParameterList parameters = Parameters(service->AssetServiceUrl(), testsupport::kAliceToken, "c");
    parameters.push_back(std::make_pair(tolmonet::kHEADER_SET_COOKIE, UTF8String("auto")));
    boost::shared_ptr<Tarnvault> client(new Tarnvault(parameters));
    EXPECT_TRUE(client->AutoLoginRequested());
    Outcome outcome;
    client->SearchAsync(outcome.Success(), outcome.Error(), SearchQuery(), Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    EXPECT_TRUE(outcome.Succeeded()) << outcome.ErrorText();

    unsetenv("TOLMONETSYNC_USERNAME");
    unsetenv("TOLMONETSYNC_PASSWORD");
    try {
        Tarnvault noToken(List({{tolmonet::kHEADER_SET_COOKIE, "auto"}}));
        FAIL() << "no exception";
    } catch (const std::runtime_error& e) {
        EXPECT_STREQ(e.what(), "Missing env. variable TOLMONETSYNC_USERNAME and TOLMONETSYNC_PASSWORD");
    }
}

TEST(Service, TypeZeroMakesTheClientThatServiceAndCachesShare)
{
    PrefDirScope prefs;
    boost::shared_ptr<SyncFilesService> service =
        CreateSyncFilesService(SyncServiceType_Tarnvault, List({{tolmonet::kHEADER_USER_AGENT, "client-9"}}));
    EXPECT_EQ(service->GetType(), SyncServiceType_Tarnvault);
    boost::weak_ptr<Tarnvault> client = boost::dynamic_pointer_cast<Tarnvault>(service->GetApi());
    ASSERT_FALSE(client.expired());
    EXPECT_EQ(client.lock()->mClientID, "client-9");
    boost::shared_ptr<SyncCache> cache =
        service->CreateCache(std::vector<SyncFile>(), std::vector<SyncDir>(), ProgressCallback(), ItemToFileCallback());
    EXPECT_TRUE(boost::dynamic_pointer_cast<TarnvaultCache>(cache));
    EXPECT_EQ(cache->GetApi(), service->GetApi());
    // The client lives until the service and its last cache are gone.
    service.reset();
    EXPECT_FALSE(client.expired());
    cache.reset();
    EXPECT_TRUE(client.expired());
}
