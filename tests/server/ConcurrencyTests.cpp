// Sixteen clients of two users at once, each on its own kept-alive connection.

#include <atomic>
#include <set>
#include <thread>

#include "ServiceFixture.h"

namespace servertest {
namespace {

const int kClients = 16;
const int kRounds = 8;

class ConcurrencyTest : public ServiceTest {};

TEST_F(ConcurrencyTest, SixteenClientsAtOnceLoseNothingAndMakeOneClientRootPerUser)
{
    std::vector<std::string> folders;
    for (int i = 0; i < kClients; ++i) {
        folders.push_back(CreateCollection(i % 2 ? *mBob : *mAlice, "folder " + std::to_string(i)));
    }
    std::vector<std::string> roots(kClients);
    std::atomic<int> failures{0};
    std::vector<std::thread> threads;
    for (int i = 0; i < kClients; ++i) {
        threads.emplace_back([&, i] {
            ServiceClient client(mService->AssetServiceUrl(), i % 2 ? kBobToken : kAliceToken);
            roots[i] = client.Send("GET", "/collections?name=shared-app").mBody;  // the first request for it
            for (int round = 0; round < kRounds; ++round) {
                const std::string bytes = "client " + std::to_string(i) + " round " + std::to_string(round);
                const Reply upload =
                    client.Send("POST", "/assets?name=f" + std::to_string(round) + Into(folders[i]), bytes);
                const Reply download = client.Send("GET", "/assets/" + IdFromLocation(upload.Header("Location")));
                const Reply search =
                    client.Send("POST", "/search?q=" + Quote("{\"trashed\":{\"$ne\":true}}") +
                                            "&metadata=true&scope=" + Quote("[\"/collections/" + folders[i] + "\"]"));
                if (upload.mStatus != 201 || download.mBody != bytes || search.mStatus != 200) ++failures;
            }
        });
    }
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(0, failures.load());
    EXPECT_EQ(2u, std::set<std::string>(roots.begin(), roots.end()).size());  // alice's and bob's
    for (int i = 0; i < kClients; ++i) {
        EXPECT_EQ(static_cast<std::size_t>(kRounds),
                  Ids((i % 2 ? *mBob : *mAlice).Send("GET", "/collections/" + folders[i] + "/members")).size());
    }
}

}  // namespace
}  // namespace servertest
