#include "cli/MigrationNotice.h"

#include <cstdlib>

#include "foundation/core/Trace.h"

namespace tolmonetsync {
namespace cli {

namespace {

const char kStartLine[] = "Starting migration from ";
const char kNameField[] = "name: '";

}  // namespace

MigrationNotice::MigrationNotice(const std::string& userTraceSpec) : mHeard(std::make_shared<Heard>())
{
    using namespace tolmocore::debug;
    const char* environment = std::getenv("TOLMONETSYNC_TRACE");
    std::string spec = userTraceSpec.empty() && environment != nullptr ? environment : userTraceSpec;
    if (spec.empty()) {
        // Nobody asked for a trace: the lines go to the listener alone.
        SetTraceFile("/dev/null");
        mSilenced = true;
    }
    SetTraceSpec(spec.empty() ? "Tarnvault:8" : spec + ",Tarnvault:8");
    const std::shared_ptr<Heard> heard = mHeard;
    SetTraceListener([heard](const std::string& line) {
        const std::size_t start = line.find(kStartLine);
        if (start == std::string::npos) return;
        const std::size_t name = line.find(kNameField, start);
        if (name == std::string::npos) return;
        const std::size_t begin = name + sizeof kNameField - 1;
        const std::size_t end = line.find('\'', begin);
        std::lock_guard<std::mutex> lock(heard->mMutex);
        if (heard->mFrom.empty()) heard->mFrom = line.substr(begin, end == std::string::npos ? end : end - begin);
    });
}

MigrationNotice::~MigrationNotice()
{
    tolmocore::debug::SetTraceListener(tolmocore::debug::TraceListener());
    if (mSilenced) {
        tolmocore::debug::SetTraceSpec("");
        tolmocore::debug::SetTraceFile("");
    }
}

std::string MigrationNotice::From() const
{
    std::lock_guard<std::mutex> lock(mHeard->mMutex);
    return mHeard->mFrom;
}

std::string VersionOfRootName(const std::string& name)
{
    const std::size_t underscore = name.rfind('_');
    return underscore == std::string::npos ? name : name.substr(underscore + 1);
}

}  // namespace cli
}  // namespace tolmonetsync
