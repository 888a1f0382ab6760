#pragma once
// Scopes tests share: a preference directory of their own, and the trace
// lines written while a capture lives.

#include <filesystem>
#include <mutex>
#include <string>
#include <vector>

#include "foundation/core/Dir.h"
#include "foundation/core/Trace.h"
#include "support/TempDir.h"

namespace testsupport {

// Points the preference directory at a fresh temporary directory for the
// life of the object.
class PrefDirScope {
public:
    PrefDirScope() : mPrevious(tolmocore::filesupport::Dir::PrefDir())
    {
        tolmocore::filesupport::Dir::SetPrefDir(
            tolmocore::filesupport::Dir(tolmocore::utility::ToUTF16(mDir.Path().string())));
    }
    ~PrefDirScope() { tolmocore::filesupport::Dir::SetPrefDir(mPrevious); }
    const std::filesystem::path& Path() const { return mDir.Path(); }

private:
    TempDir mDir;
    tolmocore::filesupport::Dir mPrevious;
};

// Turns tracing on with a spec while it lives and collects the lines.
class TraceCapture {
public:
    explicit TraceCapture(const std::string& spec)
    {
        tolmocore::debug::SetTraceFile("/dev/null");
        tolmocore::debug::SetTraceSpec(spec);
        tolmocore::debug::SetTraceListener([this](const std::string& line) {
            std::lock_guard<std::mutex> lock(mMutex);
            mLines.push_back(line);
        });
    }
    ~TraceCapture()
    {
        tolmocore::debug::SetTraceListener(tolmocore::debug::TraceListener());
        tolmocore::debug::SetTraceSpec("");
        tolmocore::debug::SetTraceFile("");
    }
    bool Contains(const std::string& text) { return CountWith(text) > 0; }
    // The first line holding `text`; empty if none does.
    std::string LineWith(const std::string& text)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        for (const std::string& line : mLines)
            if (line.find(text) != std::string::npos) return line;
        return std::string();
    }
    // How many lines hold `text`.
    std::size_t CountWith(const std::string& text)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        std::size_t count = 0;
        for (const std::string& line : mLines) count += line.find(text) != std::string::npos ? 1 : 0;
        return count;
    }

private:
    std::mutex mMutex;
    std::vector<std::string> mLines;
};

}  // namespace testsupport
