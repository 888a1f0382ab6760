#include "bench/whole/CommandRun.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <stdexcept>

#include "bench/whole/ServeProcess.h"

extern char** environ;

namespace wholebench {

namespace {

namespace fs = std::filesystem;

std::string ReadWhole(const fs::path& path)
{
    std::ifstream stream(path, std::ios::binary);
    return std::string((std::istreambuf_iterator<char>(stream)), std::istreambuf_iterator<char>());
}

double Seconds(const timeval& time)
{
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
}

}  // namespace

CommandCost RunSync(const std::string& api, const fs::path& scratch, const std::vector<std::string>& arguments)
{
    fs::create_directories(scratch);
    const fs::path tokenFile = scratch / "token";
    if (!fs::exists(tokenFile)) WriteSecretFile(tokenFile, std::string(kBenchToken) + "\n");
    std::vector<std::string> words = {TOLMONETSYNC_CLI, "--server", api, "--token-file", tokenFile.string()};
    words.insert(words.end(), arguments.begin(), arguments.end());
    std::vector<char*> argv;
    for (std::string& word : words) argv.push_back(word.data());
    argv.push_back(nullptr);

    const fs::path outPath = scratch / "command.out";
    const fs::path errPath = scratch / "command.err";
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 1, outPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    posix_spawn_file_actions_addopen(&actions, 2, errPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    const auto start = std::chrono::steady_clock::now();
    pid_t pid = -1;
    const int spawned = posix_spawn(&pid, argv[0], &actions, nullptr, argv.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    if (spawned != 0) throw std::runtime_error(std::string("cannot start ") + TOLMONETSYNC_CLI);
    int status = 0;
    rusage usage{};
    wait4(pid, &status, 0, &usage);
    CommandCost cost;
    cost.mWallSeconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    cost.mCpuSeconds = Seconds(usage.ru_utime) + Seconds(usage.ru_stime);
    cost.mPeakMiB = static_cast<double>(usage.ru_maxrss) / 1024.0;
    if (!WIFEXITED(status) || WEXITSTATUS(status) != 0)
        throw std::runtime_error("tolmonetsync sync failed: " + ReadWhole(errPath));
    cost.mOut = ReadWhole(outPath);
    return cost;
}

void WriteSmallFiles(const fs::path& folder, int count, std::size_t size, int salt)
{
    fs::create_directories(folder);
    std::string bytes(size, '\0');
    for (int i = 0; i < count; ++i) {
        for (std::size_t at = 0; at < size; ++at) bytes[at] = static_cast<char>((i * 131 + at * 7 + salt * 17) & 0xff);
        std::ofstream(folder / ("f" + std::to_string(10000 + i) + ".bin"), std::ios::binary) << bytes;
    }
}

void RemoveUnlessKept(const fs::path& path)
{
    if (!std::getenv("WHOLE_BENCH_KEEP")) fs::remove_all(path);
}

double Median(std::vector<double> figures)
{
    if (figures.empty()) return 0;
    std::sort(figures.begin(), figures.end());
    const std::size_t middle = figures.size() / 2;
    return figures.size() % 2 == 1 ? figures[middle] : (figures[middle - 1] + figures[middle]) / 2;
}

}  // namespace wholebench
