#pragma once
// One service per data directory: an exclusive flock on "service.lock" in
// it, held while the object lives. A second service on the same directory,
// in this process or another, is refused before it touches anything, so
// its start-up sweeps never remove what the first one is writing.
//
// The directory is made 0700 when it is missing; one that exists keeps the
// mode its owner gave it. The lock file is 0600.
//
// Errors: DataDirectoryInUse when another service holds the lock;
// std::runtime_error with the system's reason when the directory cannot be
// made or the lock file cannot be opened.

#include <stdexcept>
#include <string>

namespace tolmonetsync {
namespace server {

class DataDirectoryInUse : public std::runtime_error {
public:
    // "data directory DIR is in use by another tolmonetsync serve"
    explicit DataDirectoryInUse(const std::string& directory);
};

class DataDirectoryLock {
public:
    explicit DataDirectoryLock(const std::string& directory);
    ~DataDirectoryLock();
    DataDirectoryLock(const DataDirectoryLock&) = delete;
    DataDirectoryLock& operator=(const DataDirectoryLock&) = delete;

private:
    int mFd = -1;  // its own open file description: flock locks belong to one
};

}  // namespace server
}  // namespace tolmonetsync
