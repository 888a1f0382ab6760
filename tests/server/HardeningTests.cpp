// What the service does against a second service on its data directory,
// password guessing, idle sessions, and answers that would tell too much.

#include <chrono>
#include <mutex>

#include <sys/stat.h>

#include <boost/json.hpp>

#include "ServiceFixture.h"
#include "server/Accounts.h"
#include "server/ContentFiles.h"
#include "server/DataDirectoryLock.h"
#include "server/Database.h"
#include "server/Random.h"

namespace servertest {
namespace {

using testsupport::TestService;
using tolmonetsync::server::Database;
using tolmonetsync::server::LocalServiceOptions;

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

// Two users whose sign-in waits are recorded instead of slept.
class SignInTest : public ::testing::Test {
protected:
    long SignIn(const std::string& name, const std::string& password)
    {
        return Identity()
            .Send("POST", "/login/v1/device?username=" + Quote(name) + "&password=" + Quote(password))
            .mStatus;
    }
    ServiceClient Identity() { return ServiceClient(mService->IdentityServiceUrl(), ""); }
    std::vector<long> Waits()
    {
        std::lock_guard<std::mutex> lock(mMutex);
        return mWaits;
    }
    // Runs `sql` on the service's database with the hash of `secret` as ?1.
    void Execute(const char* sql, const std::string& secret)
    {
        Database database((mService.DataDirectory() / "service.sqlite3").string(), 1);
        Database::Lease db = database.Acquire();
        tolmonetsync::server::Statement(*db, sql).Bind(1, tolmonetsync::server::Sha256Hex(secret)).Run();
    }

    std::mutex mMutex;  // guards mWaits
    std::vector<long> mWaits;
    TestService mService{[this](LocalServiceOptions& options) {
        options.mUsers = {{"ann", "secret", ""}, {"bob", "secret", ""}};
        options.mSignInDelays.mBase = std::chrono::milliseconds(100);
        options.mSignInDelays.mCap = std::chrono::milliseconds(400);
        options.mSignInDelays.mWait = [this](std::chrono::milliseconds wait) {
            std::lock_guard<std::mutex> lock(mMutex);
            mWaits.push_back(wait.count());
        };
    }};
};

TEST_F(SignInTest, FailuresWaitLongerUpToTheCapPerNameAndNeverLockOut)
{
    for (int i = 0; i < 5; ++i) EXPECT_EQ(401, SignIn("ann", "guess" + std::to_string(i)));
    EXPECT_EQ((std::vector<long>{100, 200, 400, 400}), Waits());

    EXPECT_EQ(200, SignIn("bob", "secret"));  // another name is not slowed
    EXPECT_EQ(4u, Waits().size());

    EXPECT_EQ(200, SignIn("ann", "secret"));  // the right password still opens, after the wait
    EXPECT_EQ(401, SignIn("ann", "wrong"));   // and a success starts the count again
    EXPECT_EQ((std::vector<long>{100, 200, 400, 400, 400}), Waits());
}

TEST_F(SignInTest, AnUnknownUserCostsTheSamePasswordHashAsAWrongPassword)
{
    tolmonetsync::server::Accounts& accounts = mService->GetAccounts();
    const std::uint64_t before = accounts.HashesComputed();
    EXPECT_FALSE(accounts.CheckPassword("ann", "wrong"));
    const std::uint64_t afterWrong = accounts.HashesComputed();
    EXPECT_FALSE(accounts.CheckPassword("nobody", "secret"));
    EXPECT_EQ(1u, afterWrong - before);
    EXPECT_EQ(1u, accounts.HashesComputed() - afterWrong);
}

TEST_F(SignInTest, ASessionUnusedForAMonthEndsWithItsTokens)
{
    ServiceClient identity = Identity();
    const auto signIn = [&identity] {
        return boost::json::parse(identity.Send("POST", "/login/v1/device?username=ann&password=secret").mBody);
    };
    const auto field = [](const boost::json::value& tokens, const char* name) {
        return boost::json::value_to<std::string>(tokens.at(name));
    };
    const auto refresh = [&](const boost::json::value& tokens) {
        return identity
            .Send("POST", "/token/v1?grant_type=refresh_token&refresh_token=" + Quote(field(tokens, "refresh_token")))
            .mStatus;
    };
    const auto accessWorks = [&](const boost::json::value& tokens) {
        ServiceClient client(mService->AssetServiceUrl(), field(tokens, "access_token"));
        return client.Send("GET", "/collections?name=app").mStatus == 200;
    };
    const boost::json::value idle = signIn();
    const boost::json::value active = signIn();
    Execute("UPDATE sessions SET used = 1 WHERE device_hash = ?1", field(idle, "device_token"));
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
