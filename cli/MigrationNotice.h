#pragma once
// Tells the command when the client started copying an earlier host
// version's preferences, through the client's migration callback, for the
// length of one sync.

#include <memory>
#include <mutex>
#include <string>

#include <boost/shared_ptr.hpp>

namespace tolmonetsync {

class SyncFilesService;

namespace cli {

class MigrationNotice {
public:
    // Starts listening to the client of `service`; hears nothing from a
    // service of another kind.
    explicit MigrationNotice(const boost::shared_ptr<SyncFilesService>& service);
    ~MigrationNotice();
    MigrationNotice(const MigrationNotice&) = delete;
    MigrationNotice& operator=(const MigrationNotice&) = delete;

    // The earlier version a migration started from and its preferences
    // root's name; empty if none started.
    std::string FromVersion() const;
    std::string FromRootName() const;

private:
    struct Heard {
        std::mutex mMutex;
        std::string mVersion;
        std::string mRootName;
    };
    boost::shared_ptr<SyncFilesService> mService;
    std::shared_ptr<Heard> mHeard;
};

}  // namespace cli
}  // namespace tolmonetsync
