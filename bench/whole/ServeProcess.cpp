#include "bench/whole/ServeProcess.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <iterator>
#include <sstream>
#include <stdexcept>
#include <vector>

#ifndef TOLMONETSYNC_CLI
#error "the build names the command: TOLMONETSYNC_CLI"
#endif

namespace wholebench {

const char kBenchToken[] = "bench-token";

void WriteSecretFile(const std::filesystem::path& path, const std::string& text)
{
    const int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL, 0600);
    if (fd < 0) throw std::runtime_error("cannot create " + path.string());
    const bool written = write(fd, text.data(), text.size()) == static_cast<ssize_t>(text.size());
    if (close(fd) != 0 || !written) throw std::runtime_error("cannot write " + path.string());
}

ServeProcess::ServeProcess(const std::filesystem::path& data)
{
    std::filesystem::create_directories(data);
    const std::filesystem::path tokens = data.parent_path() / (data.filename().string() + "-tokens");
    WriteSecretFile(tokens, std::string("bench:") + kBenchToken + "\n");
    int fds[2];
    if (pipe(fds) != 0) throw std::runtime_error("pipe");
    mPid = fork();
    if (mPid == 0) {
        dup2(fds[1], 1);
        close(fds[0]);
        execl(TOLMONETSYNC_CLI, TOLMONETSYNC_CLI, "serve", "--data", data.c_str(), "--listen", "127.0.0.1:0",
              "--tokens-file", tokens.c_str(), static_cast<char*>(nullptr));
        _exit(127);
    }
    close(fds[1]);
    FILE* output = fdopen(fds[0], "r");
    char line[256] = {};
    const std::string prefix = "listening on ";
    const bool started = fgets(line, sizeof line, output) != nullptr && std::string(line).rfind(prefix, 0) == 0;
    fclose(output);
    if (!started) {
        kill(mPid, SIGTERM);
        waitpid(mPid, nullptr, 0);
        throw std::runtime_error("serve did not start");
    }
    std::string base = std::string(line).substr(prefix.size());
    while (!base.empty() && base.back() == '\n') base.pop_back();
    mApi = base + "/api";
}

ServeProcess::~ServeProcess()
{
    kill(mPid, SIGTERM);
    waitpid(mPid, nullptr, 0);
}

double ServeProcess::CpuSeconds() const
{
    std::ifstream stream("/proc/" + std::to_string(mPid) + "/stat");
    std::string text((std::istreambuf_iterator<char>(stream)), std::istreambuf_iterator<char>());
    // The command name may hold spaces: the fields that follow start after its ')'.
    const std::size_t close = text.rfind(')');
    if (close == std::string::npos) throw std::runtime_error("cannot read the service's processor time");
    std::istringstream fields(text.substr(close + 1));
    std::vector<std::string> values;
    for (std::string value; fields >> value;) values.push_back(value);
    // Fields 14 and 15 of the line (utime, stime); the state, field 3, is values[0].
    if (values.size() < 13) throw std::runtime_error("cannot read the service's processor time");
    const double ticks = static_cast<double>(sysconf(_SC_CLK_TCK));
    return (std::stod(values[11]) + std::stod(values[12])) / ticks;
}

}  // namespace wholebench
