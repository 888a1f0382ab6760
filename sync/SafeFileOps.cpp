// What protects the user's files: nothing local is replaced or removed
// without a copy in this run's backup directory, and downloads land beside
// their target first.

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <sstream>
#include <vector>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/Hash.h"
#include "foundation/core/Trace.h"
#include "sync/BackupCopy.h"
#include "sync/PrefDirLock.h"
#include "sync/SyncCache.h"
#include "sync/SyncRecords.h"

namespace tolmonetsync {

using tolmocore::filesupport::IPlatformByteStream;
using tolmocore::filesupport::OPlatformByteStream;

namespace {

constexpr unsigned int kBlockSize = 10240;

// The records' content checksum, folded block by block: the index gives
// copies the value the cache file gives their originals.
class ContentChecksum {
public:
    ContentChecksum()
    {
        mValue.mWords[3] = 8;
        MixHash::MixInData(mValue, reinterpret_cast<const unsigned char*>("SyncFile"), 8);
    }
    // One block of at most kBlockSize bytes.
    void Add(const unsigned char* block, unsigned int size)
    {
        mValue.mWords[3] += size;  // the running count of bytes mixed, the marker's 8 included
        MixHash::MixInData(mValue, block, size);
    }
    Guid Value() const
    {
        const std::uint32_t* w = mValue.mWords;
        return Guid(w[0], static_cast<unsigned short>(w[1] >> 16), static_cast<unsigned short>(w[1]),
                    static_cast<unsigned char>(w[2] >> 24), static_cast<unsigned char>(w[2] >> 16),
                    static_cast<unsigned char>(w[2] >> 8), static_cast<unsigned char>(w[2]),
                    static_cast<unsigned char>(w[3] >> 24), static_cast<unsigned char>(w[3] >> 16),
                    static_cast<unsigned char>(w[3] >> 8), static_cast<unsigned char>(w[3]));
    }

private:
    HashValue mValue;
};

bool IsLink(const Dir& dir)
{
    struct stat info;
    return ::lstat(tolmocore::utility::ToNarrow(dir.FullPath()).c_str(), &info) == 0 && S_ISLNK(info.st_mode);
}

// Backups hold copies of the user's files: a directory of them is made 0700,
// and one that is a link could send them, or the pruning, anywhere.
void MakeBackupDirectory(const Dir& dir)
{
    if (IsLink(dir))
        throw tolmocore::filesupport::FileSystemError("Refusing the backup directory", dir.FullPath(), ELOOP,
                                                      "it is a symbolic link");
    dir.CreatePrivate();
}

// Only what the library made is pruned: real directories named "Backup_...".
bool IsPrunable(const Dir& dir)
{
    const UTF16String prefix(u"Backup_");
    return dir.GetName().compare(0, prefix.size(), prefix) == 0 && !IsLink(dir);
}

UTF16String GroupOf(const File& file, const std::vector<SyncDir>& dirs)
{
    for (const SyncDir& dir : dirs)
        if (dir.mDir.FullPath() == file.Parent().FullPath()) return dir.mCollectionName;
    return UTF16String();
}

std::string BackupDirName(const boost::posix_time::ptime& now)
{
    std::ostringstream name;
    name.imbue(std::locale(name.getloc(), new boost::posix_time::time_facet("%Y%m%d-%H%M%S_%f")));
    name << "Backup_" << now;
    return name.str();
}

// The swap of SafeRenameSwap; gives the backup copy's description if one was made.
bool SwapIntoPlace(const CachedSyncFile& record, const Dir& backupDir, BackupCopy& copy)
{
    // The copy goes aside first; then the rename replaces the target in one
    // step, so there is never a moment without a file under the target name.
    // The download takes the old file's permissions before it is renamed.
    // The directory sync is left to the cache file's save, which does it once
    // for all the swaps of a pass before it records any of them.
    const bool existed = record.mFile.Exists();
    if (existed) copy = CopyIntoBackup(record.mFile, backupDir);
    File downloaded = record.GetSafeRenameFile();
    downloaded.PrepareToReplace(record.mFile);
    downloaded.Rename(record.mFile.GetName());
    return existed;
}

}  // namespace

// Copies `source` into `backupDir` under its own name. Backups are flat:
// within one run a later file of the same name replaces an earlier copy. The
// copy is as private as the original from its first byte on.
BackupCopy CopyIntoBackup(const File& source, const Dir& backupDir)
{
    struct stat original;
    const std::string sourcePath = tolmocore::utility::ToNarrow(source.FullPath());
    if (::stat(sourcePath.c_str(), &original) != 0)
        tolmocore::filesupport::ThrowFileSystemError("Cannot back up", source.FullPath());
    File copy(backupDir, source.GetName());
    copy.Create(false);
    IPlatformByteStream in(source, 1);
    OPlatformByteStream out(copy, 1, original.st_mode & 07777);
    ContentChecksum checksum;
    BackupCopy made;
    std::vector<unsigned char> block(kBlockSize);
    for (std::uint64_t remaining = in.Length(); remaining > 0;) {
        const unsigned int size = static_cast<unsigned int>(std::min<std::uint64_t>(kBlockSize, remaining));
        in.ReadBlock(block.data(), size);
        out.WriteBlock(block.data(), size);
        checksum.Add(block.data(), size);
        made.mSize += size;
        remaining -= size;
    }
    out.Close();
    made.mChecksum = checksum.Value();
    return made;
}

Guid ChecksumOfBytes(const std::string& bytes)
{
    ContentChecksum checksum;
    const auto* data = reinterpret_cast<const unsigned char*>(bytes.data());
    for (std::size_t offset = 0; offset < bytes.size(); offset += kBlockSize)
        checksum.Add(data + offset,
                     static_cast<unsigned int>(std::min<std::size_t>(kBlockSize, bytes.size() - offset)));
    return checksum.Value();
}

BackupEntry DescribeBackup(const File& original, const Dir& backupDir, const UTF16String& copyName,
                           const UTF16String& group, BackupReason reason, const BackupCopy& copy)
{
    using tolmocore::utility::ToNarrow;
    BackupEntry entry;
    entry.mRun = ToNarrow(backupDir.GetName());
    entry.mCopy = ToNarrow(copyName);
    entry.mPath = ToNarrow(original.FullPath());
    entry.mGroup = ToNarrow(group);
    entry.mName = ToNarrow(original.GetName());
    entry.mReason = BackupReasonName(reason);
    entry.mSize = copy.mSize;
    entry.mChecksum = copy.mChecksum.AsStdString();
    entry.mTime = boost::posix_time::to_iso_extended_string(boost::posix_time::microsec_clock::local_time());
    return entry;
}

File CachedSyncFile::GetSafeRenameFile() const
{
    return File(mFile.Parent(), mFile.GetName() + UTF16String(u".temp"));
}

void CachedSyncFile::SafeRenameSwap(const Dir& backupDir)
{
    BackupCopy unused;
    SwapIntoPlace(*this, backupDir, unused);
}

void SyncCache::SwapDownloaded(CachedSyncFile& record)
{
    BackupCopy copy;
    if (SwapIntoPlace(record, mBackupDir, copy)) {
        BackupEntry entry = DescribeBackup(record.mFile, mBackupDir, record.mFile.GetName(), record.mCollectionName,
                                           BackupReason::ReplacedByDownload, copy);
        entry.mName = tolmocore::utility::ToNarrow(record.mName);
        NoteBackup(std::move(entry));
    }
}

Guid CachedSyncFile::ComputeChecksum() const
{
    try {
        if (!mFile.Exists()) return Guid();
        IPlatformByteStream in(mFile, 1);
        ContentChecksum checksum;
        // The value is defined over blocks of 10,240 bytes; reading many
        // blocks at once only saves system calls.
        std::vector<unsigned char> buffer(kBlockSize * 64);
        for (std::uint64_t remaining = in.Length(); remaining > 0;) {
            const unsigned int chunk = static_cast<unsigned int>(std::min<std::uint64_t>(buffer.size(), remaining));
            in.ReadBlock(buffer.data(), chunk);
            for (unsigned int offset = 0; offset < chunk; offset += kBlockSize)
                checksum.Add(buffer.data() + offset, std::min(kBlockSize, chunk - offset));
            remaining -= chunk;
        }
        return checksum.Value();
    } catch (const std::exception& e) {
        TOLMO_TRACE("tolmonetsync", 1, "ComputeChecksum error: " << e.what());
        return Guid();
    }
}

void CachedSyncFile::FreshenModDate()
{
    if (UsesChecksum())
        mLocalChecksum = ComputeChecksum();
    else
        mLocalModDate = mFile.Exists() ? mFile.Modified() : boost::posix_time::ptime();
}

namespace {

Dir MakeNewBackupDir()
{
    const Dir prefDir = Dir::PrefDir();
    prefDir.CreatePrivate();
    Dir backupRoot(prefDir, u"SyncBackup");
    MakeBackupDirectory(backupRoot);
    Dir backup(backupRoot, tolmocore::utility::ToUTF16(BackupDirName(SyncCache::BackupClock()())));
    MakeBackupDirectory(backup);
    return backup;
}

}  // namespace

Dir SyncCache::NewBackupDirWithoutPruning()
{
    return MakeNewBackupDir();
}

Dir SyncCache::NewBackupDir()
{
    const Dir backup = MakeNewBackupDir();
    const Dir backupRoot = backup.Parent();

    // Oldest first; equal dates keep the walk's (name) order.
    std::vector<std::pair<boost::posix_time::ptime, Dir> > existing;
    for (auto it = backupRoot.BeginSubdirs(false, nullptr); it != backupRoot.EndSubdirs(); ++it)
        if (IsPrunable(*it)) existing.emplace_back((*it).Modified(), *it);
    std::stable_sort(existing.begin(), existing.end(), [](const auto& a, const auto& b) { return a.first < b.first; });

    // Ten, not the number above a limit: at eleven only the newest survives,
    // and the count climbs again from one.
    if (existing.size() >= 11) {
        for (std::size_t i = 0; i < 10; ++i) {
            try {
                existing[i].second.Delete();
            } catch (const std::exception&) {
                // Left for the next cache to count again.
            }
        }
        try {
            UpdateBackupIndex({});  // pruned runs leave the index
        } catch (const std::exception& e) {
            TOLMO_TRACE("tolmonetsync", 1, "Warning: backup index not written: " << e.what());
        }
    }
    return backup;
}

void SyncCache::SafeDelete(File& file)
{
    try {
        if (!file.Exists()) return;
        const BackupCopy copy = CopyIntoBackup(file, mBackupDir);
        NoteBackup(DescribeBackup(file, mBackupDir, file.GetName(), GroupOf(file, mDirs),
                                  BackupReason::RemovedByServerWins, copy));
        file.Delete();
    } catch (const std::exception& e) {
        TOLMO_TRACE("tolmonetsync", 1, "Warning: Error while deleting: " << file.FullPath() << ", error: " << e.what());
    }
}

void SyncCache::NoteBackup(BackupEntry entry)
{
    std::lock_guard<std::mutex> lock(mBackupsMutex);
    mNotedBackups.push_back(std::move(entry));
}

void SyncCache::FinishPass()
{
    std::lock_guard<std::mutex> lock(mBackupsMutex);
    if (!mNotedBackups.empty()) {
        try {
            UpdateBackupIndex(mNotedBackups);
            mNotedBackups.clear();
        } catch (const std::exception& e) {
            TOLMO_TRACE("tolmonetsync", 1, "Warning: backup index not written: " << e.what());
        }
    }
    mPrefDirLock.reset();
}

}  // namespace tolmonetsync
