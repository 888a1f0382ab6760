#pragma once
// The lock file "tolmonetsync.lock" in the preference directory: a sync holds
// it shared from the making of its plan to the end of its pass, a restore
// holds it alone. Not the sync mutex: it reaches other processes too.

#include <stdexcept>

namespace tolmonetsync {

// A restore found a sync of the same preference directory running.
struct SyncRunning : std::runtime_error {
    using std::runtime_error::runtime_error;
};

class PrefDirLock {
public:
    enum Mode {
        Shared,     // a sync: waits for a restore to end; syncs do not exclude each other
        Exclusive,  // a restore: never waits; throws SyncRunning while a sync holds it
    };
    // The file is made 0600 if missing and never opened through a link.
    // Throws FileSystemError if it cannot be opened.
    explicit PrefDirLock(Mode mode);
    ~PrefDirLock();
    PrefDirLock(const PrefDirLock&) = delete;
    PrefDirLock& operator=(const PrefDirLock&) = delete;

private:
    int mFd = -1;
};

}  // namespace tolmonetsync
