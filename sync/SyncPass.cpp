// The pass: decide for every record, queue every request in one batch, and
// when the batch has ended save the cache file and tell the host.

#include <boost/date_time/posix_time/posix_time_io.hpp>
#include <boost/thread/lock_guard.hpp>

#include "assets/RestException.h"
#include "foundation/core/Trace.h"
#include "sync/BackupCopy.h"
#include "sync/Batches.h"
#include "sync/SyncDecision.h"
#include "sync/SyncFilesService.h"

namespace tolmonetsync {

using tolmocore::utility::AsciiToUTF16;
using utility::DeferredList;

namespace {

ErrorCallback BindErrback(const boost::shared_ptr<BatchSync>& self, std::size_t index)
{
    return [self, index](const Guid& requestID, const boost::shared_ptr<tolmonet::Response>& response) {
        DeferredList::Errback(self, index, requestID, response);
    };
}

boost::posix_time::ptime PresentModDate(const File& file)
{
    try {
        return file.Exists() ? file.Modified() : boost::posix_time::ptime();
    } catch (const std::exception&) {
        return boost::posix_time::ptime();
    }
}

// The refusal of a pass beyond the service's limits; empty within them. The
// groups are gone by now: the preview counted their items.
std::string ExceededLimitOfPass(const SyncCache& cache, SyncMode mode, const std::vector<SyncDir>& dirs,
                                const SyncLimits& limits)
{
    if (limits.mMaxDelete == SyncLimits::kNone && limits.mMaxOverwrite == SyncLimits::kNone) return std::string();
    std::vector<SyncDecision> plan;
    plan.reserve(cache.mFiles.size());
    for (const CachedSyncFile& record : cache.mFiles) plan.push_back(DecideRecord(cache, record, mode));
    const std::size_t removals = mode == SyncMode_ServerWins ? ServerWinsRemovals(cache, dirs).size() : 0;
    return ExceededLimit(limits, CountPlan(cache.mFiles, plan, removals, 0));
}

}  // namespace

Guid BatchSync::QueueUpload(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                            const boost::shared_ptr<Collection>& collection, const boost::shared_ptr<SyncCache>& cache,
                            CachedSyncFile& record)
{
    return SendUpload(self, index, collection, cache, record, self->BeginSlot(index));
}

Guid BatchSync::SendUpload(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                           const boost::shared_ptr<Collection>& collection, const boost::shared_ptr<SyncCache>& cache,
                           CachedSyncFile& record, const Guid& guid)
{
    CachedSyncFile* target = &record;  // mFiles does not change size during the pass
    const ItemCallback uploaded = [self, index, cache, target](const Guid& requestID,
                                                              const boost::shared_ptr<Item>& item) {
        _HandleQueueUpload(self, index, cache, *target, requestID, item);
    };
    return cache->GetApi()->UploadAsync(uploaded, BindErrback(self, index), collection, record.mFile, record.mMimeType,
                                        record.mName, guid);
}

Guid BatchSync::QueueDownload(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                              const boost::shared_ptr<Item>& item, const boost::shared_ptr<SyncCache>& cache,
                              CachedSyncFile& record)
{
    const Guid guid = self->BeginSlot(index);
    CachedSyncFile* target = &record;
    const DownloadCallback downloaded = [self, index, cache, item, target](const Guid& requestID,
                                                                          const DownloadResult& result) {
        _HandleQueueDownload(self, index, cache, item, *target, requestID, result);
    };
    // Into the ".temp" file beside the target; an empty tag downloads unconditionally.
    return cache->GetApi()->DownloadAsync(downloaded, BindErrback(self, index), item, record.GetSafeRenameFile(),
                                          record.mCachedServerEtag, guid);
}

Guid BatchSync::QueueKeepThenUpload(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                                    const boost::shared_ptr<Item>& item,
                                    const boost::shared_ptr<Collection>& collection,
                                    const boost::shared_ptr<SyncCache>& cache, CachedSyncFile& record)
{
    const Guid guid = self->BeginSlot(index);
    CachedSyncFile* target = &record;
    const File copy(cache->mBackupDir, record.mFile.GetName() + UTF16String(u".server-copy"));
    const DownloadCallback kept = [self, index, collection, cache, target, copy](const Guid& requestID,
                                                                                 const DownloadResult& result) {
        _HandleKeepServerCopy(self, index, collection, cache, *target, copy, requestID, result);
    };
    // Unconditional: the copy is of the server's version as it is now.
    return cache->GetApi()->DownloadAsync(kept, BindErrback(self, index), item, copy, UTF8String(), guid);
}

Guid BatchSync::QueueDeleteItem(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                                const boost::shared_ptr<SyncCache>& cache, const boost::shared_ptr<Item>& item)
{
    const Guid guid = self->BeginSlot(index);
    const SuccessCallback deleted = [self, index](const Guid& requestID) { Callback(self, index, requestID); };
    return cache->GetApi()->DeleteAsync(deleted, BindErrback(self, index), item, false, guid);
}

void BatchSync::_HandleQueueUpload(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                                   const boost::shared_ptr<SyncCache>& cache, CachedSyncFile& record,
                                   const Guid& requestID, const boost::shared_ptr<Item>& item)
{
    ++cache->mSyncCount;
    ++cache->mUploadCount;
    record.mCachedServerEtag = item->mEtag;
    record.mCachedServerModDate = item->mModified;
    TOLMO_TRACE("tolmonetsync", 8,
                "Done: " << record.mFile.FullPath() << ", cached_modified: " << record.mCachedLocalModDate
                         << ", modified: " << PresentModDate(record.mFile) << ", item: " << item
                         << ", requestID: " << requestID);
    Callback(self, index, requestID);
}

void BatchSync::_HandleKeepServerCopy(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                                      const boost::shared_ptr<Collection>& collection,
                                      const boost::shared_ptr<SyncCache>& cache, CachedSyncFile& record,
                                      const File& copy, const Guid& requestID, const DownloadResult& result)
{
    try {
        if (!result.mDownloaded) throw std::runtime_error("the server's version was not downloaded");
        CachedSyncFile kept;
        kept.mFile = copy;
        BackupCopy made;
        made.mSize = copy.Size(FileSizeSelector_Data);
        made.mChecksum = kept.ComputeChecksum();
        BackupEntry entry = DescribeBackup(record.mFile, cache->mBackupDir, copy.GetName(), record.mCollectionName,
                                           BackupReason::ServerCopyKept, made);
        entry.mName = tolmocore::utility::ToNarrow(record.mName);
        cache->NoteBackup(std::move(entry));
    } catch (const std::exception& e) {
        // Not kept, so not replaced: the server's version stays where it is.
        Errback(self, index, requestID, MakeErrorResponse(AsciiToUTF16(e.what())));
        return;
    }
    // The same identifier, so that CancelAll reaches the upload too.
    if (SendUpload(self, index, collection, cache, record, requestID).IsNil())
        Errback(self, index, requestID, MakeErrorResponse(u"QueueUpload error"));
}

void BatchSync::_HandleQueueDownload(const boost::shared_ptr<BatchSync>& self, std::size_t index,
                                     const boost::shared_ptr<SyncCache>& cache, const boost::shared_ptr<Item>& item,
                                     CachedSyncFile& record, const Guid& requestID, const DownloadResult& result)
{
    if (result.mDownloaded) {
        try {
            cache->SwapDownloaded(record);
            cache->NoteSwap(record.mFile);
            record.mCachedServerEtag = result.mEtag;
            record.FreshenModDate();
        } catch (const std::exception& e) {
            Errback(self, index, requestID, MakeErrorResponse(AsciiToUTF16(e.what())));
            return;
        }
    }
    TOLMO_TRACE("tolmonetsync", 8,
                "Done: " << record.mFile.FullPath() << ", downloaded: " << (result.mDownloaded ? 1 : 0)
                         << ", cache: " << record.mCachedLocalModDate << ", modified: "
                         << PresentModDate(record.mFile) << ", requestID: " << requestID);
    if (result.mDownloaded) {
        ++cache->mSyncCount;
        ++cache->mDownloadCount;
    }
    record.mCachedServerModDate = item->mModified;
    Callback(self, index, requestID);
}

bool SyncFilesService::DoSync(const boost::shared_ptr<SyncCache>& cache, const SyncSuccessCallback& success,
                              const SyncErrorCallback& error, SyncMode mode)
{
    boost::lock_guard<boost::recursive_mutex> lock(SyncMutex());
    const std::string refused = ExceededLimitOfPass(*cache, mode, mSyncDirs, mLimits);
    if (!refused.empty()) {
        error(AsciiToUTF16(refused.c_str()));
        return true;
    }
    SetCache(cache);
    cache->SetSyncMode(mode);
    cache->mSyncCount = cache->mDownloadCount = cache->mUploadCount = 0;
    cache->mStatus = SyncStatus_Syncing;

    // A failed pass ends in `error` instead of _HandleSync: both end the pass.
    const SyncErrorCallback failed = [cache, error](const UTF16String& text) {
        cache->FinishPass();
        error(text);
    };
    boost::shared_ptr<BatchSync> batch(new BatchSync(
        cache->mFiles.size(), [this, cache, success, error] { _HandleSync(cache, success, error); }, failed,
        cache->mProgress, SyncErrorCallback()));
    cache->SetBatch(batch);

    if (mode == SyncMode_ServerWins) {
        for (File file : ServerWinsRemovals(*cache, mSyncDirs)) cache->SafeDelete(file);
    }

    for (std::size_t index = 0; index < cache->mFiles.size(); ++index) {
        CachedSyncFile& record = cache->mFiles[index];
        const SyncDecision decision = DecideRecord(*cache, record, mode);
        // Server-wins forgets the tag of a locally changed file whether or not
        // it downloads now: the saved cache must never vouch for that file.
        if (decision.mDropCachedEtag) record.mCachedServerEtag.clear();
        switch (decision.mAction) {
        case SyncAction_Nothing:
            batch->Skip(index);
            break;
        case SyncAction_SkipMissingRemote:
            TOLMO_TRACE("tolmonetsync", 8, "Skipping missing remote: " << record.mFile.FullPath());
            batch->Skip(index);
            break;
        case SyncAction_SkipMissingLocal:
            TOLMO_TRACE("tolmonetsync", 8, "Skipping missing local: " << record.mFile.FullPath());
            batch->Skip(index);
            break;
        case SyncAction_SkipTooBig:
            TOLMO_TRACE("tolmonetsync", 1, "Skipping (too big): " << record.mFile.FullPath());
            batch->Skip(index);
            break;
        case SyncAction_Download:
            if (BatchSync::QueueDownload(batch, index, decision.mItem, cache, record).IsNil())
                error(u"QueueDownload error");
            break;
        case SyncAction_Upload: {
            const boost::shared_ptr<Collection> collection = cache->GetCollection(record);
            // The server's version goes into the backups first, chained
            // before its upload in the same slot.
            const bool keep = mKeepServerCopies && decision.mItem &&
                              (!decision.mHistory || decision.mItem->mModified != record.mCachedServerModDate);
            const Guid queued =
                !collection ? Guid()
                : keep ? BatchSync::QueueKeepThenUpload(batch, index, decision.mItem, collection, cache, record)
                       : BatchSync::QueueUpload(batch, index, collection, cache, record);
            if (queued.IsNil()) error(u"QueueUpload error");
            break;
        }
        case SyncAction_DeleteRemote:
            if (BatchSync::QueueDeleteItem(batch, index, cache, decision.mItem).IsNil())
                error(u"QueueDeleteItem error");
            break;
        }
    }
    batch.reset();
    return true;
}

void SyncFilesService::_HandleSync(const boost::shared_ptr<SyncCache>& cache, const SyncSuccessCallback& success,
                                   const SyncErrorCallback& error)
{
    cache->FinishPass();
    try {
        cache->SaveCache();
        success(static_cast<int>(cache->mSyncCount));
    } catch (const std::exception& e) {
        error(AsciiToUTF16(e.what()));
    }
}

}  // namespace tolmonetsync
