#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "foundation/core/Threads.h"

using namespace tolmocore::threads;

TEST(Gate, WaitersPassOnlyOnceOpen)
{
    Gate gate(false);
    EXPECT_FALSE(gate.PassThrough(10));
    std::thread opener([&] { gate.Open(); });
    EXPECT_TRUE(gate.PassThrough(-1));
    opener.join();
    EXPECT_TRUE(gate.PassThrough(0));
}

TEST(OpenOnceGate, EveryWaiterPassesOnceAnyOpenerHasOpened)
{
    OpenOnceGate closed;
    EXPECT_FALSE(closed.PassThrough(5));
    for (int round = 0; round < 50; ++round) {
        OpenOnceGate gate;
        std::atomic<int> passed{0};
        std::vector<std::thread> threads;
        for (int i = 0; i < 3; ++i) threads.emplace_back([&] { passed += gate.PassThrough(-1) ? 1 : 0; });
        for (int i = 0; i < 2; ++i) threads.emplace_back([&] { gate.Open(); });
        for (auto& thread : threads) thread.join();
        EXPECT_EQ(passed.load(), 3);
        EXPECT_TRUE(gate.PassThrough(0));
    }
}

TEST(RecursiveMutex, SameThreadMayLockAgainOthersWait)
{
    RecursiveMutex mutex;
    int shared = 0;
    mutex.Lock("outer");
    mutex.Lock("inner");
    std::thread other([&] {
        mutex.Lock(__func__);
        shared = 2;
        mutex.Unlock();
    });
    shared = 1;
    mutex.Unlock();
    mutex.Unlock();
    other.join();
    EXPECT_EQ(shared, 2);
}
