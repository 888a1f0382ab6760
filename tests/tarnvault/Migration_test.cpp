// Migration of an earlier host version's preferences into a new
// preferences root: which version is looked for, where, and what arrives.

#include "ClientTestSupport.h"

using namespace tvtest;

namespace {

const std::string kRoot = CollectionJSON("root1", "client-1", kRootMedia);

class MigrationTest : public ::testing::Test {
protected:
    boost::shared_ptr<Tarnvault> Client(std::initializer_list<const char*> forms)
    {
        ParameterList parameters = Parameters(mService.ApiUrl(), "tok", "client-1");
        for (const char* form : forms)
            parameters.push_back(std::make_pair(tolmonet::kHEADER_CACHECONTROL, UTF8String(form)));
        return boost::shared_ptr<Tarnvault>(new Tarnvault(parameters));
    }
    // The answers that make a new preferences root "pref1" under "root1".
    void ScriptNewPreferencesRoot(bool rootCached = false)
    {
        if (!rootCached) mService.Script(200, "[" + kRoot + "]");
        mService.Script(200, "[]");
        mService.Script(201, "", {{"Location", "/api/collections/pref1"}});
        mService.Script(200, CollectionJSON("pref1", "new", kPreferencesMedia));
        mService.Script(200, "");
    }
    // The decoded target of the first search holding `part`; empty if none.
    std::string SearchFor(const std::string& part)
    {
        return Decode(mService.Find("POST", "/api/search?", part).mTarget);
    }

    ScriptedService mService;
};

}  // namespace

TEST_F(MigrationTest, WithoutAFormNoOldRootIsLookedFor)
{
    HostIdentity host(u"A", u"B", u"9.0");
    const auto client = Client({});
    ScriptNewPreferencesRoot();
    Outcome outcome;
    client->GetPreferencesRootAsync(outcome.CollectionDone(), outcome.Error(), Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    ASSERT_TRUE(outcome.Succeeded());
    EXPECT_EQ(mService.Requests().size(), 5u);
}

TEST_F(MigrationTest, MinorFormOnAnX0VersionRefusesAndMakesNothingAgainAndAgain)
{
    HostIdentity host(u"A", u"B", u"9.0");
    const auto client = Client({"migrate-major"});
    mService.Script(200, "[" + kRoot + "]");
    mService.Script(200, "[]");
    mService.Script(200, "[]");
    for (int attempt = 0; attempt < 2; ++attempt) {
        Outcome outcome;
        client->GetPreferencesRootAsync(outcome.CollectionDone(), outcome.Error(), Guid::CreateUnique());
        ASSERT_TRUE(outcome.Wait());
        EXPECT_EQ(outcome.ErrorText(), "Could not migrate preferences, problem with client version");
    }
    EXPECT_TRUE(client->mMigrateMajor);
    EXPECT_EQ(mService.Requests().size(), 3u);  // the root, then one search per attempt
}

TEST_F(MigrationTest, BothFormsOnAnX0VersionCopyTheX5TreeWithNamesRenamed)
{
    HostIdentity host(u"A", u"B", u"9.0");
    const auto client = Client({"migrate-major", "migrate-previous-major"});
    ScriptNewPreferencesRoot();
    mService.Script(200, "[" + CollectionJSON("old", "A_B_8.5", kPreferencesMedia) + "]");
    mService.Script(200, "[" + ItemJSON("i1", "theme_8.5.json") + "]");
    mService.Script(200, "content", {{"Content-Type", "application/json"}});
    mService.Script(200, "[]");
    mService.Script(201, "", {{"Location", "/api/assets/up1"}});
    mService.Script(200, ItemJSON("up1", "theme_9.0.json"));
    Outcome outcome;
    const Guid chain = client->GetPreferencesRootAsync(outcome.CollectionDone(), outcome.Error(), Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    ASSERT_TRUE(outcome.Succeeded()) << outcome.ErrorText();
    EXPECT_EQ(outcome.Id(), chain);
    EXPECT_EQ(outcome.AssetSeen()->mId, "pref1");
    EXPECT_FALSE(client->mMigrateMajor);
    EXPECT_FALSE(client->mMigratePreviousMajor);

    const auto requests = mService.Requests();
    ASSERT_EQ(requests.size(), 11u);
    EXPECT_NE(SearchFor(R"("name":"A_B_8.5")").find(R"(scope=["/collections/root1"])"), std::string::npos);
    EXPECT_FALSE(SearchFor(R"(scope=["/collections/old"])").empty());
    EXPECT_EQ(mService.Find("GET", "/api/assets/i1").mTarget, "/api/assets/i1");
    const HttpRequest upload = mService.Find("POST", "/api/assets?");
    EXPECT_EQ(Decode(upload.mTarget), R"(/api/assets?name=theme_9.0.json&collections=["/api/collections/pref1"])");
    EXPECT_EQ(upload.Header("Content-Type"), "application/json");
    EXPECT_EQ(upload.mBody, "content");
    for (const HttpRequest& request : requests) EXPECT_NE(request.mMethod, "DELETE");
}

TEST_F(MigrationTest, PreviousMajorFormLooksForX0AndANothingFoundDeliversTheNewRoot)
{
    HostIdentity host(u"A", u"B", u"9.3");
    const auto client = Client({"migrate-previous-major"});
    ScriptNewPreferencesRoot();
    mService.Script(200, "[]");
    Outcome outcome;
    client->GetPreferencesRootAsync(outcome.CollectionDone(), outcome.Error(), Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    ASSERT_TRUE(outcome.Succeeded());
    EXPECT_EQ(outcome.AssetSeen()->mId, "pref1");
    EXPECT_FALSE(SearchFor(R"("name":"A_B_8.0")").empty());
    EXPECT_EQ(mService.Requests().size(), 6u);
}

TEST_F(MigrationTest, FailuresAfterTheNewRootAreIgnored)
{
    HostIdentity host(u"A", u"B", u"9.2");
    const auto client = Client({"migrate-major"});
    ScriptNewPreferencesRoot();
    mService.Script(500, "search broke");
    Outcome outcome;
    client->GetPreferencesRootAsync(outcome.CollectionDone(), outcome.Error(), Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    ASSERT_TRUE(outcome.Succeeded());
    EXPECT_FALSE(SearchFor(R"("name":"A_B_9.1")").empty());
}

TEST_F(MigrationTest, OldHostVersionsSearchBelowTheOlderClientIdentifiersRoot)
{
    HostIdentity host(u"A", u"Cinderal", u"9.0");
    const auto client = Client({"migrate-previous-major"});
    ScriptNewPreferencesRoot();
    mService.Script(200, "[" + CollectionJSON("oldroot", "x", kRootMedia) + "]");
    mService.Script(200, "[]");
    Outcome outcome;
    client->GetPreferencesRootAsync(outcome.CollectionDone(), outcome.Error(), Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    ASSERT_TRUE(outcome.Succeeded());
    EXPECT_EQ(mService.Find("GET", "/api/collections?name=5d26c4f8-0ae1-47b3-9c15-c3e7b0926d41").mMethod, "GET");
    EXPECT_NE(SearchFor(R"("name":"A_Cinderal_8.0")").find(R"(scope=["/collections/oldroot"])"), std::string::npos);
    // The older root is not cached in place of ours.
    EXPECT_EQ(client->CachedRoot()->mId, "root1");
}

TEST_F(MigrationTest, OldHostVersionsFailWhenTheOlderRootIsMissing)
{
    HostIdentity host(u"A", u"Cinderal", u"9.0");
    const auto client = Client({"migrate-previous-major"});
    ScriptNewPreferencesRoot();
    mService.Script(200, "[]");
    Outcome outcome;
    client->GetPreferencesRootAsync(outcome.CollectionDone(), outcome.Error(), Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    EXPECT_EQ(outcome.ErrorText(), "Could not find root collection!");
}

TEST_F(MigrationTest, CinderalAboveX0SearchesBelowTheClientRoot)
{
    HostIdentity host(u"A", u"Cinderal", u"9.0");
    const auto client = Client({"migrate-major", "migrate-previous-major"});
    ScriptNewPreferencesRoot();
    mService.Script(200, "[]");
    Outcome outcome;
    client->GetPreferencesRootAsync(outcome.CollectionDone(), outcome.Error(), Guid::CreateUnique());
    ASSERT_TRUE(outcome.Wait());
    ASSERT_TRUE(outcome.Succeeded());
    EXPECT_NE(SearchFor(R"("name":"A_Cinderal_8.5")").find(R"(scope=["/collections/root1"])"), std::string::npos);
}
