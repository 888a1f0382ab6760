// Trace configuration, the guard of each statement, and the line format.

#include <gtest/gtest.h>

#include <mutex>
#include <regex>
#include <thread>
#include <vector>

#include "foundation/core/Trace.h"

using namespace tolmocore::debug;

namespace {

// Collects lines through the listener; restores a silent configuration after.
class TraceTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        SetTraceFile("/dev/null");  // keep stderr quiet; the listener still sees lines
        SetTraceListener([this](const std::string& line) {
            std::lock_guard<std::mutex> lock(mMutex);
            mLines.push_back(line);
        });
    }
    void TearDown() override
    {
        SetTraceListener(TraceListener());
        SetTraceSpec("");
        SetTraceFile("");
    }
    std::vector<std::string> Lines()
    {
        std::lock_guard<std::mutex> lock(mMutex);
        return mLines;
    }

    std::mutex mMutex;
    std::vector<std::string> mLines;
};

int sBuilt = 0;
int Counted(int value)
{
    ++sBuilt;
    return value;
}

void TraceAtLevel(int level) { TOLMO_TRACE("Tarnvault", level, "level " << level); }

}  // namespace

TEST_F(TraceTest, OffByDefaultAndBuildsNoTextWhenOff)
{
    SetTraceSpec("");
    sBuilt = 0;
    TOLMO_TRACE("tolmonetsync", 1, "value " << Counted(1));
    EXPECT_EQ(sBuilt, 0);
    EXPECT_TRUE(Lines().empty());
}

TEST_F(TraceTest, LineHasThreadCategoryLevelAndMessage)
{
    SetTraceSpec("8");
    TOLMO_TRACE("OVRA", 8, "signed in as " << "someone" << ", status " << 200);
    const auto lines = Lines();
    ASSERT_EQ(lines.size(), 1u);
    EXPECT_TRUE(std::regex_match(lines[0], std::regex("<[0-9]+> <OVRA> <8> signed in as someone, status 200\n")))
        << lines[0];
}

TEST_F(TraceTest, PerCategoryLevelsAndTheDefault)
{
    SetTraceSpec("Tarnvault:1,tolmonetsync:8");
    TOLMO_TRACE("Tarnvault", 8, "hidden");
    TOLMO_TRACE("Tarnvault", 1, "warning");
    TOLMO_TRACE("tolmonetsync", 8, "progress");
    TOLMO_TRACE("OVRA", 1, "not named, default off");
    auto lines = Lines();
    ASSERT_EQ(lines.size(), 2u);
    EXPECT_NE(lines[0].find("warning"), std::string::npos);
    EXPECT_NE(lines[1].find("progress"), std::string::npos);

    SetTraceSpec("1,OVRA:8,broken:x,:");
    TOLMO_TRACE("OVRA", 8, "now on");
    TOLMO_TRACE("tolmonetsync", 1, "default level 1");
    TOLMO_TRACE("broken", 8, "bad part ignored, default applies");
    lines = Lines();
    ASSERT_EQ(lines.size(), 4u);
}

TEST_F(TraceTest, GuardNoticesEveryConfigurationChange)
{
    SetTraceSpec("");
    for (int round = 0; round < 3; ++round) {
        TraceAtLevel(8);
        SetTraceSpec("Tarnvault:8");
        TraceAtLevel(8);
        SetTraceSpec("");
    }
    EXPECT_EQ(Lines().size(), 3u);
}

TEST_F(TraceTest, GuardKeepsTheAnswerOfTheLevelSeenAtTheLastChange)
{
    // One statement with a level computed at run time: its stored answer
    // belongs to the level it saw when the configuration last changed.
    SetTraceSpec("Tarnvault:1");
    TraceAtLevel(1);
    TraceAtLevel(8);
    EXPECT_EQ(Lines().size(), 2u);
}

TEST_F(TraceTest, ManyThreadsTraceAndReconfigureAtOnce)
{
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([t] {
            for (int i = 0; i < 500; ++i) {
                if (t == 0 && i % 50 == 0) SetTraceSpec(i % 100 == 0 ? "8" : "");
                TOLMO_TRACE("tolmonetsync", 8, "thread " << t << " line " << i);
            }
        });
    }
    for (auto& thread : threads) thread.join();
    for (const auto& line : Lines()) EXPECT_EQ(line.back(), '\n');
}
