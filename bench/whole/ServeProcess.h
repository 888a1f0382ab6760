#pragma once
// `tolmonetsync serve` in a process of its own on a free loopback port, its
// fixed access token given through a tokens file (owner alone), stopped on
// destruction; and the processor time it has spent, for the service's share
// of a step.

#include <sys/types.h>

#include <filesystem>
#include <string>

namespace wholebench {

extern const char kBenchToken[];  // the token of the service's one user

// Writes `text` to a new file only its owner may read, as secrets must be.
void WriteSecretFile(const std::filesystem::path& path, const std::string& text);

class ServeProcess {
public:
    // Keeps its data, and its tokens file, under `data`.
    explicit ServeProcess(const std::filesystem::path& data);
    ~ServeProcess();
    ServeProcess(const ServeProcess&) = delete;
    ServeProcess& operator=(const ServeProcess&) = delete;

    const std::string& Api() const { return mApi; }  // "http://127.0.0.1:PORT/api"
    // User and system time of every thread of the service so far.
    double CpuSeconds() const;

private:
    pid_t mPid = -1;
    std::string mApi;
};

}  // namespace wholebench
