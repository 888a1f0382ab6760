// At process exit the process-wide processor stops: the handler running at
// that moment finishes, no other handler runs and none is destroyed, and the
// process exits with its own status. Each case runs in a child process: this
// test binary again, told by its environment to be the child.

#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cstdlib>
#include <thread>

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>

#include "foundation/net/RequestProcessor.h"
#include "support/LoopbackHttpServer.h"
#include "support/TempDir.h"

extern char** environ;

using namespace tolmonet;
using namespace tolmonet::http;
using testsupport::HttpAnswer;

namespace {

constexpr const char* kDirVariable = "TOLMONETSYNC_EXIT_TEST_DIR";
constexpr const char* kModeVariable = "TOLMONETSYNC_EXIT_TEST_MODE";

void Touch(const std::string& directory, const char* name)
{
    testsupport::WriteFileBytes(std::filesystem::path(directory) / name, name);
}

// Leaves a file behind when the last handler holding it is destroyed.
struct DestructionMarker {
    DestructionMarker(const std::string& directory, const char* name) : mDirectory(directory), mName(name) {}
    ~DestructionMarker() { Touch(mDirectory, mName); }
    const std::string mDirectory;
    const char* const mName;
};

// Plain atomics: they outlive every hook of exit.
std::atomic<bool> sExitBegan{false};
std::atomic<bool> sHandlerStarted{false};
std::atomic<bool> sMainParked{false};

template <class Condition>
bool WaitUntil(Condition condition)
{
    for (int i = 0; i < 2000 && !condition(); ++i) std::this_thread::sleep_for(std::chrono::milliseconds(10));
    return condition();
}

// In the child: requests in flight to a server that never answers, a handler
// queued behind a running one, then exit, from main or from a handler. A
// failure before the exit ends the child with status 2.
[[noreturn]] void RunChild(const std::string& directory, const std::string& mode)
{
    const bool exitFromHandler = mode == "exit-in-handler";
    // Never destroyed, so that its requests stay in flight.
    static auto* sSilentServer = new testsupport::LoopbackHttpServer([](const testsupport::HttpRequest&) {
        HttpAnswer answer;
        answer.mFault = HttpAnswer::Fault_NeverAnswer;
        return answer;
    });
    const boost::shared_ptr<RequestProcessor> processor = GetGlobalRequestProcessor();
    {
        auto marker = boost::make_shared<DestructionMarker>(directory, "request-handler-destroyed");
        for (int i = 0; i < 3; ++i)
            if (!processor->GET(
                    Guid::CreateUnique(),
                    [directory, marker](const Guid&, const boost::shared_ptr<Response>&) {
                        Touch(directory, "handler-ran");
                    },
                    ImmutableString::CreateDynamic(sSilentServer->Url("/")), HeaderList(), Configuration()))
                std::_Exit(2);
    }
    if (!sSilentServer->WaitForRequests(3, std::chrono::seconds(20))) std::_Exit(2);

    if (exitFromHandler) {
        processor->CallAsynchronously(
            [] {
                WaitUntil([] { return sMainParked.load(); });
                std::exit(0);
            },
            0);
    } else {
        std::atexit([] { sExitBegan = true; });  // runs before the processor's own hook
        processor->CallAsynchronously(
            [directory] {
                sHandlerStarted = true;
                WaitUntil([] { return sExitBegan.load(); });
                // Long enough that an exit that did not wait would end the process first.
                std::this_thread::sleep_for(std::chrono::milliseconds(300));
                Touch(directory, "running-handler-finished");
            },
            0);
    }
    {
        auto marker = boost::make_shared<DestructionMarker>(directory, "queued-handler-destroyed");
        processor->CallAsynchronously([directory, marker] { Touch(directory, "handler-ran"); }, 0);
    }
    if (exitFromHandler) {
        sMainParked = true;
        for (;;) pause();
    }
    if (!WaitUntil([] { return sHandlerStarted.load(); })) std::_Exit(2);
    std::exit(0);
}

// Runs this binary again as the child in `mode` in `directory`; its exit
// status, or -1 if it did not exit normally.
int SpawnChild(const std::string& mode, const std::filesystem::path& directory)
{
    // Set by CTest; a run by hand falls back to this very binary.
    const char* fromEnvironment = std::getenv("TOLMONETSYNC_TEST_BINARY");
    const std::string binary = fromEnvironment ? fromEnvironment : std::filesystem::read_symlink("/proc/self/exe");
    char filter[] = "--gtest_filter=ProcessExit.*";
    char* argv[] = {const_cast<char*>(binary.c_str()), filter, nullptr};
    setenv(kDirVariable, directory.c_str(), 1);
    setenv(kModeVariable, mode.c_str(), 1);
    pid_t child = 0;
    const int spawned = posix_spawn(&child, binary.c_str(), nullptr, nullptr, argv, environ);
    unsetenv(kDirVariable);
    unsetenv(kModeVariable);
    if (spawned != 0) {
        ADD_FAILURE() << "cannot start " << binary;
        return -1;
    }
    int status = 0;
    bool exited = false;
    WaitUntil([&] { return exited = exited || waitpid(child, &status, WNOHANG) == child; });
    if (!exited) {
        kill(child, SIGKILL);
        waitpid(child, &status, 0);
        ADD_FAILURE() << "the child did not exit: exit hangs";
        return -1;
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

TEST(ProcessExit, ExitWaitsForTheRunningHandlerAndRunsOrDestroysNoOther)
{
    if (const char* directory = std::getenv(kDirVariable)) RunChild(directory, std::getenv(kModeVariable));
    for (const std::string mode : {"exit-while-handler-runs", "exit-in-handler"}) {
        SCOPED_TRACE(mode);
        testsupport::TempDir directory;
        ASSERT_EQ(SpawnChild(mode, directory.Path()), 0);
        const auto left = [&](const char* name) { return std::filesystem::exists(directory / name); };
        EXPECT_EQ(left("running-handler-finished"), mode == "exit-while-handler-runs");
        EXPECT_FALSE(left("handler-ran"));
        EXPECT_FALSE(left("request-handler-destroyed"));
        EXPECT_FALSE(left("queued-handler-destroyed"));
    }
}

}  // namespace
