#pragma once
// "tolmonetsynccache.fingerprint" beside the cache file: the user, preferences
// root and service the cache file was written for. The cache file's own
// format stays as designed, so whom it belongs to is kept beside it.

#include <string>

#include "assets/SyncServer.h"
#include "sync/SyncRecords.h"

namespace tolmonetsync {

struct CacheFingerprint {
    std::string mUser;  // empty when the client does not know it (a bare token)
    std::string mRoot;
    std::string mService;
};

// The fingerprint file in the preference directory.
File CacheFingerprintFile();
// Whom a cache file written through `server` now belongs to.
CacheFingerprint FingerprintOf(const SyncServer& server);
// Replaces the fingerprint file (0600, never through a planted link). Throws.
void WriteCacheFingerprint(const CacheFingerprint& fingerprint);
// Reads a fingerprint file; throws when it cannot be read or is no file of ours.
CacheFingerprint ReadCacheFingerprint(const File& file);
// How `kept` names another owner than `ours` ("user A, not B"), or empty. An
// unknown user on either side is no evidence of another.
std::string ForeignOwner(const CacheFingerprint& kept, const CacheFingerprint& ours);
// Why the existing cache file belongs to someone else than `ours`; empty when
// it is ours, when there is no cache file or no fingerprint (older installs
// wrote none), or when the fingerprint cannot be read (traced). An unknown
// user on either side is no evidence of another.
std::string ForeignCacheReason(const CacheFingerprint& ours);

}  // namespace tolmonetsync
