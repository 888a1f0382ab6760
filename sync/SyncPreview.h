#pragma once
// A read-only plan: what a prepare and a pass in one mode would do, without
// changing anything on the server or on disk. The records, the decisions and
// the group changes come from the same code as the real ones.

#include <vector>

#include <boost/shared_ptr.hpp>

#include "sync/SyncCache.h"
#include "sync/SyncDecision.h"

namespace tolmonetsync {

class SyncPreview {
public:
    SyncMode mMode = SyncMode_TwoWay;
    // The plan's records (no backup directory was made for it).
    boost::shared_ptr<SyncCache> mCache;
    // One decision per record of mCache->mFiles, in order.
    std::vector<SyncDecision> mDecisions;
    // Server groups a prepare would delete (with everything in them) and create.
    GroupNameSet mGroupsToDelete;
    GroupNameSet mGroupsToAdd;
    // Local files the server-wins pass would remove, each backed up first.
    std::vector<File> mLocalRemovals;
    // The preferences root does not exist yet: a prepare would make it (and
    // may migrate an earlier version's into it).
    bool mRootMissing = false;
};

}  // namespace tolmonetsync
