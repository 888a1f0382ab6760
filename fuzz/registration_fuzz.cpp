// The command line's --dir and --file specs on arbitrary text: either a
// registration or a usage error that names the mistake, nothing else.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "cli/CommandLine.h"
#include "cli/Registrations.h"

using namespace tolmonetsync::cli;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const std::string spec(reinterpret_cast<const char*>(data), size);
    try {
        const tolmonetsync::SyncDir dir = ParseDirRegistration(spec);
        if (dir.mCollectionName.empty() || dir.mExtension.size() < 2) std::abort();
    } catch (const UsageError& e) {
        if (std::string(e.what()).empty()) std::abort();
    }
    try {
        const tolmonetsync::SyncFile file = ParseFileRegistration(spec);
        if (file.mCollectionName.empty() || file.mName.empty()) std::abort();
    } catch (const UsageError& e) {
        if (std::string(e.what()).empty()) std::abort();
    }
    return 0;
}
