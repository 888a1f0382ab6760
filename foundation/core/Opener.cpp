#include "foundation/core/Opener.h"

#include <cerrno>
#include <mutex>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

extern char** environ;

namespace tolmocore {
namespace utility {
namespace {

std::mutex& OpenerMutex()
{
    static std::mutex* mutex = new std::mutex;
    return *mutex;
}

Opener& CurrentOpener()
{
    static Opener* opener = new Opener;
    return *opener;
}

// A shell starts xdg-open in the background and exits at once, so the
// handler is re-parented and no zombie is left behind; spawning from this
// (multi-threaded) process avoids running anything between fork and exec.
bool StartXdgOpen(const std::string& target)
{
    static const char kScript[] =
        "command -v xdg-open >/dev/null 2>&1 || exit 127; xdg-open \"$1\" >/dev/null 2>&1 </dev/null &";
    char* const argv[] = {const_cast<char*>("sh"), const_cast<char*>("-c"), const_cast<char*>(kScript),
                          const_cast<char*>("sh"), const_cast<char*>(target.c_str()), nullptr};
    pid_t shell;
    if (posix_spawn(&shell, "/bin/sh", nullptr, nullptr, argv, environ) != 0) return false;
    int status = 0;
    while (waitpid(shell, &status, 0) < 0) {
        if (errno != EINTR) return false;
    }
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

}  // namespace

bool OpenFileInDefaultApplication(const UTF16String& pathOrURL)
{
    Opener opener;
    {
        std::lock_guard<std::mutex> lock(OpenerMutex());
        opener = CurrentOpener();
    }
    if (opener) return opener(pathOrURL);
    return StartXdgOpen(ToNarrow(pathOrURL));
}

bool OpenURLInDefaultBrowser(const UTF16String& url)
{
    if (url.empty()) return false;
    if (url.find(u"://") == UTF16String::npos) return OpenFileInDefaultApplication(UTF16String(u"http://") + url);
    return OpenFileInDefaultApplication(url);
}

Opener SetOpener(const Opener& opener)
{
    std::lock_guard<std::mutex> lock(OpenerMutex());
    Opener previous = CurrentOpener();
    CurrentOpener() = opener;
    return previous;
}

}  // namespace utility
}  // namespace tolmocore
