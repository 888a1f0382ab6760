#pragma once
// Small pieces the engine's tests share: a plan without a server, a
// preference directory of its own, and trace capture.

#include <string>
#include <vector>

#include "foundation/core/Trace.h"
#include "support/TempDir.h"
#include "support/TestScopes.h"
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

using testsupport::PrefDirScope;
using testsupport::TraceCapture;

}  // namespace synctest
