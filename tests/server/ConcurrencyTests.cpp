// Sixteen clients at once, each on its own kept-alive connection.

#include <atomic>
#include <set>
#include <thread>

#include "ServiceFixture.h"

namespace servertest {
namespace {

const int kClients = 16;
const int kRounds = 8;

class ConcurrencyTest : public ServiceTest {};

TEST_F(ConcurrencyTest, SixteenClientsUploadDownloadAndSearchWithoutErrors)
{
    std::vector<std::string> folders;
    for (int i = 0; i < kClients; ++i) {
        folders.push_back(CreateCollection(i % 2 ? *mBob : *mAlice, "folder " + std::to_string(i)));
    }
    std::atomic<int> failures{0};
    std::vector<std::thread> threads;
    for (int i = 0; i < kClients; ++i) {
        threads.emplace_back([&, i] {
            ServiceClient client(mService->AssetServiceUrl(), i % 2 ? kBobToken : kAliceToken);
            for (int round = 0; round < kRounds; ++round) {
                const std::string bytes = "client " + std::to_string(i) + " round " + std::to_string(round);
                const Reply upload =
                    client.Send("POST", "/assets?name=f" + std::to_string(round) + Into(folders[i]), bytes);
                if (upload.mCode != CURLE_OK || upload.mStatus != 201) {
                    ++failures;
                    continue;
                }
                const Reply download = client.Send("GET", "/assets/" + IdFromLocation(upload.Header("Location")));
                if (download.mStatus != 200 || download.mBody != bytes) ++failures;
                const Reply search =
                    client.Send("POST", "/search?q=" + Quote("{\"trashed\":{\"$ne\":true}}") +
                                            "&metadata=true&scope=" + Quote("[\"/collections/" + folders[i] + "\"]"));
                if (search.mStatus != 200) ++failures;
            }
        });
    }
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(0, failures.load());
    for (int i = 0; i < kClients; ++i) {
        EXPECT_EQ(static_cast<std::size_t>(kRounds),
                  Ids((i % 2 ? *mBob : *mAlice).Send("GET", "/collections/" + folders[i] + "/members")).size());
    }
}

TEST_F(ConcurrencyTest, SimultaneousFirstRequestsMakeOneClientRoot)
{
    std::vector<std::string> ids(kClients);
    std::vector<std::thread> threads;
    for (int i = 0; i < kClients; ++i) {
        threads.emplace_back([&, i] {
            ServiceClient client(mService->AssetServiceUrl(), kAliceToken);
            const Reply reply = client.Send("GET", "/collections?name=shared-app");
            if (reply.mStatus == 200) ids[i] = reply.mBody;
        });
    }
    for (std::thread& thread : threads) thread.join();
    const std::set<std::string> distinct(ids.begin(), ids.end());
    EXPECT_EQ(1u, distinct.size());
    EXPECT_FALSE(distinct.begin()->empty());
}

}  // namespace
}  // namespace servertest
