#pragma once
// Small pieces the engine's tests share: a plan without a server, a
// preference directory of its own, and trace capture.

#include <mutex>
#include <string>
#include <vector>

#include "foundation/core/Trace.h"
#include "support/TempDir.h"
#include "sync/SyncCache.h"

namespace synctest {

using namespace tolmonetsync;

inline UTF16String Path(const std::filesystem::path& path) { return tolmocore::utility::ToUTF16(path.string()); }
inline File FileAt(const std::filesystem::path& path) { return File(Path(path)); }
inline Dir DirAt(const std::filesystem::path& path) { return Dir(Path(path)); }

// A plan whose server is never asked: for the scan, the cache file and the
// local file operations.
class OfflineCache final : public SyncCache {
public:
    OfflineCache(const std::vector<SyncFile>& files, const std::vector<SyncDir>& dirs)
        : SyncCache(files, dirs, ProgressCallback(), ItemToFileCallback())
    {
    }
    const boost::shared_ptr<SyncServer>& GetApi() const override { return mNoServer; }

private:
    boost::shared_ptr<SyncServer> mNoServer;
};

// Points the preference directory at a fresh temporary directory for the
// life of the object.
class PrefDirScope {
public:
    PrefDirScope() : mPrevious(Dir::PrefDir()) { Dir::SetPrefDir(DirAt(mDir.Path())); }
    ~PrefDirScope() { Dir::SetPrefDir(mPrevious); }
    const std::filesystem::path& Path() const { return mDir.Path(); }

private:
    testsupport::TempDir mDir;
    Dir mPrevious;
};

// Collects the trace lines of one category while it lives.
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
    bool Contains(const std::string& text)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        for (const std::string& line : mLines)
            if (line.find(text) != std::string::npos) return true;
        return false;
    }
    std::size_t Count()
    {
        std::lock_guard<std::mutex> lock(mMutex);
        return mLines.size();
    }

private:
    std::mutex mMutex;
    std::vector<std::string> mLines;
};

}  // namespace synctest
