#pragma once
// A read-only plan: what a prepare and a pass in one mode would do, without
// changing anything on the server or on disk. The records, the decisions and
// the group changes come from the same code as the real ones.

#include <map>
#include <set>
#include <string>
#include <vector>

#include <boost/shared_ptr.hpp>

#include "sync/SyncCache.h"
#include "sync/SyncDecision.h"
#include "sync/SyncRisks.h"

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

    // Items (not groups) in each group of mGroupsToDelete, as listed.
    std::map<UTF16String, std::size_t, UTF16Less> mGroupsToDeleteItems;
    // Records the cache file lists whose local file is gone: deleted here.
    std::set<std::size_t> mDeletedLocally;
    // Why the cache file is another's (user, preferences root or service);
    // empty when it is this one's or has no fingerprint.
    std::string mForeignCache;
    // The service's limits when the preview was made.
    SyncLimits mLimits;

    // The risky decisions of this plan.
    std::vector<SyncRisk> Risks() const { return FindRisks(*this); }
    // What the plan deletes and overwrites, group items included.
    PlanCounts Counts() const;
    // The line refusing this plan under mLimits; empty within them.
    std::string ExceededLimit() const { return tolmonetsync::ExceededLimit(mLimits, Counts()); }
};

}  // namespace tolmonetsync
