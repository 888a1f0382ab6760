#pragma once
// The checks of `tolmonetsync doctor`, one finding each. None of them
// prepares a sync or writes anything: the local ones only read the disk, and
// the service ones send one GET.

#include <filesystem>
#include <string>
#include <vector>

#include "sync/SyncRecords.h"

namespace tolmonetsync {
namespace cli {

struct DoctorFinding {
    std::string mCheck;       // "sign-in", "service", "clock", "cache", ...
    bool mAttention = false;  // something a person should act on
    std::string mDetail;      // one line, names already made printable
};

// What the checks look at: the registrations as `sync` takes them and whom a
// cache file here would belong to.
struct DoctorSetup {
    std::filesystem::path mPrefDir;
    std::vector<SyncDir> mDirs;
    std::vector<SyncFile> mFiles;
    std::string mUser;             // the stored sign-in's user; empty if unknown
    std::string mPreferencesRoot;  // this host identity's root name
    std::string mService;          // the asset service's base URL as the client has it
};

// The cache file parses; its entries belong to a registration and their
// files are there.
DoctorFinding CheckCacheFile(const DoctorSetup& setup);
// The fingerprint beside the cache file names this user, root and service.
DoctorFinding CheckCacheOwner(const DoctorSetup& setup);
// Backup directories: how many, how large, how many syncs until a prune.
DoctorFinding CheckBackups(const DoctorSetup& setup);

// Registered directories (and the directories of registered files) exist and
// can be read.
DoctorFinding CheckDirectories(const DoctorSetup& setup);
// ".temp" downloads and hidden temporaries of an interrupted write left
// beside registered files.
DoctorFinding CheckLeftovers(const DoctorSetup& setup);
// Registered names that differ only in case or Unicode form (NameForms.h).
DoctorFinding CheckNames(const DoctorSetup& setup);

// The backup directories a sync counts: at this many the next one prunes.
constexpr std::size_t kBackupsThatPrune = 11;

}  // namespace cli
}  // namespace tolmonetsync
