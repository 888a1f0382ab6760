// `tolmonetsync serve` as a person runs it: the first line says where it
// listens, it answers there, and a stop signal ends it cleanly.

#include <gtest/gtest.h>

#include <csignal>
#include <cstdio>
#include <string>

#include <curl/curl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include "support/TempDir.h"

extern char** environ;

namespace {

struct Served {
    pid_t mPid = -1;
    FILE* mOutput = nullptr;
};

Served StartServe(std::vector<std::string> arguments)
{
    int pipeFds[2];
    if (pipe(pipeFds) != 0) throw std::runtime_error("pipe");
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, pipeFds[1], 1);
    posix_spawn_file_actions_addclose(&actions, pipeFds[0]);
    arguments.insert(arguments.begin(), {TOLMONETSYNC_CLI, "serve"});
    std::vector<char*> argv;
    for (std::string& argument : arguments) argv.push_back(argument.data());
    argv.push_back(nullptr);
    Served served;
    const int spawned = posix_spawn(&served.mPid, TOLMONETSYNC_CLI, &actions, nullptr, argv.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    close(pipeFds[1]);
    if (spawned != 0) throw std::runtime_error("spawn");
    served.mOutput = fdopen(pipeFds[0], "r");
    return served;
}

int WaitExit(pid_t pid)
{
    int status = 0;
    waitpid(pid, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

long GetStatus(const std::string& url)
{
    CURL* curl = curl_easy_init();
    curl_easy_setopt(curl, CURLOPT_URL, url.c_str());
    curl_easy_setopt(curl, CURLOPT_NOBODY, 0L);
    curl_easy_setopt(curl, CURLOPT_WRITEFUNCTION, +[](char*, size_t size, size_t count, void*) { return size * count; });
    long status = 0;
    if (curl_easy_perform(curl) == CURLE_OK) curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &status);
    curl_easy_cleanup(curl);
    return status;
}

}  // namespace

TEST(ServeCommand, SaysWhereItListensAnswersThereAndStopsOnSignal)
{
    testsupport::TempDir data;
    Served served = StartServe({"--data", data.Path().string(), "--listen", "127.0.0.1:0", "--token", "ann:t0k3n"});
    char line[256] = {};
    ASSERT_NE(fgets(line, sizeof line, served.mOutput), nullptr);
    const std::string first(line);
    ASSERT_EQ(first.rfind("listening on http://127.0.0.1:", 0), 0u) << first;
    const std::string base = first.substr(std::string("listening on ").size(), first.size() - 13 - 1);
    EXPECT_EQ(GetStatus(base + "/api/collections?name=x"), 401);  // no bearer token

    kill(served.mPid, SIGTERM);
    EXPECT_EQ(WaitExit(served.mPid), 0);
    fclose(served.mOutput);
}

TEST(ServeCommand, BadUsageExitsTwo)
{
    Served missingData = StartServe({"--listen", "127.0.0.1:0"});
    EXPECT_EQ(WaitExit(missingData.mPid), 2);
    fclose(missingData.mOutput);
    Served badToken = StartServe({"--data", "/tmp", "--token", "no-colon"});
    EXPECT_EQ(WaitExit(badToken.mPid), 2);
    fclose(badToken.mOutput);
}
