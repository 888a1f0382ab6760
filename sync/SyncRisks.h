#pragma once
// The risky decisions of a plan, named before anything moves, and the
// opt-in limits on how much one sync may delete or overwrite. Reads only.

#include <cstddef>
#include <limits>
#include <string>
#include <vector>

#include "sync/SyncDecision.h"

namespace tolmonetsync {

class SyncPreview;

enum SyncRiskKind {
    SyncRisk_Conflict,            // an upload replaces a server item whose date changed since the last sync
    SyncRisk_FirstSyncOverwrite,  // no history on both sides: the local file replaces the server's
    SyncRisk_RestoreDeleted,      // a file deleted here comes back from the server (two-way)
    SyncRisk_LocalDelete,         // server-wins removes a local file
    SyncRisk_GroupDelete,         // a server group goes, with everything in it
    SyncRisk_ForeignCache,        // the cache file was written for another user, root or service
};

struct SyncRisk {
    SyncRiskKind mKind = SyncRisk_Conflict;
    // The record's index in the plan; npos for a group, a removal or the cache file.
    std::size_t mRecord = std::numeric_limits<std::size_t>::max();
    UTF16String mGroup;  // empty for the cache file
    UTF16String mName;   // empty for a group or the cache file
    File mFile;          // the local file of a record or a removal
    std::string mDetail;

    // "conflict", "first-sync-overwrite", ...
    const char* KindName() const;
};

// Off unless set: the largest count a sync may reach.
struct SyncLimits {
    static constexpr std::size_t kNone = std::numeric_limits<std::size_t>::max();
    std::size_t mMaxDelete = kNone;
    std::size_t mMaxOverwrite = kNone;
};

// Deletions: local files removed, server items deleted, items of deleted
// groups. Overwrites: server items replaced by uploads, local files changed
// here and replaced by downloads.
struct PlanCounts {
    std::size_t mDeletions = 0;
    std::size_t mOverwrites = 0;
};

// Counts the pass's decisions over `records` (one each, in order), with the
// local removals and deleted group items the prepare and pre-pass add.
PlanCounts CountPlan(const std::vector<CachedSyncFile>& records, const std::vector<SyncDecision>& decisions,
                     std::size_t localRemovals, std::size_t deletedGroupItems);

// One line naming the first limit exceeded and the count; empty within them.
std::string ExceededLimit(const SyncLimits& limits, const PlanCounts& counts);

// The risks of the preview, records first, in plan order.
std::vector<SyncRisk> FindRisks(const SyncPreview& preview);

}  // namespace tolmonetsync
