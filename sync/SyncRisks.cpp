#include "sync/SyncRisks.h"

#include "sync/SyncPreview.h"

namespace tolmonetsync {

using tolmocore::utility::ToNarrow;

const char* SyncRisk::KindName() const
{
    switch (mKind) {
        case SyncRisk_Conflict:
            return "conflict";
        case SyncRisk_FirstSyncOverwrite:
            return "first-sync-overwrite";
        case SyncRisk_RestoreDeleted:
            return "restore-deleted";
        case SyncRisk_LocalDelete:
            return "local-delete";
        case SyncRisk_GroupDelete:
            return "group-delete";
        case SyncRisk_ForeignCache:
            return "foreign-cache";
    }
    return "?";
}

PlanCounts CountPlan(const std::vector<CachedSyncFile>& records, const std::vector<SyncDecision>& decisions,
                     std::size_t localRemovals, std::size_t deletedGroupItems)
{
    PlanCounts counts;
    counts.mDeletions = localRemovals + deletedGroupItems;
    for (std::size_t i = 0; i < records.size() && i < decisions.size(); ++i) {
        const SyncDecision& decision = decisions[i];
        if (decision.mAction == SyncAction_DeleteRemote) ++counts.mDeletions;
        if (decision.mAction == SyncAction_Upload && decision.mItem) ++counts.mOverwrites;
        // Only server-wins downloads over a local change; a plain download
        // replaces what the last sync left.
        if (decision.mAction == SyncAction_Download && decision.mDropCachedEtag && records[i].mFile.Exists())
            ++counts.mOverwrites;
    }
    return counts;
}

std::string ExceededLimit(const SyncLimits& limits, const PlanCounts& counts)
{
    if (counts.mDeletions > limits.mMaxDelete)
        return "over the limit max-delete " + std::to_string(limits.mMaxDelete) + ": this sync would delete " +
               std::to_string(counts.mDeletions) + " (local files, server items and items of deleted groups)";
    if (counts.mOverwrites > limits.mMaxOverwrite)
        return "over the limit max-overwrite " + std::to_string(limits.mMaxOverwrite) + ": this sync would overwrite " +
               std::to_string(counts.mOverwrites) +
               " (server items replaced by uploads, local changes replaced by downloads)";
    return std::string();
}

namespace {

SyncRisk RecordRisk(SyncRiskKind kind, std::size_t index, const CachedSyncFile& record, const std::string& detail)
{
    SyncRisk risk;
    risk.mKind = kind;
    risk.mRecord = index;
    risk.mGroup = record.mCollectionName;
    risk.mName = record.mName;
    risk.mFile = record.mFile;
    risk.mDetail = detail;
    return risk;
}

}  // namespace

std::vector<SyncRisk> FindRisks(const SyncPreview& preview)
{
    std::vector<SyncRisk> risks;
    if (!preview.mForeignCache.empty()) {
        SyncRisk risk;
        risk.mKind = SyncRisk_ForeignCache;
        risk.mDetail = preview.mForeignCache;
        risks.push_back(risk);
    }
    for (const UTF16String& group : preview.mGroupsToDelete) {
        SyncRisk risk;
        risk.mKind = SyncRisk_GroupDelete;
        risk.mGroup = group;
        const auto listed = preview.mGroupsToDeleteItems.find(group);
        risk.mDetail = listed == preview.mGroupsToDeleteItems.end()
                           ? "deleted on the server with everything in it"
                           : "deleted on the server with its " + std::to_string(listed->second) + " item(s)";
        risks.push_back(risk);
    }
    for (const File& file : preview.mLocalRemovals) {
        SyncRisk risk;
        risk.mKind = SyncRisk_LocalDelete;
        risk.mFile = file;
        risk.mName = file.GetName();
        risk.mDetail = "removed here because the server has no such item (backed up first)";
        // The group is the registration's: the removal lies in its directory.
        for (const SyncDir& dir : preview.mCache->mDirs)
            if (file.Parent() == dir.mDir) risk.mGroup = dir.mCollectionName;
        risks.push_back(risk);
    }
    const std::vector<CachedSyncFile>& records = preview.mCache->mFiles;
    for (std::size_t i = 0; i < records.size() && i < preview.mDecisions.size(); ++i) {
        const SyncDecision& decision = preview.mDecisions[i];
        const CachedSyncFile& record = records[i];
        if (decision.mAction == SyncAction_Upload && decision.mItem) {
            if (!decision.mHistory)
                risks.push_back(RecordRisk(SyncRisk_FirstSyncOverwrite, i, record,
                                           "the server's version is replaced, though this computer never synced it"));
            else if (record.mServerModDate != record.mCachedServerModDate)
                risks.push_back(RecordRisk(SyncRisk_Conflict, i, record,
                                           "the server's version changed since the last sync and is replaced"));
        }
        if (decision.mAction == SyncAction_Download && preview.mMode == SyncMode_TwoWay &&
            preview.mDeletedLocally.count(i) > 0)
            risks.push_back(RecordRisk(SyncRisk_RestoreDeleted, i, record,
                                       "deleted here since the last sync: the server's copy comes back"));
    }
    return risks;
}

}  // namespace tolmonetsync

namespace tolmonetsync {

PlanCounts SyncPreview::Counts() const
{
    std::size_t groupItems = 0;
    for (const auto& group : mGroupsToDeleteItems) groupItems += group.second;
    return CountPlan(mCache->mFiles, mDecisions, mLocalRemovals.size(), groupItems);
}

}  // namespace tolmonetsync
