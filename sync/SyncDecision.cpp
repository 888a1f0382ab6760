#include "sync/SyncDecision.h"

#include <boost/thread/lock_guard.hpp>

#include "assets/ChildrenMutex.h"

namespace tolmonetsync {

const char* SyncDecision::ActionName() const
{
    switch (mAction) {
    case SyncAction_Nothing: return "nothing";
    case SyncAction_Upload: return "upload";
    case SyncAction_Download:
        // A conditional download of a file unchanged here: only a check unless the server changed it.
        return mHistory && !mDropCachedEtag ? "check" : "download";
    case SyncAction_DeleteRemote: return "delete on server";
    case SyncAction_SkipMissingRemote: return "skip";
    case SyncAction_SkipMissingLocal: return "skip";
    case SyncAction_SkipTooBig: return "skip";
    }
    return "?";
}

const char* SyncDecision::Reason() const
{
    switch (mAction) {
    case SyncAction_Nothing: return "unchanged on both sides";
    case SyncAction_Upload:
        if (!mItem) return "not on the server";
        if (!mHistory) return "no earlier sync: the local file is taken as the truth";
        return mState == CachedSyncFile::State_Push ? "changed locally" : "the local side wins over the server";
    case SyncAction_Download:
        if (mDropCachedEtag) return "the server wins over the local file";
        if (!mHistory) return "missing locally";
        return "unchanged locally: comes down only if changed on the server";
    case SyncAction_DeleteRemote: return "deleted locally and the local side wins";
    case SyncAction_SkipMissingRemote: return "not on the server";
    case SyncAction_SkipMissingLocal: return "no local file to send";
    case SyncAction_SkipTooBig: return "at or above its size limit";
    }
    return "";
}

SyncDecision DecideRecord(const SyncCache& cache, const CachedSyncFile& record, SyncMode mode)
{
    SyncDecision decision;
    decision.mState = record.GetState(mode);
    decision.mHistory = !record.mCachedServerModDate.is_not_a_date_time() && !record.mServerModDate.is_not_a_date_time();
    if (decision.mState == CachedSyncFile::State_Current) return decision;

    bool upload;
    if (mode == SyncMode_LocalWins) {
        upload = true;
    } else if (mode == SyncMode_ServerWins) {
        upload = false;
        decision.mDropCachedEtag = decision.mState == CachedSyncFile::State_Push;
    } else {
        upload = decision.mState == CachedSyncFile::State_Push;
    }
    decision.mItem = cache.GetItem(record);

    if (!upload) {
        decision.mAction = decision.mItem ? SyncAction_Download : SyncAction_SkipMissingRemote;
        return decision;
    }
    if (record.mFile.Exists()) {
        decision.mAction =
            record.mFile.Size(FileSizeSelector_Data) >= record.mMaxSize ? SyncAction_SkipTooBig : SyncAction_Upload;
    } else if (decision.mItem && mode == SyncMode_LocalWins) {
        decision.mAction = SyncAction_DeleteRemote;
    } else {
        decision.mAction = SyncAction_SkipMissingLocal;
    }
    return decision;
}

std::vector<File> ServerWinsRemovals(const SyncCache& cache, const std::vector<SyncDir>& dirs)
{
    std::vector<File> removals;
    std::vector<SyncFile> found;
    for (const SyncDir& dir : dirs) {
        const boost::shared_ptr<Collection> collection = cache.GetCollection(dir);
        if (!collection) continue;
        {
            // An empty group on the server never empties the local directory.
            boost::lock_guard<boost::recursive_mutex> lock(ChildrenMutex());
            if (collection->mChildren.empty()) continue;
        }
        SyncCache::getAllLocalSyncFiles(dir, found);
        for (const SyncFile& file : found) {
            if (!cache.GetItem(file)) removals.push_back(file.mFile);
        }
    }
    return removals;
}

}  // namespace tolmonetsync
