// The doctor's look at the preference directory: the cache file, whom it
// belongs to, and the backups beside it.

#include <fstream>
#include <sstream>

#include "cli/DoctorChecks.h"
#include "cli/PrintableName.h"
#include "cli/ProgressBar.h"
#include "foundation/json/JSON.h"
#include "sync/CacheFile.h"
#include "sync/CacheFileReader.h"
#include "sync/CacheFingerprint.h"

namespace tolmonetsync {
namespace cli {

namespace {

namespace fs = std::filesystem;
using tolmocore::utility::ToNarrow;
using tolmocore::utility::ToUTF16;

// The cache file is bounded like the library bounds it.
constexpr std::uintmax_t kMaxReadSize = 64ull * 1024 * 1024;

std::string ReadWhole(const fs::path& path)
{
    std::ifstream in(path, std::ios::binary);
    if (!in) throw std::runtime_error("cannot be read");
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

// The records of the cache file's text, read as the library reads them.
std::vector<CachedSyncFile> ParseCacheText(const std::string& text)
{
    std::vector<CachedSyncFile> records;
    if (text.empty()) return records;
    const UTF8String terminated(text.c_str(), text.size() + 1);  // the reader stops at the NUL
    if (ReadCacheEntries(terminated, records)) return records;
    namespace json = tolmocore::serialization;
    const boost::any tree = json::JSONParse(terminated);
    for (const boost::shared_ptr<boost::any>& entry : boost::any_cast<const json::JSONArray&>(tree))
        records.push_back(json::JSONConvert<CachedSyncFile>::FromJSON(entry ? *entry : boost::any()));
    return records;
}

// Where the registrations would keep the record's file; empty if none names it.
fs::path RegisteredPath(const DoctorSetup& setup, const CachedSyncFile& record)
{
    for (const SyncFile& file : setup.mFiles)
        if (file.mCollectionName == record.mCollectionName && file.mName == record.mName)
            return ToNarrow(file.mFile.FullPath());
    const UTF16String& name = record.mName;
    for (const SyncDir& dir : setup.mDirs) {
        const UTF16String& extension = dir.mExtension;
        if (dir.mCollectionName == record.mCollectionName && name.size() > extension.size() &&
            name.compare(name.size() - extension.size(), extension.size(), extension) == 0)
            return fs::path(ToNarrow(dir.mDir.FullPath())) / ToNarrow(name);
    }
    return fs::path();
}

std::string RecordName(const CachedSyncFile& record)
{
    return PrintableName(ToNarrow(record.mCollectionName) + "/" + ToNarrow(record.mName));
}

// "N (first, second, ...)" for a list of names, at most three of them shown.
std::string CountAndExamples(const std::vector<std::string>& names)
{
    std::string text = std::to_string(names.size()) + " (";
    for (std::size_t i = 0; i < names.size() && i < 3; ++i) text += (i > 0 ? ", " : "") + names[i];
    return text + (names.size() > 3 ? ", ...)" : ")");
}

std::string Counted(std::size_t count, const char* one, const char* many)
{
    return std::to_string(count) + " " + (count == 1 ? one : many);
}

}  // namespace

DoctorFinding CheckCacheFile(const DoctorSetup& setup)
{
    DoctorFinding finding{"cache", false, std::string()};
    const fs::path path = setup.mPrefDir / "tolmonetsynccache.json";
    std::error_code error;
    if (!fs::exists(fs::symlink_status(path, error))) {
        finding.mDetail = "no cache file yet: the next sync treats every file as new";
        return finding;
    }
    std::vector<CachedSyncFile> records;
    try {
        if (fs::file_size(path) > kMaxReadSize) throw std::runtime_error("is too large to be a cache file");
        records = ParseCacheText(ReadWhole(path));
    } catch (const std::exception& e) {
        finding.mAttention = true;
        finding.mDetail = PrintableName(path.string()) + " does not parse (" + PrintableName(e.what()) +
                          "): the next sync ignores it and treats every file as new";
        return finding;
    }
    std::vector<std::string> unregistered;
    std::vector<std::string> gone;
    for (const CachedSyncFile& record : records) {
        const fs::path where = RegisteredPath(setup, record);
        if (where.empty()) {
            unregistered.push_back(RecordName(record));
        } else if (!fs::exists(fs::symlink_status(where, error))) {
            gone.push_back(RecordName(record));
        }
    }
    finding.mDetail = Counted(records.size(), "entry", "entries");
    if (setup.mDirs.empty() && setup.mFiles.empty()) {
        finding.mDetail += " (give the --dir and --file of the sync to check them)";
        return finding;
    }
    if (!unregistered.empty())
        finding.mDetail += "; for files no --dir or --file names: " + CountAndExamples(unregistered);
    if (!gone.empty())
        finding.mDetail += "; whose file is gone (a two-way sync brings it back): " + CountAndExamples(gone);
    finding.mAttention = !unregistered.empty() || !gone.empty();
    return finding;
}

DoctorFinding CheckCacheOwner(const DoctorSetup& setup)
{
    DoctorFinding finding{"cache-owner", false, std::string()};
    const fs::path path = setup.mPrefDir / "tolmonetsynccache.fingerprint";
    std::error_code error;
    if (!fs::exists(fs::symlink_status(path, error))) {
        finding.mDetail = "unknown: no fingerprint beside the cache file (no sync by this version yet)";
        return finding;
    }
    CacheFingerprint kept;
    try {
        kept = ReadCacheFingerprint(File(ToUTF16(path.string())));
    } catch (const std::exception&) {
        finding.mAttention = true;
        finding.mDetail = "unknown: the fingerprint " + PrintableName(path.string()) + " does not parse";
        return finding;
    }
    const std::string why =
        PrintableName(ForeignOwner(kept, CacheFingerprint{setup.mUser, setup.mPreferencesRoot, setup.mService}));
    finding.mAttention = !why.empty();
    finding.mDetail = why.empty() ? "written for this user, preferences root and service"
                                  : "foreign: the cache file was written for " + why +
                                        "; a sync here would take its history for this one's";
    return finding;
}

DoctorFinding CheckBackups(const DoctorSetup& setup)
{
    DoctorFinding finding{"backups", false, std::string()};
    const fs::path root = setup.mPrefDir / "SyncBackup";
    std::error_code error;
    std::size_t runs = 0;
    std::size_t files = 0;
    std::uintmax_t bytes = 0;
    if (fs::is_symlink(root, error)) {
        finding.mAttention = true;
        finding.mDetail = PrintableName(root.string()) + " is a symbolic link: a sync refuses it";
        return finding;
    }
    for (fs::directory_iterator run(root, error), end; !error && run != end; run.increment(error)) {
        const std::string name = run->path().filename().string();
        if (name.compare(0, 7, "Backup_") != 0 || run->is_symlink(error) || !run->is_directory(error)) continue;
        ++runs;
        std::error_code inner;
        for (fs::recursive_directory_iterator copy(run->path(), inner), last; !inner && copy != last;
             copy.increment(inner)) {
            if (!copy->is_regular_file(inner)) continue;
            ++files;
            bytes += copy->file_size(inner);
        }
    }
    finding.mDetail = Counted(runs, "backup directory", "backup directories") + ", " +
                      Counted(files, "copy", "copies") + ", " + ByteCountText(bytes) + "; ";
    const std::size_t syncs = runs + 1 >= kBackupsThatPrune ? 1 : kBackupsThatPrune - runs;
    finding.mDetail += syncs == 1 ? "the next sync prunes the oldest " + std::to_string(kBackupsThatPrune - 1)
                                  : "a prune of the oldest " + std::to_string(kBackupsThatPrune - 1) + " comes in " +
                                        std::to_string(syncs) + " syncs";
    return finding;
}

}  // namespace cli
}  // namespace tolmonetsync
