#pragma once
// The tolmonetsync command run as a person runs it: a process of its own,
// its output gathered, its exit status read. The build names the command
// (TOLMONETSYNC_CLI); a binary that runs it depends on tolmonetsync_cli.

#include <cstdio>
#include <filesystem>
#include <string>
#include <vector>

#include <sys/types.h>

namespace clitest {

// Whether `text` holds `part`, for checking what the command printed.
inline bool Contains(const std::string& text, const std::string& part)
{
    return text.find(part) != std::string::npos;
}

struct Finished {
    int mStatus = -1;  // exit status; -1 if killed by a signal
    std::string mOut;
    std::string mErr;
};

// Runs `tolmonetsync ARGUMENTS...` to the end, with `environment` entries
// ("NAME=VALUE") added to this process's environment.
Finished RunCli(const std::vector<std::string>& arguments, const std::vector<std::string>& environment = {});

// Starts `tolmonetsync ARGUMENTS...` with its output in the files named,
// and returns at once; WaitCli gives its exit status (-1 after a signal).
pid_t StartCli(const std::vector<std::string>& arguments, const std::string& outPath, const std::string& errPath,
               const std::vector<std::string>& environment = {});
int WaitCli(pid_t pid);

// `tolmonetsync serve` in the background on a free port, with one user and
// one fixed token (and any further serve options); stopped with SIGTERM on
// destruction. Its stderr goes to errPath when one is given.
class ServedService {
public:
    ServedService(const std::filesystem::path& data, const std::string& token,
                  const std::vector<std::string>& moreOptions = {}, const std::string& errPath = std::string());
    ~ServedService();
    ServedService(const ServedService&) = delete;
    ServedService& operator=(const ServedService&) = delete;

    // "http://127.0.0.1:PORT" ("https" when serving with a certificate)
    const std::string& Base() const { return mBase; }
    std::string ApiUrl() const { return mBase + "/api"; }
    pid_t Pid() const { return mPid; }
    // Sends SIGTERM and gives the exit status.
    int Stop();

private:
    pid_t mPid = -1;
    FILE* mOutput = nullptr;
    std::string mBase;
};

}  // namespace clitest
