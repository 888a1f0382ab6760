#include "support/CliProcess.h"

#include <csignal>
#include <stdexcept>

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include "support/TempDir.h"

extern char** environ;

namespace clitest {

namespace {

// Runs the command with `arguments`, this process's environment and `more`
// after it, its streams as `actions` set them.
pid_t Spawn(std::vector<std::string> arguments, const std::vector<std::string>& more,
            posix_spawn_file_actions_t& actions)
{
    arguments.insert(arguments.begin(), TOLMONETSYNC_CLI);
    std::vector<std::string> environment(more);
    for (char** entry = environ; *entry != nullptr; ++entry) environment.insert(environment.begin(), *entry);
    std::vector<char*> argv, envp;
    for (std::string& argument : arguments) argv.push_back(argument.data());
    for (std::string& entry : environment) envp.push_back(entry.data());
    argv.push_back(nullptr);
    envp.push_back(nullptr);
    pid_t pid = -1;
    if (posix_spawn(&pid, TOLMONETSYNC_CLI, &actions, nullptr, argv.data(), envp.data()) != 0)
        throw std::runtime_error("cannot start " TOLMONETSYNC_CLI);
    posix_spawn_file_actions_destroy(&actions);
    return pid;
}

}  // namespace

pid_t StartCli(const std::vector<std::string>& arguments, const std::string& outPath, const std::string& errPath,
               const std::vector<std::string>& environment)
{
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 0, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&actions, 1, outPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    posix_spawn_file_actions_addopen(&actions, 2, errPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    return Spawn(arguments, environment, actions);
}

int WaitCli(pid_t pid)
{
    int status = 0;
    while (waitpid(pid, &status, 0) < 0) {
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

Finished RunCli(const std::vector<std::string>& arguments, const std::vector<std::string>& environment)
{
    testsupport::TempDir outputs;
    const int status =
        WaitCli(StartCli(arguments, (outputs / "out").string(), (outputs / "err").string(), environment));
    return {status, testsupport::ReadFileBytes(outputs / "out"), testsupport::ReadFileBytes(outputs / "err")};
}

ServedService::ServedService(const std::filesystem::path& data, const std::string& token,
                             const std::vector<std::string>& moreOptions, const std::string& errPath)
{
    int pipeFds[2];
    if (pipe(pipeFds) != 0) throw std::runtime_error("pipe");
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, pipeFds[1], 1);
    posix_spawn_file_actions_addclose(&actions, pipeFds[0]);
    if (!errPath.empty())
        posix_spawn_file_actions_addopen(&actions, 2, errPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    std::vector<std::string> arguments = {"serve",  "--data",     data.string(), "--listen",    "127.0.0.1:0",
                                          "--user", "ann:secret", "--token",     "ann:" + token};
    arguments.insert(arguments.end(), moreOptions.begin(), moreOptions.end());
    mPid = Spawn(arguments, {}, actions);
    close(pipeFds[1]);
    mOutput = fdopen(pipeFds[0], "r");
    char line[256] = {};
    const std::string prefix = "listening on ";
    if (fgets(line, sizeof line, mOutput) == nullptr || std::string(line).rfind(prefix, 0) != 0) {
        Stop();
        throw std::runtime_error("serve did not say where it listens");
    }
    mBase = std::string(line).substr(prefix.size());
    mBase.erase(mBase.find_last_not_of("\r\n") + 1);
}

ServedService::~ServedService()
{
    Stop();
}

int ServedService::Stop()
{
    int status = -1;
    if (mPid > 0) {
        kill(mPid, SIGTERM);
        status = WaitCli(mPid);
        mPid = -1;
    }
    if (mOutput != nullptr) fclose(mOutput);
    mOutput = nullptr;
    return status;
}

}  // namespace clitest
