// A host that exits while a pass is in flight: the process ends cleanly, no
// handler runs, and the cache file is byte for byte what it was. The host is
// a child process; the service it talks to runs in this one.

#include <gtest/gtest.h>

#include <spawn.h>
#include <sys/wait.h>
#include <cstdlib>

#include "FolderSync.h"

using namespace synctest;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
namespace fs = std::filesystem;

extern char** environ;

namespace {

const char kChildVariable[] = "TOLMONETSYNC_EXIT_MID_PASS_DIR";
const char kServiceVariable[] = "TOLMONETSYNC_EXIT_MID_PASS_SERVICE";

// The child: a first full sync, then a pass over changed files, and exit
// while its requests are still queued.
[[noreturn]] void RunChild(const fs::path& work, const std::string& serviceUrl)
{
    Dir::SetPrefDir(DirAt(work / "prefs"));
    fs::create_directories(work / "desk");
    for (int i = 0; i < 300; ++i) WriteFileBytes(work / "desk" / ("p" + std::to_string(i) + ".xmp"), "v1");
    auto newHost = [&] {
        std::unique_ptr<SyncHarness> host(new SyncHarness(ClientOf(serviceUrl)));
        host->Service().RegisterSyncDirectory(SyncDir(DirAt(work / "desk"), u".xmp", u"Presets",
                                                      ImmutableString::CreateStatic("text/xml"), SyncMetadata_Checksum,
                                                      1 << 20));
        return host;
    };
    if (!newHost()->Sync(SyncMode_TwoWay).Ok()) std::_Exit(3);
    fs::copy_file(work / "prefs" / "tolmonetsynccache.json", work / "before.json");
    for (int i = 0; i < 300; ++i) WriteFileBytes(work / "desk" / ("p" + std::to_string(i) + ".xmp"), "v2");

    std::unique_ptr<SyncHarness> host = newHost();
    const RunResult prepared = host->Prepare();
    if (!prepared.Ok()) std::_Exit(4);
    host->Service().DoSync(
        prepared.mCache, [](int) { WriteFileBytes("/dev/null", ""); }, [](const UTF16String&) {}, SyncMode_TwoWay);
    std::exit(0);
}

}  // namespace

TEST(ExitMidPass, ProcessEndsCleanlyAndTheCacheFileIsUntouched)
{
    if (const char* dir = std::getenv(kChildVariable)) RunChild(dir, std::getenv(kServiceVariable));

    testsupport::TestService server;
    testsupport::TempDir work;
    const std::string setting = std::string(kChildVariable) + "=" + work.Path().string();
    const std::string service = std::string(kServiceVariable) + "=" + server->AssetServiceUrl();
    std::vector<char*> env;
    for (char** entry = environ; *entry; ++entry) env.push_back(*entry);
    env.push_back(const_cast<char*>(setting.c_str()));
    env.push_back(const_cast<char*>(service.c_str()));
    env.push_back(nullptr);
    std::string self = fs::read_symlink("/proc/self/exe").string();
    std::string filter = "--gtest_filter=ExitMidPass.*";
    char* argv[] = {self.data(), filter.data(), nullptr};
    pid_t child;
    ASSERT_EQ(posix_spawn(&child, self.c_str(), nullptr, nullptr, argv, env.data()), 0);
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    ASSERT_TRUE(WIFEXITED(status)) << "the child did not exit normally: " << status;
    ASSERT_EQ(WEXITSTATUS(status), 0);
    EXPECT_EQ(ReadFileBytes(work.Path() / "prefs" / "tolmonetsynccache.json"),
              ReadFileBytes(work.Path() / "before.json"));
}
