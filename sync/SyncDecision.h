#pragma once
// What the pass does with one record, decided in one place so that a
// preview shows exactly what a pass will do.

#include <vector>

#include <boost/shared_ptr.hpp>

#include "sync/SyncCache.h"

namespace tolmonetsync {

enum SyncAction {
    SyncAction_Nothing,            // unchanged on both sides (only when the local side wins)
    SyncAction_Upload,
    SyncAction_Download,           // conditional on the kept entity tag, if any
    SyncAction_DeleteRemote,       // the local file is gone and the local side wins
    SyncAction_SkipMissingRemote,  // nothing on the server to bring down
    SyncAction_SkipMissingLocal,   // nothing local to send up
    SyncAction_SkipTooBig,         // at or above the size limit: not uploaded
};

struct SyncDecision {
    SyncAction mAction = SyncAction_Nothing;
    CachedSyncFile::State mState = CachedSyncFile::State_Current;
    // The download replaces a local change: the kept tag is dropped so the
    // server's version comes down whatever it is.
    bool mDropCachedEtag = false;
    // Both sides have a date from the last sync and the item is there now.
    bool mHistory = false;
    boost::shared_ptr<Item> mItem;  // the server's item, if any

    // Why, in words a person reads ("changed locally", ...).
    const char* Reason() const;
    // What, in one word ("upload", "download", "check" for a conditional
    // download of a file unchanged here, ...).
    const char* ActionName() const;
};

// The decision for `record` in `mode`, with the file's existence and size as
// they are now. Reads only; the pass applies mDropCachedEtag itself.
SyncDecision DecideRecord(const SyncCache& cache, const CachedSyncFile& record, SyncMode mode);

// The local files the server-wins pre-pass removes (each backed up first):
// files of a directory whose group has children on the server, with no item
// of their name there. Uses the service's live directory list.
std::vector<File> ServerWinsRemovals(const SyncCache& cache, const std::vector<SyncDir>& dirs);

}  // namespace tolmonetsync
