#include "cli/TokenFile.h"

#include <cerrno>
#include <system_error>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "cli/CommandLine.h"

namespace tolmonetsync {
namespace cli {

namespace {

// Owns the descriptor for the few lines that read it.
struct OpenFile {
    int mFd;
    ~OpenFile()
    {
        if (mFd >= 0) ::close(mFd);
    }
};

const std::size_t kLongestTokenFile = 64 * 1024;

}  // namespace

std::string ReadTokenFile(const std::string& path)
{
    const std::string where = "--token-file " + path + ": ";
    OpenFile file{::open(path.c_str(), O_RDONLY | O_NOCTTY | O_CLOEXEC | O_NONBLOCK)};
    if (file.mFd < 0) throw UsageError(where + std::generic_category().message(errno));
    // The checks are made on what was opened, so nothing can be swapped in between.
    struct stat status;
    if (::fstat(file.mFd, &status) != 0 || !S_ISREG(status.st_mode)) throw UsageError(where + "not a regular file");
    if ((status.st_mode & 077) != 0)
        throw UsageError(where + "others than its owner may read or change it; make it private (chmod 600)");

    std::string text;
    char buffer[4096];
    while (text.size() < kLongestTokenFile && text.find('\n') == std::string::npos) {
        const ssize_t got = ::read(file.mFd, buffer, sizeof buffer);
        if (got < 0 && errno == EINTR) continue;
        if (got < 0) throw UsageError(where + std::generic_category().message(errno));
        if (got == 0) break;
        text.append(buffer, static_cast<std::size_t>(got));
    }
    text = text.substr(0, text.find('\n'));
    const char* const kSpace = " \t\r\v\f";
    const std::size_t first = text.find_first_not_of(kSpace);
    if (first == std::string::npos) throw UsageError(where + "holds no token on its first line");
    return text.substr(first, text.find_last_not_of(kSpace) - first + 1);
}

}  // namespace cli
}  // namespace tolmonetsync
