// What the service does against a second service on its data directory,
// password guessing, stale tokens and answers that would tell too much.

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

using tolmonetsync::server::DataDirectoryInUse;
using tolmonetsync::server::LocalService;
using tolmonetsync::server::LocalServiceOptions;

unsigned Mode(const std::filesystem::path& path)
{
    struct stat status {};
    EXPECT_EQ(0, ::stat(path.c_str(), &status)) << path;
    return status.st_mode & 07777;
}

TEST(DataDirectory, ASecondServiceIsRefusedBeforeItSweepsAndFilesArePrivate)
{
    testsupport::TempDir root;
    LocalServiceOptions options;
    options.mDataDirectory = (root / "data").string();
    auto first = std::make_unique<LocalService>(options);
    EXPECT_EQ(0700u, Mode(root / "data"));
    EXPECT_EQ(0600u, Mode(root / "data" / "service.sqlite3"));

    // The first one's upload in flight: a second start-up would sweep it away.
    const std::filesystem::path inFlight = root / "data" / "content" / "incoming.item.abc123";
    testsupport::WriteFileBytes(inFlight, "half written");
    try {
        LocalService second(options);
        ADD_FAILURE() << "a second service started on a data directory in use";
    } catch (const DataDirectoryInUse& refused) {
        EXPECT_EQ("data directory " + options.mDataDirectory + " is in use by another tolmonetsync serve",
                  std::string(refused.what()));
    }
    EXPECT_TRUE(std::filesystem::exists(inFlight));

    first.reset();
    EXPECT_NO_THROW(LocalService again(options));  // the lock goes with the service
}

// A service with one user whose sign-in waits are recorded instead of slept.
class SignInTest : public ::testing::Test {
protected:
    SignInTest()
    {
        LocalServiceOptions options;
        options.mDataDirectory = mData.Path().string();
        options.mUsers = {{"ann", "secret", ""}, {"bob", "secret", ""}};
        options.mSignInDelays.mBase = std::chrono::milliseconds(100);
        options.mSignInDelays.mCap = std::chrono::milliseconds(400);
        options.mSignInDelays.mWait = [this](std::chrono::milliseconds wait) {
            std::lock_guard<std::mutex> lock(mMutex);
            mWaits.push_back(wait.count());
        };
        mService = std::make_unique<LocalService>(options);
        mService->Start();
    }

    long SignIn(const std::string& name, const std::string& password)
    {
        ServiceClient identity(mService->IdentityServiceUrl(), "");
        return identity.Send("POST", "/login/v1/device?username=" + Quote(name) + "&password=" + Quote(password))
            .mStatus;
    }

    std::vector<long> Waits()
    {
        std::lock_guard<std::mutex> lock(mMutex);
        return mWaits;
    }

    testsupport::TempDir mData;
    std::mutex mMutex;  // guards mWaits
    std::vector<long> mWaits;
    std::unique_ptr<LocalService> mService;
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

TEST_F(SignInTest, ExpiredTokensArePurgedOnSignInAndAtStartUp)
{
    const auto rows = [this](const std::string& token) {
        tolmonetsync::server::Database database(mData.Path().string() + "/service.sqlite3", 1);
        tolmonetsync::server::Database::Lease db = database.Acquire();
        tolmonetsync::server::Statement count(*db, "SELECT COUNT(*) FROM tokens WHERE hash = ?1");
        count.Bind(1, tolmonetsync::server::Sha256Hex(token)).Step();
        return count.Int(0);
    };
    mService->GetAccounts().GrantToken("ann", "stale-one", -1);
    mService->GetAccounts().GrantToken("ann", "fresh-one", 3600);
    ASSERT_EQ(1, rows("stale-one"));
    EXPECT_EQ(200, SignIn("ann", "secret"));
    EXPECT_EQ(0, rows("stale-one"));
    EXPECT_EQ(1, rows("fresh-one"));

    mService->GetAccounts().GrantToken("ann", "stale-two", -1);
    LocalServiceOptions options;
    options.mDataDirectory = mData.Path().string();
    mService.reset();
    mService = std::make_unique<LocalService>(options);
    EXPECT_EQ(0, rows("stale-two"));
}

TEST_F(SignInTest, ASessionUnusedForAMonthEndsWithItsTokens)
{
    ServiceClient identity(mService->IdentityServiceUrl(), "");
    const auto signIn = [&identity] {
        return boost::json::parse(identity.Send("POST", "/login/v1/device?username=ann&password=secret").mBody);
    };
    const auto refresh = [&identity](const boost::json::value& tokens) {
        return identity
            .Send("POST", "/token/v1?grant_type=refresh_token&refresh_token=" +
                              Quote(boost::json::value_to<std::string>(tokens.at("refresh_token"))))
            .mStatus;
    };
    const auto accessWorks = [this](const boost::json::value& tokens) {
        ServiceClient client(mService->AssetServiceUrl(),
                             boost::json::value_to<std::string>(tokens.at("access_token")));
        return client.Send("GET", "/collections?name=app").mStatus == 200;
    };
    const boost::json::value idle = signIn();
    const boost::json::value active = signIn();
    {
        tolmonetsync::server::Database database(mData.Path().string() + "/service.sqlite3", 1);
        tolmonetsync::server::Database::Lease db = database.Acquire();
        tolmonetsync::server::Statement(*db, "UPDATE sessions SET used = ?1 WHERE device_hash = ?2")
            .Bind(1, std::int64_t(1))
            .Bind(2, tolmonetsync::server::Sha256Hex(boost::json::value_to<std::string>(idle.at("device_token"))))
            .Run();
    }
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
    const Reply broken = mAlice->Send(
        "POST", "/assets?name=lost.txt&collections=" + Quote("[\"/api/collections/" + folder + "\"]"), "bytes");
    EXPECT_EQ(500, broken.mStatus);
    EXPECT_EQ(std::string::npos, broken.mBody.find(mData.Path().string())) << broken.mBody;
    EXPECT_EQ(std::string::npos, broken.mBody.find("content")) << broken.mBody;
    EXPECT_EQ("", broken.Header("EXCEPTION_WHAT"));
}

}  // namespace
}  // namespace servertest
