// A host polls the public fetch state from its own thread and, once it reads
// 2, 3 or 4, reads the user's fields directly while the library's thread
// may still be running. ThreadSanitizer checks that the fields were
// published before the state.

#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <thread>

#include "FakeOvraLibrary.h"

namespace {

using namespace nativetest;
using tolmonetsync::OvraConnection;

// Spins until the fetch has ended; bounded so a lost callback fails instead of hanging.
int AwaitEndOfFetch(const OvraConnection& connection)
{
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(30);
    int state = connection.fetchState.load(std::memory_order_acquire);
    while (state < OvraConnection::kFetchState_Received && std::chrono::steady_clock::now() < deadline) {
        std::this_thread::yield();
        state = connection.fetchState.load(std::memory_order_acquire);
    }
    return state;
}

TEST(NativeFetchPublication, FieldsAreCompleteOnceTheStateSaysReceived)
{
    FakeOvraState& fake = LoadFake(FAKE_OVRA_LIB);
    const boost::shared_ptr<OvraConnection> connection = Connect(FAKE_OVRA_LIB);
    for (int round = 0; round < 20; ++round) {
        const std::string n = std::to_string(round);
        fake.SetText("OVRA_fetchAccessToken",
                     ("{\"access_token\": \"tok-" + n + "\", \"email\": \"u" + n + "@example.test\"}").c_str());
        ASSERT_TRUE(connection->GetUserInfoAndFetchToken(true, UTF8String("user-" + n), UTF8String(), UTF8String(),
                                                         UTF8String()));
        ASSERT_EQ(AwaitEndOfFetch(*connection), OvraConnection::kFetchState_Received) << round;
        // Read at once, with no lock and no wait for the library's thread.
        EXPECT_EQ(connection->accessToken.ToStdString(), "tok-" + n);
        EXPECT_EQ(connection->email.ToStdString(), "u" + n + "@example.test");
        EXPECT_EQ(connection->userID.ToStdString(), "user-" + n);
        ASSERT_TRUE(fake.WaitUntilIdle());
    }
}

}  // namespace
