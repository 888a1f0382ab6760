#include "foundation/core/Trace.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>
#include <mutex>

#include <unistd.h>
#include <sys/syscall.h>

namespace tolmocore {
namespace debug {
namespace {

// The configuration and the sink, behind one mutex. Made on first use and
// never destroyed: trace lines may still come from other threads while the
// process exits.
struct TraceState {
    std::mutex mMutex;
    bool mLoadedFromEnvironment = false;
    int mDefaultLevel = 0;                 // for categories not named
    std::map<std::string, int> mLevels;    // per category
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

void SetFileLocked(TraceState& state, const std::string& path)
{
    if (state.mFile) std::fclose(state.mFile);
    state.mFile = nullptr;
    state.mFilePath = path;
    if (!path.empty()) state.mFile = std::fopen(path.c_str(), "a");
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

unsigned long GetCurrentThreadIDForTrace() { return static_cast<unsigned long>(::syscall(SYS_gettid)); }

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
