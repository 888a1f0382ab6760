#pragma once
// Debug tracing. Off by default; TOLMONETSYNC_TRACE turns categories on:
//   TOLMONETSYNC_TRACE=8                       every category up to level 8
//   TOLMONETSYNC_TRACE=Tarnvault:8,OVRA:1      per category
// Lines go to stderr, or to the file named by TOLMONETSYNC_TRACE_FILE, and to
// an installed listener. A line reads "<thread> <category> <level> message\n".
//
// Write trace statements with TOLMO_TRACE: a disabled statement costs one
// call and a comparison, and builds no text.

#include <atomic>
#include <sstream>
#include <string>

#include <boost/function.hpp>

namespace tolmocore {
namespace debug {

// Changes whenever the set of enabled categories changes.
unsigned long TraceChangeCount();
// Whether `category` is on at `level` (a line of level L shows when the
// category's configured level is L or more).
bool TraceEnabled(const unsigned char* category, int level, bool unused = true);
// Writes one finished line to the sink and the listener. Any thread.
void Trace(const unsigned char* line);

// Replaces the configuration with a spec in the form of TOLMONETSYNC_TRACE;
// an empty spec turns tracing off. Bad parts of a spec are ignored.
void SetTraceSpec(const std::string& spec);
// Sends lines to this file instead of stderr (appending); empty: stderr.
// A path that does not exist is made 0600 (O_EXCL, O_NOFOLLOW). An existing
// file is appended to and its mode left alone; a device or a FIFO, also
// behind a link (/dev/stderr), is written to. A symbolic link to a regular
// file is refused, as is a path that cannot be opened: a line on stderr says
// why, and trace lines go to stderr.
void SetTraceFile(const std::string& path);
// Receives every line written; an empty function removes the listener.
using TraceListener = boost::function<void(const std::string& line)>;
void SetTraceListener(const TraceListener& listener);

unsigned long GetCurrentThreadIDForTrace();

// The guard each statement owns: the last change count seen and the answer
// then. Atomics, so that statements racing on several threads stay defined.
struct TraceGuard {
    std::atomic<unsigned long> mSeenCount{~0ul};
    std::atomic<bool> mAnswer{false};

    bool Enabled(const char* category, int level)
    {
        const unsigned long count = TraceChangeCount();
        if (count != mSeenCount.load(std::memory_order_acquire)) {
            mAnswer.store(TraceEnabled(reinterpret_cast<const unsigned char*>(category), level, true),
                          std::memory_order_relaxed);
            mSeenCount.store(count, std::memory_order_release);
        }
        return mAnswer.load(std::memory_order_relaxed);
    }
};

// Builds "<thread> <category> <level> " on a stream; the message follows.
void BeginTraceLine(std::ostringstream& stream, const char* category, int level);
void EndTraceLine(std::ostringstream& stream);

}  // namespace debug
}  // namespace tolmocore

#define TOLMO_TRACE(category, level, message)                                          \
    do {                                                                               \
        static ::tolmocore::debug::TraceGuard sTraceGuard_;                            \
        const int traceLevel_ = (level);                                               \
        if (sTraceGuard_.Enabled((category), traceLevel_)) {                           \
            std::ostringstream traceStream_;                                           \
            ::tolmocore::debug::BeginTraceLine(traceStream_, (category), traceLevel_); \
            traceStream_ << message;                                                   \
            ::tolmocore::debug::EndTraceLine(traceStream_);                            \
        }                                                                              \
    } while (0)
