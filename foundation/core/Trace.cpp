#include "foundation/core/Trace.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>
#include <mutex>
#include <system_error>

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace tolmocore {
namespace debug {
namespace {

// The configuration and the sink, behind one mutex. Made on first use and
// never destroyed: trace lines may still come from other threads while the
// process exits.
struct TraceState {
    std::mutex mMutex;
    bool mLoadedFromEnvironment = false;
    int mDefaultLevel = 0;               // for categories not named
    std::map<std::string, int> mLevels;  // per category
    std::string mFilePath;
    FILE* mFile = nullptr;
    TraceListener mListener;
};

std::atomic<unsigned long> sChangeCount{1};

TraceState& State()
{
    static TraceState* state = new TraceState;
    return *state;
}

void ApplySpecLocked(TraceState& state, const std::string& spec)
{
    state.mDefaultLevel = 0;
    state.mLevels.clear();
    size_t start = 0;
    while (start <= spec.size()) {
        size_t end = spec.find(',', start);
        if (end == std::string::npos) end = spec.size();
        const std::string part = spec.substr(start, end - start);
        const size_t colon = part.rfind(':');
        const std::string levelText = colon == std::string::npos ? part : part.substr(colon + 1);
        char* parsedEnd = nullptr;
        const long level = std::strtol(levelText.c_str(), &parsedEnd, 10);
        if (!levelText.empty() && parsedEnd && *parsedEnd == '\0') {
            if (colon == std::string::npos)
                state.mDefaultLevel = static_cast<int>(level);
            else
                state.mLevels[part.substr(0, colon)] = static_cast<int>(level);
        }
        start = end + 1;
    }
}

std::string ErrorText(int error)
{
    return std::generic_category().message(error);
}

// The process's own descriptors: links the system makes, which nobody can
// plant, and which may well lead to a file the shell redirected to.
bool IsOwnDescriptorPath(const std::string& path)
{
    return path == "/dev/stdout" || path == "/dev/stderr" || path.rfind("/dev/fd/", 0) == 0 ||
           path.rfind("/proc/self/fd/", 0) == 0;
}

// Appends to what is already at `path`, unchanged in mode. A link may lead to
// a device or a FIFO, never to a regular file: one planted at the name would
// otherwise make the trace write into a file of the link's choosing.
int OpenExistingTraceFile(const std::string& path, std::string& why)
{
    struct stat link;
    if (::lstat(path.c_str(), &link) != 0) {
        why = ErrorText(errno);
        return -1;
    }
    const bool isLink = S_ISLNK(link.st_mode);
    const int fd = ::open(path.c_str(), O_WRONLY | O_APPEND | O_NOCTTY | O_CLOEXEC | (isLink ? 0 : O_NOFOLLOW));
    if (fd < 0) {
        why = errno == ELOOP ? "it is a symbolic link" : ErrorText(errno);
        return -1;
    }
    // Checked on what was opened, so a link changed in between is caught too;
    // opening without O_CREAT or O_TRUNC has changed nothing in the file.
    struct stat target;
    if (isLink && !IsOwnDescriptorPath(path) && (::fstat(fd, &target) != 0 || S_ISREG(target.st_mode))) {
        ::close(fd);
        why = "it is a symbolic link to a regular file";
        return -1;
    }
    return fd;
}

FILE* OpenTraceFile(const std::string& path)
{
    std::string why;
    int fd = ::open(path.c_str(), O_WRONLY | O_APPEND | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600);
    if (fd < 0 && errno == EEXIST)
        fd = OpenExistingTraceFile(path, why);
    else if (fd < 0)
        why = ErrorText(errno);
    FILE* file = fd >= 0 ? ::fdopen(fd, "a") : nullptr;
    if (fd >= 0 && file == nullptr) {
        why = ErrorText(errno);
        ::close(fd);
    }
    if (file == nullptr)
        std::fprintf(stderr, "tolmonetsync: trace file %s refused (%s); trace lines go to stderr\n", path.c_str(),
                     why.c_str());
    return file;
}

void SetFileLocked(TraceState& state, const std::string& path)
{
    if (state.mFile) std::fclose(state.mFile);
    state.mFile = nullptr;
    state.mFilePath = path;
    if (!path.empty()) state.mFile = OpenTraceFile(path);
}

// The environment is read on first use, not at load.
void LoadEnvironmentLocked(TraceState& state)
{
    if (state.mLoadedFromEnvironment) return;
    state.mLoadedFromEnvironment = true;
    if (const char* spec = std::getenv("TOLMONETSYNC_TRACE")) ApplySpecLocked(state, spec);
    if (const char* path = std::getenv("TOLMONETSYNC_TRACE_FILE")) SetFileLocked(state, path);
}

}  // namespace

unsigned long TraceChangeCount()
{
    static const bool loaded = [] {
        std::lock_guard<std::mutex> lock(State().mMutex);
        LoadEnvironmentLocked(State());
        return true;
    }();
    (void)loaded;
    return sChangeCount.load(std::memory_order_acquire);
}

bool TraceEnabled(const unsigned char* category, int level, bool)
{
    TraceState& state = State();
    std::lock_guard<std::mutex> lock(state.mMutex);
    LoadEnvironmentLocked(state);
    auto found = state.mLevels.find(reinterpret_cast<const char*>(category));
    const int enabledLevel = found != state.mLevels.end() ? found->second : state.mDefaultLevel;
    return level <= enabledLevel;
}

void Trace(const unsigned char* line)
{
    TraceState& state = State();
    TraceListener listener;
    {
        std::lock_guard<std::mutex> lock(state.mMutex);
        LoadEnvironmentLocked(state);
        FILE* sink = state.mFile ? state.mFile : stderr;
        std::fputs(reinterpret_cast<const char*>(line), sink);
        std::fflush(sink);
        listener = state.mListener;
    }
    // Outside the lock, so a listener may trace or change the configuration.
    if (listener) listener(reinterpret_cast<const char*>(line));
}

void SetTraceSpec(const std::string& spec)
{
    TraceState& state = State();
    {
        std::lock_guard<std::mutex> lock(state.mMutex);
        state.mLoadedFromEnvironment = true;
        ApplySpecLocked(state, spec);
    }
    sChangeCount.fetch_add(1, std::memory_order_acq_rel);
}

void SetTraceFile(const std::string& path)
{
    TraceState& state = State();
    std::lock_guard<std::mutex> lock(state.mMutex);
    LoadEnvironmentLocked(state);
    SetFileLocked(state, path);
}

void SetTraceListener(const TraceListener& listener)
{
    TraceState& state = State();
    std::lock_guard<std::mutex> lock(state.mMutex);
    state.mListener = listener;
}

unsigned long GetCurrentThreadIDForTrace()
{
    return static_cast<unsigned long>(::syscall(SYS_gettid));
}

void BeginTraceLine(std::ostringstream& stream, const char* category, int level)
{
    stream << '<' << GetCurrentThreadIDForTrace() << "> <" << category << "> <" << level << "> ";
}

void EndTraceLine(std::ostringstream& stream)
{
    stream << '\n';
    const std::string line = stream.str();
    Trace(reinterpret_cast<const unsigned char*>(line.c_str()));
}

}  // namespace debug
}  // namespace tolmocore
