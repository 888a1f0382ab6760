// What the service does against a second service on its data directory,
// listening beyond loopback, odd command-line values, password guessing,
// idle sessions, and answers that would tell too much.

#include <chrono>

#include <sys/stat.h>

#include <boost/json.hpp>

#include "ServiceFixture.h"
#include "server/Accounts.h"
#include "server/ContentFiles.h"
#include "server/DataDirectoryLock.h"
#include "server/Database.h"
#include "server/Random.h"
#include "server/ServiceArguments.h"
#include "support/CallRecorder.h"

namespace servertest {
namespace {

using testsupport::TestService;
using namespace tolmonetsync::server;

unsigned Mode(const std::filesystem::path& path)
{
    struct stat status {};
    EXPECT_EQ(0, ::stat(path.c_str(), &status)) << path;
    return status.st_mode & 07777;
}

TEST(DataDirectory, ASecondServiceIsRefusedBeforeItSweepsAndFilesArePrivate)
{
    TestService first;
    EXPECT_EQ(0700u, Mode(first.DataDirectory()));
    EXPECT_EQ(0600u, Mode(first.DataDirectory() / "service.sqlite3"));

    // The first one's upload in flight: a second start-up would sweep it away.
    const std::filesystem::path inFlight = first.DataDirectory() / "content" / "incoming.item.abc123";
    testsupport::WriteFileBytes(inFlight, "half written");
    const auto sameDirectory = [&first](LocalServiceOptions& options) { options = first.Options(); };
    try {
        TestService second(sameDirectory);
        ADD_FAILURE() << "a second service started on a data directory in use";
    } catch (const tolmonetsync::server::DataDirectoryInUse& refused) {
        EXPECT_EQ("data directory " + first.DataDirectory().string() + " is in use by another tolmonetsync serve",
                  std::string(refused.what()));
    }
    EXPECT_TRUE(std::filesystem::exists(inFlight));

    first.Stop();
    EXPECT_NO_THROW(TestService again(sameDirectory));  // the lock goes with the service
}

TEST(ServeArguments, OnlyLoopbackUrlSafeTokensAndPasswordsWithColonsAreTaken)
{
    const ServiceUser mailed = ParseUserArgument("ann:pa:ss:ann@example.org");  // the email is the last part
    EXPECT_EQ("ann", mailed.mName);
    EXPECT_EQ("pa:ss", mailed.mPassword);
    EXPECT_EQ("ann@example.org", mailed.mEmail);
    EXPECT_EQ("", ParseUserArgument("ann:pa:ss").mEmail);
    EXPECT_EQ("pa:ss", ParseUserArgument("ann:pa:ss").mPassword);
    LocalServiceOptions options;
    EXPECT_THROW(ParseListenArgument("0.0.0.0:80", options), std::invalid_argument);
    ParseListenArgument("localhost:0", options);
    EXPECT_EQ("127.0.0.1", options.mHost);
    // The profile call sends a token unquoted.
    EXPECT_THROW(ParseTokenArgument("ann:has space"), std::invalid_argument);
    EXPECT_EQ("abc-DEF_123", ParseTokenArgument("ann:abc-DEF_123").mToken);
}

// Two users whose sign-in waits are recorded instead of slept.
class SignInTest : public ::testing::Test {
protected:
    long SignIn(const std::string& name, const std::string& password)
    {
        return mIdentity.Send("POST", "/login/v1/device?username=" + Quote(name) + "&password=" + Quote(password))
            .mStatus;
    }

    testsupport::CallRecorder<long> mWaits;
    TestService mService{[waits = mWaits](LocalServiceOptions& options) {
        options.mUsers = {{"ann", "secret", ""}, {"bob", "secret", ""}};
        options.mSignInDelays.mBase = std::chrono::milliseconds(100);
        options.mSignInDelays.mCap = std::chrono::milliseconds(400);
        options.mSignInDelays.mWait = [waits](std::chrono::milliseconds wait) { waits.Add(wait.count()); };
    }};
    ServiceClient mIdentity{mService->IdentityServiceUrl(), ""};
};

TEST_F(SignInTest, FailuresWaitLongerUpToTheCapPerNameAndNeverLockOut)
{
    for (int i = 0; i < 5; ++i) EXPECT_EQ(401, SignIn("ann", "guess" + std::to_string(i)));
    EXPECT_EQ((std::vector<long>{100, 200, 400, 400}), mWaits.All());

    EXPECT_EQ(200, SignIn("bob", "secret"));  // another name is not slowed
    EXPECT_EQ(4u, mWaits.All().size());

    EXPECT_EQ(200, SignIn("ann", "secret"));  // the right password still opens, after the wait
    EXPECT_EQ(401, SignIn("ann", "wrong"));   // and a success starts the count again
    EXPECT_EQ((std::vector<long>{100, 200, 400, 400, 400}), mWaits.All());

    // An unknown name costs a password hash too, so its answer comes no sooner.
    const std::uint64_t hashes = mService->GetAccounts().HashesComputed();
    EXPECT_EQ(401, SignIn("nobody", "secret"));
    EXPECT_EQ(hashes + 1, mService->GetAccounts().HashesComputed());
}

TEST_F(SignInTest, ASessionUnusedForAMonthEndsWithItsTokens)
{
    const auto signIn = [this] {
        return boost::json::parse(mIdentity.Send("POST", "/login/v1/device?username=ann&password=secret").mBody);
    };
    const auto field = [](const boost::json::value& tokens, const char* name) {
        return boost::json::value_to<std::string>(tokens.at(name));
    };
    const auto refresh = [&](const boost::json::value& tokens) {
        return mIdentity
            .Send("POST", "/token/v1?grant_type=refresh_token&refresh_token=" + Quote(field(tokens, "refresh_token")))
            .mStatus;
    };
    const auto accessWorks = [&](const boost::json::value& tokens) {
        return ServiceClient(mService->AssetServiceUrl(), field(tokens, "access_token"))
                   .Send("GET", "/collections?name=app")
                   .mStatus == 200;
    };
    const boost::json::value idle = signIn();
    const boost::json::value active = signIn();
    Database database((mService.DataDirectory() / "service.sqlite3").string(), 1);
    Statement(*database.Acquire(), "UPDATE sessions SET used = 1 WHERE device_hash = ?1")
        .Bind(1, Sha256Hex(field(idle, "device_token")))
        .Run();
    EXPECT_EQ(400, refresh(idle));
    signIn();  // purges
    EXPECT_FALSE(accessWorks(idle));
    EXPECT_TRUE(accessWorks(active));
    EXPECT_EQ(200, refresh(active));
}

TEST_F(ServiceTest, AStorageFailureAnswersWithoutPathsOfTheMachine)
{
    const std::string folder = CreateCollection(*mAlice, "f");
    std::filesystem::remove_all(mService->Content().PathOf(""));  // the content file cannot be made
    const Reply broken = mAlice->Send("POST", "/assets?name=lost.txt" + Into(folder), "bytes");
    EXPECT_EQ(500, broken.mStatus);
    EXPECT_EQ(std::string::npos, broken.mBody.find(mService.DataDirectory().parent_path().string())) << broken.mBody;
    EXPECT_EQ(std::string::npos, broken.mBody.find("content")) << broken.mBody;
    EXPECT_EQ("", broken.Header("EXCEPTION_WHAT"));
}

}  // namespace
}  // namespace servertest
