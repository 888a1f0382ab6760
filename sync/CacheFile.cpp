// "tolmonetsynccache.json": the last synchronised state of every record.

#include "sync/CacheFile.h"

#include <unordered_map>
#include <unordered_set>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/Trace.h"
#include "foundation/json/JSON.h"
#include "sync/CacheFileReader.h"
#include "sync/CacheFingerprint.h"
#include "sync/SyncCache.h"

namespace tolmocore {
namespace serialization {

using tolmonetsync::CachedSyncFile;

boost::any JSONConvert<CachedSyncFile>::ToJSON(const CachedSyncFile& record)
{
    boost::any object = JSONObject();
    AddToObjectGeneric(object, "mName", record.mName);
    AddToObjectGeneric(object, "mMimeType", record.mMimeType);
    AddToObjectGeneric(object, "mCollectionName", record.mCollectionName);
    AddToObjectGeneric(object, "mCachedServerEtag", record.mCachedServerEtag);
    AddToObjectGeneric(object, "mCachedServerModDate", record.mCachedServerModDate);
    AddToObjectGeneric(object, "mCachedLocalModDate", record.mCachedLocalModDate);
    AddToObjectGeneric(object, "mCachedLocalChecksum", record.mCachedLocalChecksum);
    return object;
}

CachedSyncFile JSONConvert<CachedSyncFile>::FromJSON(const boost::any& value)
{
    const JSONObject& object = boost::any_cast<const JSONObject&>(value);
    CachedSyncFile record;
    ExtractOptionalPropertyFromObjectGeneric(object, "mName", record.mName);
    ExtractOptionalPropertyFromObjectGeneric(object, "mMimeType", record.mMimeType);
    ExtractOptionalPropertyFromObjectGeneric(object, "mCollectionName", record.mCollectionName);
    ExtractOptionalPropertyFromObjectGeneric(object, "mCachedServerEtag", record.mCachedServerEtag);
    ExtractOptionalPropertyFromObjectGeneric(object, "mCachedServerModDate", record.mCachedServerModDate);
    ExtractOptionalPropertyFromObjectGeneric(object, "mCachedLocalModDate", record.mCachedLocalModDate);
    ExtractOptionalPropertyFromObjectGeneric(object, "mCachedLocalChecksum", record.mCachedLocalChecksum);
    return record;
}

}  // namespace serialization
}  // namespace tolmocore

namespace tolmonetsync {

using tolmocore::filesupport::IPlatformByteStream;
using tolmocore::filesupport::OPlatformByteStream;
namespace json = tolmocore::serialization;

namespace {

// A cache file this large is no file of ours; reading it whole could exhaust memory.
constexpr std::uint64_t kMaxCacheFileSize = 64ull * 1024 * 1024;

// Records are the same file when name, group and media type agree. The key
// joins the three with separators no UTF-8 text holds (0xFF never occurs).
std::string KeyOf(const CachedSyncFile& record)
{
    std::string key = tolmocore::utility::UTF16to8(record.mName).ToStdString();
    key += '\xFF';
    key += tolmocore::utility::UTF16to8(record.mCollectionName).ToStdString();
    key += '\xFF';
    key.append(record.mMimeType.c_str(), record.mMimeType.size());
    return key;
}

std::vector<CachedSyncFile> ReadCacheFile(const File& cacheFile)
{
    std::vector<CachedSyncFile> parsed;
    if (!cacheFile.Exists()) return parsed;
    IPlatformByteStream in(cacheFile, 1);
    const std::uint64_t length = in.Length();
    if (length == 0) return parsed;
    if (length > kMaxCacheFileSize) throw std::runtime_error("the cache file is too large to be ours");
    // One more byte, zero, so that the text ends in a NUL.
    UTF8String text(static_cast<std::size_t>(length) + 1, 0);
    in.ReadBlock(&text[0], static_cast<unsigned int>(length));
    if (ReadCacheEntries(text, parsed)) return parsed;
    boost::any tree = json::JSONParse(text);
    text = UTF8String();
    // Each entry's subtree goes as soon as it is converted: the tree is many
    // times the size of the records, and the two never need to be whole at once.
    json::JSONArray& entries = boost::any_cast<json::JSONArray&>(tree);
    parsed.reserve(entries.size());
    for (boost::shared_ptr<boost::any>& entry : entries) {
        parsed.push_back(json::JSONConvert<CachedSyncFile>::FromJSON(entry ? *entry : boost::any()));
        entry.reset();
    }
    return parsed;
}

// The same bytes as printing the whole list as one tree, one record at a
// time: the tree of 10,000 records was the largest thing a pass held.
void WriteRecords(OPlatformByteStream& out, const std::vector<CachedSyncFile>& records)
{
    constexpr std::size_t kChunk = 64 * 1024;
    UTF8String text("[");
    for (std::size_t index = 0; index < records.size(); ++index) {
        if (index > 0) text.append(",", 1);
        text += json::GetJSONUTF8String(json::JSONConvert<CachedSyncFile>::ToJSON(records[index]), false);
        if (text.size() < kChunk) continue;
        out.WriteBlock(text.data(), static_cast<unsigned int>(text.size()));
        text.clear();
    }
    text.append("]", 1);
    out.WriteBlock(text.data(), static_cast<unsigned int>(text.size()));
}

}  // namespace

File SyncCache::GetCache()
{
    return File(Dir::PrefDir(), u"tolmonetsynccache.json");
}

void SyncCache::LoadCache()
{
    try {
        for (CachedSyncFile& record : mFiles) {
            record.FreshenModDate();
            if (const boost::shared_ptr<Item> item = GetItem(record)) record.mServerModDate = item->mModified;
        }

        const std::vector<CachedSyncFile> parsed = ReadCacheFile(GetCache());
        std::unordered_map<std::string, const CachedSyncFile*> firstOfKey;
        for (const CachedSyncFile& entry : parsed) firstOfKey.emplace(KeyOf(entry), &entry);

        for (CachedSyncFile& record : mFiles) {
            auto found = firstOfKey.find(KeyOf(record));
            // A record whose file is gone stays blank: its download is unconditional.
            if (found == firstOfKey.end() || !record.mFile.Exists()) continue;
            const CachedSyncFile& kept = *found->second;
            record.mCachedServerEtag = kept.mCachedServerEtag;
            record.mCachedServerModDate = kept.mCachedServerModDate;
            record.mCachedLocalModDate = kept.mCachedLocalModDate;
            record.mCachedLocalChecksum = kept.mCachedLocalChecksum;
        }
    } catch (const std::exception& e) {
        TOLMO_TRACE("tolmonetsync", 1, "LoadCache error: " << e.what());
    }
}

void SyncCache::NoteSwap(const File& file)
{
    mSwappedDirs.insert(file.Parent().FullPath());
}

void SyncCache::SaveCache()
{
    // The cache file vouches for each swapped file: its rename must be on the
    // disk first. One sync per directory covers every swap of the pass.
    while (!mSwappedDirs.empty()) {
        Dir(*mSwappedDirs.begin()).Sync();
        mSwappedDirs.erase(mSwappedDirs.begin());
    }
    for (CachedSyncFile& record : mFiles) {
        record.mCachedLocalModDate = record.mLocalModDate;
        record.mCachedLocalChecksum = record.mLocalChecksum;
    }
    File cacheFile = GetCache();
    cacheFile.Create(false);
    // The stream replaces the file whole when it closes: a crash leaves the
    // old file or the new one, never a torn one. Private, and a link planted
    // at its name is replaced, not written through.
    OPlatformByteStream out(cacheFile, 1, 0600);
    WriteRecords(out, mFiles);
    out.Close();
    // Whom the records are about, for the next run to compare.
    if (GetApi()) WriteCacheFingerprint(FingerprintOf(*GetApi()));
}

std::set<std::size_t> SyncCache::RecordsDeletedLocally() const
{
    std::set<std::size_t> deleted;
    try {
        std::unordered_set<std::string> kept;
        for (const CachedSyncFile& entry : ReadCacheFile(GetCache())) kept.insert(KeyOf(entry));
        for (std::size_t index = 0; index < mFiles.size(); ++index)
            if (kept.count(KeyOf(mFiles[index])) > 0 && !mFiles[index].mFile.Exists()) deleted.insert(index);
    } catch (const std::exception& e) {
        TOLMO_TRACE("tolmonetsync", 1, "cache file unreadable: " << e.what());
    }
    return deleted;
}

}  // namespace tolmonetsync
