#pragma once
// Tells the command when the client started copying an earlier host
// version's preferences. The client says so only in its trace, so this
// listens to the trace for the length of one sync.

#include <memory>
#include <mutex>
#include <string>

namespace tolmonetsync {
namespace cli {

class MigrationNotice {
public:
    // Starts listening; `userTraceSpec` is what the person asked to trace
    // (empty: nothing, so the listened lines go nowhere else).
    explicit MigrationNotice(const std::string& userTraceSpec);
    ~MigrationNotice();
    MigrationNotice(const MigrationNotice&) = delete;
    MigrationNotice& operator=(const MigrationNotice&) = delete;

    // The name of the earlier preferences root a migration started from;
    // empty if none started.
    std::string From() const;

private:
    struct Heard {
        std::mutex mMutex;
        std::string mFrom;
    };
    std::shared_ptr<Heard> mHeard;
    bool mSilenced = false;
};

// The version at the end of a preferences root's name ("Co_App_8.0" gives "8.0").
std::string VersionOfRootName(const std::string& name);

}  // namespace cli
}  // namespace tolmonetsync
