#include "server/SecretFiles.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <functional>
#include <stdexcept>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "server/ServiceArguments.h"

namespace tolmonetsync {
namespace server {

namespace {

[[noreturn]] void Refuse(const std::string& path, const std::string& reason)
{
    throw std::invalid_argument(path + ": " + reason);
}

// The whole file, checked on the descriptor it is read from, so that a
// swap between the check and the read cannot slip another file in.
std::string ReadOwnerOnly(const std::string& path)
{
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    if (fd < 0) Refuse(path, std::string("cannot open: ") + std::strerror(errno));
    struct stat status {};
    if (::fstat(fd, &status) != 0 || !S_ISREG(status.st_mode)) {
        ::close(fd);
        Refuse(path, "not a regular file");
    }
    if ((status.st_mode & (S_IRWXG | S_IRWXO)) != 0) {
        ::close(fd);
        char mode[8];
        std::snprintf(mode, sizeof mode, "%04o", static_cast<unsigned>(status.st_mode & 07777));
        Refuse(path, std::string("other users may read it (mode ") + mode +
                         "); make it readable by its owner alone (chmod 600)");
    }
    std::string bytes;
    char buffer[4096];
    for (;;) {
        const ssize_t n = ::read(fd, buffer, sizeof buffer);
        if (n < 0 && errno == EINTR) continue;
        if (n < 0) {
            const int error = errno;
            ::close(fd);
            Refuse(path, std::string("cannot read: ") + std::strerror(error));
        }
        if (n == 0) break;
        bytes.append(buffer, static_cast<std::size_t>(n));
    }
    ::close(fd);
    return bytes;
}

bool IsSkipped(const std::string& line)
{
    if (!line.empty() && line[0] == '#') return true;
    return line.find_first_not_of(" \t") == std::string::npos;
}

// Calls take(line) for every entry line; a std::invalid_argument from it
// becomes a refusal that names the file and the line number.
void ForEachEntry(const std::string& path, const std::function<void(const std::string&)>& take)
{
    const std::string text = ReadOwnerOnly(path);
    std::size_t start = 0;
    for (int number = 1; start < text.size(); ++number) {
        std::size_t end = text.find('\n', start);
        if (end == std::string::npos) end = text.size();
        std::string line = text.substr(start, end - start);
        start = end + 1;
        if (!line.empty() && line.back() == '\r') line.pop_back();
        if (IsSkipped(line)) continue;
        try {
            take(line);
        } catch (const std::invalid_argument& bad) {
            // The parsers' reasons never quote the secret.
            Refuse(path, "line " + std::to_string(number) + ": " + bad.what());
        }
    }
}

}  // namespace

std::vector<ServiceUser> ReadUsersFile(const std::string& path)
{
    std::vector<ServiceUser> users;
    ForEachEntry(path, [&users](const std::string& line) { users.push_back(ParseUserArgument(line)); });
    return users;
}

std::vector<ServiceToken> ReadTokensFile(const std::string& path)
{
    std::vector<ServiceToken> tokens;
    ForEachEntry(path, [&tokens](const std::string& line) { tokens.push_back(ParseTokenArgument(line)); });
    return tokens;
}

}  // namespace server
}  // namespace tolmonetsync
