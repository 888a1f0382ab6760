#include "sync/BackupIndex.h"

#include <map>
#include <utility>

#include <boost/json.hpp>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/Dir.h"
#include "foundation/core/Trace.h"

namespace tolmonetsync {

using tolmocore::filesupport::Dir;
using tolmocore::filesupport::File;
using tolmocore::filesupport::IPlatformByteStream;
using tolmocore::filesupport::OPlatformByteStream;

namespace {

// Far above any real index; a larger file is treated as damaged, not read.
constexpr std::uint64_t kMaxIndexSize = 64ull * 1024 * 1024;

Dir BackupRoot()
{
    return Dir(Dir::PrefDir(), u"SyncBackup");
}

std::string Text(const boost::json::object& entry, const char* key)
{
    const boost::json::value* value = entry.if_contains(key);
    return value && value->is_string() ? std::string(value->get_string()) : std::string();
}

boost::json::object ToJson(const BackupEntry& entry)
{
    boost::json::object json{{"run", entry.mRun},     {"copy", entry.mCopy},         {"path", entry.mPath},
                             {"group", entry.mGroup}, {"name", entry.mName},         {"reason", entry.mReason},
                             {"size", entry.mSize},   {"checksum", entry.mChecksum}, {"time", entry.mTime}};
    if (!entry.mReplaces.empty()) json["replaces"] = entry.mReplaces;
    return json;
}

bool FromJson(const boost::json::value& value, BackupEntry& entry)
{
    if (!value.is_object()) return false;
    const boost::json::object& json = value.get_object();
    entry.mRun = Text(json, "run");
    entry.mCopy = Text(json, "copy");
    entry.mPath = Text(json, "path");
    entry.mGroup = Text(json, "group");
    entry.mName = Text(json, "name");
    entry.mReason = Text(json, "reason");
    entry.mChecksum = Text(json, "checksum");
    entry.mTime = Text(json, "time");
    entry.mReplaces = Text(json, "replaces");
    const boost::json::value* size = json.if_contains("size");
    if (size && size->is_uint64()) entry.mSize = size->get_uint64();
    if (size && size->is_int64() && size->get_int64() >= 0) entry.mSize = static_cast<std::uint64_t>(size->get_int64());
    // Without these an entry cannot lead back to a copy.
    return !entry.mRun.empty() && !entry.mCopy.empty() && !entry.mPath.empty();
}

bool RunExists(const std::string& run)
{
    try {
        return Dir(BackupRoot(), tolmocore::utility::ToUTF16(run)).Exists();
    } catch (const std::exception&) {
        return false;  // a name that cannot be a directory of ours
    }
}

}  // namespace

const char* BackupReasonName(BackupReason reason)
{
    switch (reason) {
        case BackupReason::ReplacedByDownload:
            return "replaced-by-download";
        case BackupReason::RemovedByServerWins:
            return "removed-by-server-wins";
        case BackupReason::ServerCopyKept:
            return "server-copy-kept";
        case BackupReason::ReplacedByRestore:
            return "replaced-by-restore";
    }
    return "";
}

File BackupIndexFile()
{
    return File(BackupRoot(), u"index.json");
}

std::vector<BackupEntry> ReadBackupIndex()
{
    std::vector<BackupEntry> entries;
    const File file = BackupIndexFile();
    try {
        if (!file.Exists()) return entries;
        IPlatformByteStream in(file, 1);
        const std::uint64_t length = in.Length();
        if (length > kMaxIndexSize) throw std::runtime_error("too large");
        std::string text(static_cast<std::size_t>(length), '\0');
        if (length > 0) in.ReadBlock(reinterpret_cast<unsigned char*>(&text[0]), static_cast<unsigned int>(length));
        const boost::json::value tree = boost::json::parse(text);
        const boost::json::value* list = tree.is_object() ? tree.get_object().if_contains("copies") : nullptr;
        if (!list || !list->is_array()) throw std::runtime_error("no list of copies");
        std::size_t skipped = 0;
        for (const boost::json::value& value : list->get_array()) {
            BackupEntry entry;
            if (FromJson(value, entry))
                entries.push_back(std::move(entry));
            else
                ++skipped;
        }
        if (skipped > 0) TOLMO_TRACE("tolmonetsync", 1, "Backup index: " << skipped << " unreadable entries left out");
    } catch (const std::exception& e) {
        // The next write starts the index again from what could be read.
        TOLMO_TRACE("tolmonetsync", 1, "Backup index unreadable: " << file.FullPath() << ", error: " << e.what());
    }
    return entries;
}

void UpdateBackupIndex(std::vector<BackupEntry> added)
{
    std::vector<BackupEntry> entries = ReadBackupIndex();
    std::map<std::string, bool> runExists;
    std::vector<BackupEntry> kept;
    for (BackupEntry& entry : entries) {
        auto found = runExists.find(entry.mRun);
        if (found == runExists.end()) found = runExists.emplace(entry.mRun, RunExists(entry.mRun)).first;
        if (found->second) kept.push_back(std::move(entry));
    }
    // Backups are flat: a copy of the same name in the same run overwrote the
    // earlier one, and says so.
    std::map<std::pair<std::string, std::string>, std::string> latest;
    for (const BackupEntry& entry : kept) latest[{entry.mRun, entry.mCopy}] = entry.mPath;
    for (BackupEntry& entry : added) {
        std::string& previous = latest[{entry.mRun, entry.mCopy}];
        if (!previous.empty()) entry.mReplaces = previous;
        previous = entry.mPath;
        kept.push_back(std::move(entry));
    }

    boost::json::array list;
    list.reserve(kept.size());
    for (const BackupEntry& entry : kept) list.push_back(ToJson(entry));
    const std::string text = boost::json::serialize(boost::json::object{{"copies", std::move(list)}}) + "\n";
    OPlatformByteStream out(BackupIndexFile(), 1, 0600);
    out.WriteBlock(reinterpret_cast<const unsigned char*>(text.data()), static_cast<unsigned int>(text.size()));
    out.Close();
}

bool IsLatestOfItsName(const std::vector<BackupEntry>& index, std::size_t position)
{
    for (std::size_t later = position + 1; later < index.size(); ++later)
        if (index[later].mRun == index[position].mRun && index[later].mCopy == index[position].mCopy) return false;
    return true;
}

}  // namespace tolmonetsync
