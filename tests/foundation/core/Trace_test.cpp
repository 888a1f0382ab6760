// Which statements trace, and where the lines may go.

#include <gtest/gtest.h>

#include <filesystem>
#include <thread>
#include <vector>

#include "foundation/core/Trace.h"
#include "support/TestScopes.h"

using namespace tolmocore::debug;
namespace fs = std::filesystem;

namespace {

int sBuilt = 0;
int Counted(int value)
{
    return ++sBuilt, value;
}

// One statement whose level is computed at run time: it keeps the answer for
// the level it saw first after the configuration last changed.
void TraceAtLevel(int level)
{
    TOLMO_TRACE("Tarnvault", level, "level " << level);
}

}  // namespace

TEST(Trace, LevelsPerCategoryAndTheGuardFollowsEveryChange)
{
    testsupport::TraceCapture trace("");
    TOLMO_TRACE("tolmonetsync", 1, "value " << Counted(1));
    EXPECT_EQ(sBuilt, 0) << "no text is built while tracing is off";

    SetTraceSpec("Tarnvault:1,tolmonetsync:8");
    TOLMO_TRACE("Tarnvault", 8, "hidden");
    TOLMO_TRACE("tolmonetsync", 8, "shown");
    TOLMO_TRACE("OVRA", 1, "hidden: not named, default off");
    TraceAtLevel(1);
    TraceAtLevel(8);
    SetTraceSpec("1,OVRA:8,broken:x,:");
    TOLMO_TRACE("OVRA", 8, "shown");
    TOLMO_TRACE("broken", 1, "shown: a bad part is ignored and the default applies");
    for (int round = 0; round < 3; ++round) {
        SetTraceSpec("");
        TraceAtLevel(8);
        SetTraceSpec("Tarnvault:8");
        TraceAtLevel(8);
    }
    EXPECT_EQ(trace.CountWith("hidden"), 0u);
    EXPECT_EQ(trace.CountWith("shown"), 3u);
    EXPECT_EQ(trace.CountWith("level 1"), 1u);
    EXPECT_EQ(trace.CountWith("level 8"), 4u);  // once under "Tarnvault:1", by the kept answer
    EXPECT_NE(trace.LineWith("shown").find("> <tolmonetsync> <8> shown\n"), std::string::npos);
}

TEST(Trace, ManyThreadsTraceAndReconfigureAtOnce)
{
    testsupport::TraceCapture trace("8");
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
    EXPECT_EQ(trace.CountWith("line"), trace.CountWith("\n"));
}

TEST(Trace, TraceFileIsMadePrivateAppendsAndRefusesALinkToAFile)
{
    testsupport::TempDir dir;
    testsupport::TraceCapture capture("8");
    // What stderr got while `path` was the trace file and one line was traced.
    const auto traceTo = [&](const fs::path& path, const std::string& message) {
        ::testing::internal::CaptureStderr();
        SetTraceFile(path.string());
        TOLMO_TRACE("tolmonetsync", 8, message);
        SetTraceFile("/dev/null");
        return ::testing::internal::GetCapturedStderr();
    };
    const auto mode = [](const fs::path& path) { return fs::status(path).permissions() & fs::perms::mask; };

    EXPECT_EQ(traceTo(dir / "new.trace", "into a new file"), "");
    EXPECT_EQ(mode(dir / "new.trace"), fs::perms::owner_read | fs::perms::owner_write);
    EXPECT_NE(testsupport::ReadFileBytes(dir / "new.trace").find("into a new file"), std::string::npos);

    testsupport::WriteFileBytes(dir / "kept.trace", "earlier\n");
    fs::permissions(dir / "kept.trace", static_cast<fs::perms>(0640));
    EXPECT_EQ(traceTo(dir / "kept.trace", "appended"), "");
    EXPECT_EQ(mode(dir / "kept.trace"), static_cast<fs::perms>(0640));
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
