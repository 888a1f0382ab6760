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
#include "sync/SyncCache.h"
#include "sync/SyncRecords.h"

namespace tolmonetsync {

using tolmocore::filesupport::IPlatformByteStream;
using tolmocore::filesupport::OPlatformByteStream;

namespace {

constexpr unsigned int kBlockSize = 10240;

// Copies `source` into `backupDir` under its own name. Backups are flat:
// within one run a later file of the same name replaces an earlier copy. The
// copy is as private as the original from its first byte on.
void CopyIntoBackup(const File& source, const Dir& backupDir)
{
    struct stat original;
    const std::string sourcePath = tolmocore::utility::ToNarrow(source.FullPath());
    if (::stat(sourcePath.c_str(), &original) != 0)
        tolmocore::filesupport::ThrowFileSystemError("Cannot back up", source.FullPath());
    File copy(backupDir, source.GetName());
    copy.Create(false);
    IPlatformByteStream in(source, 1);
    OPlatformByteStream out(copy, 1, original.st_mode & 07777);
    std::vector<unsigned char> block(kBlockSize);
    for (std::uint64_t remaining = in.Length(); remaining > 0;) {
        const unsigned int size = static_cast<unsigned int>(std::min<std::uint64_t>(kBlockSize, remaining));
        in.ReadBlock(block.data(), size);
        out.WriteBlock(block.data(), size);
        remaining -= size;
    }
    out.Close();
}

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

std::string BackupDirName(const boost::posix_time::ptime& now)
{
    std::ostringstream name;
    name.imbue(std::locale(name.getloc(), new boost::posix_time::time_facet("%Y%m%d-%H%M%S_%f")));
    name << "Backup_" << now;
    return name.str();
}

}  // namespace

File CachedSyncFile::GetSafeRenameFile() const
{
    return File(mFile.Parent(), mFile.GetName() + UTF16String(u".temp"));
}

void CachedSyncFile::SafeRenameSwap(const Dir& backupDir)
{
    // The copy goes aside first; then the rename replaces the target in one
    // step, so there is never a moment without a file under the target name.
    // The download takes the old file's permissions before it is renamed.
    // The directory sync is left to the cache file's save, which does it once
    // for all the swaps of a pass before it records any of them.
    if (mFile.Exists()) CopyIntoBackup(mFile, backupDir);
    File downloaded = GetSafeRenameFile();
    downloaded.PrepareToReplace(mFile);
    downloaded.Rename(mFile.GetName());
}

Guid CachedSyncFile::ComputeChecksum() const
{
    try {
        if (!mFile.Exists()) return Guid();
        IPlatformByteStream in(mFile, 1);
        HashValue value;
        value.mWords[3] = 8;
        MixHash::MixInData(value, reinterpret_cast<const unsigned char*>("SyncFile"), 8);
        // The value is defined over blocks of 10,240 bytes; reading many
        // blocks at once only saves system calls.
        std::vector<unsigned char> buffer(kBlockSize * 64);
        for (std::uint64_t remaining = in.Length(); remaining > 0;) {
            const unsigned int chunk = static_cast<unsigned int>(std::min<std::uint64_t>(buffer.size(), remaining));
            in.ReadBlock(buffer.data(), chunk);
            for (unsigned int offset = 0; offset < chunk; offset += kBlockSize) {
                const unsigned int size = std::min(kBlockSize, chunk - offset);
                value.mWords[3] += size;  // the running count of bytes mixed, the marker's 8 included
                MixHash::MixInData(value, buffer.data() + offset, size);
            }
            remaining -= chunk;
        }
        const std::uint32_t* w = value.mWords;
        return Guid(w[0], static_cast<unsigned short>(w[1] >> 16), static_cast<unsigned short>(w[1]),
                    static_cast<unsigned char>(w[2] >> 24), static_cast<unsigned char>(w[2] >> 16),
                    static_cast<unsigned char>(w[2] >> 8), static_cast<unsigned char>(w[2]),
                    static_cast<unsigned char>(w[3] >> 24), static_cast<unsigned char>(w[3] >> 16),
                    static_cast<unsigned char>(w[3] >> 8), static_cast<unsigned char>(w[3]));
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

Dir SyncCache::NewBackupDir()
{
    const Dir prefDir = Dir::PrefDir();
    prefDir.CreatePrivate();
    Dir backupRoot(prefDir, u"SyncBackup");
    MakeBackupDirectory(backupRoot);

    Dir backup(backupRoot, tolmocore::utility::ToUTF16(BackupDirName(BackupClock()())));
    MakeBackupDirectory(backup);

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
    }
    return backup;
}

void SyncCache::SafeDelete(File& file)
{
    try {
        if (!file.Exists()) return;
        CopyIntoBackup(file, mBackupDir);
        file.Delete();
    } catch (const std::exception& e) {
        TOLMO_TRACE("tolmonetsync", 1,
                    "Warning: Error while deleting: " << file.FullPath() << ", error: " << e.what());
    }
}

}  // namespace tolmonetsync
