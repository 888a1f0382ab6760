#include "sync/BackupRestore.h"

#include <algorithm>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/Dir.h"
#include "foundation/core/Trace.h"
#include "sync/BackupCopy.h"
#include "sync/SyncCache.h"

namespace tolmonetsync {

using tolmocore::filesupport::Dir;
using tolmocore::filesupport::File;
using tolmocore::filesupport::IPlatformByteStream;
using tolmocore::filesupport::OPlatformByteStream;
using tolmocore::utility::ToNarrow;
using tolmocore::utility::ToUTF16;

namespace {

File CopyOf(const BackupEntry& entry)
{
    return File(Dir(Dir(Dir::PrefDir(), u"SyncBackup"), ToUTF16(entry.mRun)), ToUTF16(entry.mCopy));
}

// The newest entry for `path` (in `run`) whose copy is still there.
const BackupEntry* ChooseCopy(const std::vector<BackupEntry>& index, const std::string& path, const std::string& run)
{
    const BackupEntry* chosen = nullptr;
    for (std::size_t i = 0; i < index.size(); ++i) {
        const BackupEntry& entry = index[i];
        if (entry.mPath != path || (!run.empty() && entry.mRun != run)) continue;
        if (!IsLatestOfItsName(index, i) || !CopyOf(entry).Exists()) continue;
        // Run names sort by time; within a run the later entry wins.
        if (!chosen || entry.mRun >= chosen->mRun) chosen = &entry;
    }
    return chosen;
}

std::string ReadCopy(const BackupEntry& entry)
{
    const File copy = CopyOf(entry);
    IPlatformByteStream in(copy, 1);
    std::string bytes(static_cast<std::size_t>(in.Length()), '\0');
    if (!bytes.empty())
        in.ReadBlock(reinterpret_cast<unsigned char*>(&bytes[0]), static_cast<unsigned int>(bytes.size()));
    // What was read, against what was copied.
    if (bytes.size() != entry.mSize || ChecksumOfBytes(bytes).AsStdString() != entry.mChecksum)
        throw NoBackupCopy("the copy in " + entry.mRun + " was changed after it was made; not restored");
    return bytes;
}

}  // namespace

std::vector<BackupRun> ListBackups()
{
    std::vector<BackupRun> runs;
    for (const BackupEntry& entry : ReadBackupIndex()) {
        auto found =
            std::find_if(runs.begin(), runs.end(), [&](const BackupRun& run) { return run.mRun == entry.mRun; });
        if (found == runs.end()) {
            if (!Dir(Dir(Dir::PrefDir(), u"SyncBackup"), ToUTF16(entry.mRun)).Exists()) continue;
            runs.push_back(BackupRun{entry.mRun, {}});
            found = runs.end() - 1;
        }
        found->mCopies.push_back(entry);
    }
    std::sort(runs.begin(), runs.end(), [](const BackupRun& a, const BackupRun& b) { return a.mRun > b.mRun; });
    return runs;
}

RestoreResult RestoreFromBackup(const File& target, const std::string& run)
{
    const PrefDirLock lock(PrefDirLock::Exclusive);
    const std::vector<BackupEntry> index = ReadBackupIndex();
    const std::string path = ToNarrow(target.FullPath());
    const BackupEntry* chosen = ChooseCopy(index, path, run);
    if (!chosen) throw NoBackupCopy("no backup copy of " + path + (run.empty() ? std::string() : " in " + run));
    RestoreResult result;
    result.mFrom = *chosen;
    // Read first: nothing is touched unless the copy is whole.
    const std::string bytes = ReadCopy(*chosen);

    if (target.Exists()) {
        const Dir backupDir = SyncCache::NewBackupDirWithoutPruning();
        const BackupCopy copy = CopyIntoBackup(target, backupDir);
        BackupEntry entry = DescribeBackup(target, backupDir, target.GetName(), ToUTF16(chosen->mGroup),
                                           BackupReason::ReplacedByRestore, copy);
        entry.mName = chosen->mName;
        UpdateBackupIndex({entry});
        result.mBackedUpRun = entry.mRun;
    }
    // A sibling written whole and renamed over the file, with its permissions.
    OPlatformByteStream out(target, 1);
    if (!bytes.empty())
        out.WriteBlock(reinterpret_cast<const unsigned char*>(bytes.data()), static_cast<unsigned int>(bytes.size()));
    out.Close();
    TOLMO_TRACE("tolmonetsync", 4, "Restored: " << target.FullPath() << " from " << chosen->mRun.c_str());
    return result;
}

}  // namespace tolmonetsync
