#pragma once
// A deliberately simple account of what one sync must do to a registered
// folder, its server group and the cache file, written from the decision
// tables rather than from the engine. Names stand for files and items; an
// entity tag stands for a server version, whose date is new with each tag.

#include <filesystem>
#include <map>
#include <optional>
#include <set>
#include <string>

#include "sync/SyncRecords.h"

namespace modeltest {

using FileTime = std::filesystem::file_time_type;

struct LocalFile {
    std::string mBytes;
    FileTime mModified;
};

struct RemoteItem {
    std::string mBytes;
    std::string mEtag;
};

// What the cache file holds for a name. A checksum is modelled by the bytes
// it was taken of.
struct CachedEntry {
    std::string mServerDate;  // the tag of the version whose date is kept; empty: none
    std::string mEtag;
    std::optional<FileTime> mLocalModified;
    std::optional<std::string> mLocalChecksum;
};

struct World {
    std::map<std::string, LocalFile> mLocal;
    std::map<std::string, RemoteItem> mRemote;
    std::map<std::string, CachedEntry> mCache;  // as the last successful pass saved it
};

struct Outcome {
    std::map<std::string, std::string> mLocal, mRemote, mBackups;  // bytes by name; backups of this run
    std::set<std::string> mUploaded, mDownloaded;
    // The next cache file. Uploaded names take the new tag, and names in
    // mFreshDates the downloaded file's date, once the sync has happened.
    std::map<std::string, CachedEntry> mCache;
    std::set<std::string> mFreshDates;
};

// `checksums`: the folder's files are compared by content, not by date.
Outcome Predict(const World& world, tolmonetsync::SyncMode mode, bool checksums);

}  // namespace modeltest
