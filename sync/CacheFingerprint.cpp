#include "sync/CacheFingerprint.h"

#include "foundation/core/ByteStreams.h"
#include "foundation/core/Trace.h"
#include "foundation/json/JSON.h"
#include "sync/SyncCache.h"

namespace tolmonetsync {

using tolmocore::filesupport::IPlatformByteStream;
using tolmocore::filesupport::OPlatformByteStream;
namespace json = tolmocore::serialization;

namespace {

// A fingerprint is three short strings; anything larger is no file of ours.
constexpr std::uint64_t kMaxFingerprintSize = 64 * 1024;

std::string StringIn(const json::JSONObject& object, const char* key)
{
    const boost::shared_ptr<boost::any> value = json::GetVariantInObject(object, key);
    return value ? boost::any_cast<const UTF8String&>(*value).ToStdString() : std::string();
}

}  // namespace

CacheFingerprint ReadCacheFingerprint(const File& file)
{
    IPlatformByteStream in(file, 1);
    const std::uint64_t length = in.Length();
    if (length > kMaxFingerprintSize) throw std::runtime_error("the cache fingerprint is too large to be ours");
    UTF8String text(static_cast<std::size_t>(length) + 1, 0);
    if (length > 0) in.ReadBlock(&text[0], static_cast<unsigned int>(length));
    const boost::any parsed = json::JSONParse(text);
    const json::JSONObject& object = boost::any_cast<const json::JSONObject&>(parsed);
    return CacheFingerprint{StringIn(object, "user"), StringIn(object, "root"), StringIn(object, "service")};
}

std::string ForeignOwner(const CacheFingerprint& kept, const CacheFingerprint& ours)
{
    if (!kept.mUser.empty() && !ours.mUser.empty() && kept.mUser != ours.mUser)
        return "user " + kept.mUser + ", not " + ours.mUser;
    if (kept.mRoot != ours.mRoot) return "preferences root " + kept.mRoot + ", not " + ours.mRoot;
    if (kept.mService != ours.mService) return "service " + kept.mService + ", not " + ours.mService;
    return std::string();
}

File CacheFingerprintFile()
{
    return File(Dir::PrefDir(), u"tolmonetsynccache.fingerprint");
}

CacheFingerprint FingerprintOf(const SyncServer& server)
{
    return CacheFingerprint{server.mUserID.ToStdString(), tolmocore::utility::ToNarrow(server.GetPreferencesRootName()),
                            server.mServerURL.ToStdString()};
}

void WriteCacheFingerprint(const CacheFingerprint& fingerprint)
{
    boost::any object = json::JSONObject();
    json::AddToObject(object, "user", boost::any(UTF8String(fingerprint.mUser)));
    json::AddToObject(object, "root", boost::any(UTF8String(fingerprint.mRoot)));
    json::AddToObject(object, "service", boost::any(UTF8String(fingerprint.mService)));
    const UTF8String text = json::GetJSONUTF8String(object, false);
    File file = CacheFingerprintFile();
    file.Create(false);
    OPlatformByteStream out(file, 1, 0600);
    out.WriteBlock(text.data(), static_cast<unsigned int>(text.size()));
    out.Close();
}

std::string ForeignCacheReason(const CacheFingerprint& ours)
{
    try {
        const File file = CacheFingerprintFile();
        if (!SyncCache::GetCache().Exists() || !file.Exists()) return std::string();
        const std::string owner = ForeignOwner(ReadCacheFingerprint(file), ours);
        if (!owner.empty()) return "the cache file was written for " + owner;
    } catch (const std::exception& e) {
        TOLMO_TRACE("tolmonetsync", 1, "cache fingerprint unreadable: " << e.what());
    }
    return std::string();
}

}  // namespace tolmonetsync
