// Trace configuration, the guard of each statement, and the line format.

#include <gtest/gtest.h>

#include <cstdio>
#include <filesystem>
#include <mutex>
#include <regex>
#include <thread>
#include <vector>

#include <fcntl.h>
#include <unistd.h>

#include "foundation/core/Trace.h"
#include "support/TempDir.h"

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

void TraceAtLevel(int level)
{
    TOLMO_TRACE("Tarnvault", level, "level " << level);
}

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
    TOLMO_TRACE("OVRA", 8,
                "signed in as "
                    << "someone"
                    << ", status " << 200);
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

namespace {

// This process's stderr goes into a file until Finish, which gives its text.
class StderrCapture {
public:
    explicit StderrCapture(const std::filesystem::path& path) : mPath(path)
    {
        std::fflush(stderr);
        mSaved = dup(2);
        const int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
        dup2(fd, 2);
        close(fd);
    }
    ~StderrCapture() { Finish(); }
    std::string Finish()
    {
        if (mSaved < 0) return std::string();
        std::fflush(stderr);
        dup2(mSaved, 2);
        close(mSaved);
        mSaved = -1;
        return testsupport::ReadFileBytes(mPath);
    }

private:
    std::filesystem::path mPath;
    int mSaved = -1;
};

}  // namespace

TEST_F(TraceTest, TraceFileIsMadePrivateAppendsAndRefusesALinkToAFile)
{
    namespace fs = std::filesystem;
    testsupport::TempDir dir;
    SetTraceSpec("8");
    // What stderr got while `path` was the trace file and one line was traced.
    const auto traceTo = [&](const fs::path& path, const std::string& message) {
        StderrCapture err(dir / "stderr");
        SetTraceFile(path.string());
        TOLMO_TRACE("tolmonetsync", 8, message);
        SetTraceFile("/dev/null");
        return err.Finish();
    };
    const auto mode = [](const fs::path& path) { return fs::status(path).permissions() & fs::perms::mask; };

    EXPECT_EQ(traceTo(dir / "new.trace", "into a new file"), "");
    EXPECT_EQ(mode(dir / "new.trace"), fs::perms::owner_read | fs::perms::owner_write);
    EXPECT_NE(testsupport::ReadFileBytes(dir / "new.trace").find("into a new file"), std::string::npos);

    testsupport::WriteFileBytes(dir / "kept.trace", "earlier\n");
    fs::permissions(dir / "kept.trace", fs::perms::owner_read | fs::perms::owner_write | fs::perms::group_read);
    EXPECT_EQ(traceTo(dir / "kept.trace", "appended"), "");
    EXPECT_EQ(mode(dir / "kept.trace"), fs::perms::owner_read | fs::perms::owner_write | fs::perms::group_read);
    const std::string kept = testsupport::ReadFileBytes(dir / "kept.trace");
    EXPECT_EQ(kept.rfind("earlier\n", 0), 0u);
    EXPECT_NE(kept.find("appended"), std::string::npos);

    // A link planted at the name must not lead the trace into another file.
    testsupport::WriteFileBytes(dir / "victim", "precious\n");
    fs::create_symlink(dir / "victim", dir / "planted.trace");
    const std::string refused = traceTo(dir / "planted.trace", "not for the victim");
    EXPECT_EQ(testsupport::ReadFileBytes(dir / "victim"), "precious\n");
    EXPECT_NE(refused.find("planted.trace refused (it is a symbolic link to a regular file)"), std::string::npos)
        << refused;
    EXPECT_NE(refused.find("not for the victim"), std::string::npos) << "falls back to stderr: " << refused;

    // Devices, also behind links, and the process's own stderr are fine.
    fs::create_symlink("/dev/null", dir / "null.trace");
    EXPECT_EQ(traceTo("/dev/null", "discarded"), "");
    EXPECT_EQ(traceTo(dir / "null.trace", "discarded"), "");
    const std::string own = traceTo("/dev/stderr", "to stderr");
    EXPECT_EQ(own.find("refused"), std::string::npos) << own;
    EXPECT_NE(own.find("to stderr"), std::string::npos) << own;
}
