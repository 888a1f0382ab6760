// Preferences of an earlier host version, copied into the new version's
// preferences root when the host asked for it. Best effort once the new
// root exists: the caller then gets the new root, full or empty.

#include <cstdio>
#include <sstream>

#include <boost/algorithm/string/classification.hpp>
#include <boost/algorithm/string/split.hpp>
#include <boost/bind/bind.hpp>

#include "foundation/core/HostConfig.h"
#include "foundation/net/QuoteURL.h"
#include "tarnvault/TarnvaultPrivate.h"

namespace tolmonetsync {
namespace tarnvault {

using boost::placeholders::_1;
using boost::placeholders::_2;
using tolmocore::utility::ToNarrow;
using tolmocore::utility::ToUTF16;

namespace {

struct VersionParts {
    bool mValid = false;  // exactly two parts
    std::string mMajorText;
    long long mMajor = 0;
    long long mMinor = 0;
};

VersionParts Split(const UTF16String& version)
{
    std::vector<std::string> parts;
    const std::string text = ToNarrow(version);
    boost::algorithm::split(parts, text, boost::algorithm::is_any_of("."));
    VersionParts result;
    if (parts.size() != 2) return result;
    result.mValid = true;
    result.mMajorText = parts[0];
    std::istringstream(parts[0]) >> result.mMajor;
    std::istringstream(parts[1]) >> result.mMinor;
    return result;
}

std::string Number(long long value)
{
    char text[32];
    std::snprintf(text, sizeof text, "%lli", value);
    return text;
}

UTF16String getPreviousMinorVersion(const UTF16String& version)
{
    const VersionParts parts = Split(version);
    if (!parts.mValid || parts.mMinor <= 0) return UTF16String();
    return ToUTF16(parts.mMajorText + "." + Number(parts.mMinor - 1));
}

UTF16String getPreviousMajorMinorVersion(const UTF16String& version, bool& crossedMajor)
{
    crossedMajor = false;
    const VersionParts parts = Split(version);
    if (!parts.mValid) return UTF16String();
    if (parts.mMinor > 0) return ToUTF16(parts.mMajorText + "." + Number(parts.mMinor - 1));
    if (parts.mMajor < 1) return UTF16String();
    crossedMajor = true;
    return ToUTF16(Number(parts.mMajor - 1) + ".5");
}

UTF16String _HandleMigrationPref_Rename(const UTF16String& previousVersion, const boost::shared_ptr<AssetBase>& asset)
{
    UTF16String name = asset->mName;
    const UTF16String& current = tolmocore::config::GetClientInternalVersion();
    if (previousVersion.empty()) return name;
    for (std::size_t at = name.find(previousVersion); at != UTF16String::npos;
         at = name.find(previousVersion, at + current.size()))
        name.replace(at, previousVersion.size(), current);
    return name;
}

void _HandleMigrationPref_IgnoreErrors(const CollectionCallback& success,
                                       const boost::shared_ptr<Collection>& newPrefRoot, const Guid& guid)
{
    success(guid, newPrefRoot);
}

void _HandleMigrationPref_GetPrefRoot(const boost::weak_ptr<Tarnvault>& self, const UTF16String& previousVersion,
                                      const boost::shared_ptr<Collection>&,
                                      const boost::shared_ptr<Collection>& newPrefRoot,
                                      const CollectionCallback& success, const Guid& guid,
                                      const std::vector<boost::shared_ptr<AssetBase> >& assets)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    if (assets.empty()) {
        success(guid, newPrefRoot);
        return;
    }
    if (!assets.front()->is_collection() || assets.size() >= 2) {
        TOLMO_TRACE("Tarnvault", 1, "Warning: migration failed with Too many PreferencesRoot");
        success(guid, newPrefRoot);
        return;
    }
    const boost::shared_ptr<Collection> oldRoot = boost::static_pointer_cast<Collection>(assets.front());
    TOLMO_TRACE("Tarnvault", 8, "Starting migration from " << oldRoot << " to " << newPrefRoot);
    const Tarnvault::MigrationStartedCallback started = client->GetMigrationStartedCallback();
    if (started) started(previousVersion, oldRoot->mName);
    const SuccessCallback deliver = boost::bind(&_HandleMigrationPref_IgnoreErrors, success, newPrefRoot, _1);
    const Guid sent =
        client->CopyAsync(deliver, boost::bind(&_HandleMigrationPref_IgnoreErrors, success, newPrefRoot, _1), oldRoot,
                          newPrefRoot, guid, boost::bind(&_HandleMigrationPref_Rename, previousVersion, _1));
    if (sent.IsNil()) success(guid, newPrefRoot);
}

void _HandleMigrationPref(const boost::weak_ptr<Tarnvault>& self, const UTF16String& previousVersion,
                          const boost::shared_ptr<Collection>& searchRoot, const CollectionCallback& success,
                          const Guid& guid, const boost::shared_ptr<Collection>& newPrefRoot)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    using namespace tolmocore::config;
    const UTF16String oldName = GetCompanyName() + u"_" + GetClientName() + u"_" + previousVersion;
    const SearchQuery query(searchRoot, oldName);
    const ErrorCallback ignore = boost::bind(&_HandleMigrationPref_IgnoreErrors, success, newPrefRoot, _1);
    const Guid sent = client->SearchAsync(boost::bind(&_HandleMigrationPref_GetPrefRoot, client, previousVersion,
                                                      searchRoot, newPrefRoot, success, _1, _2),
                                          ignore, query, guid);
    if (sent.IsNil()) ignore(guid, MakeErrorResponse(ToUTF16("_HandleMigrationPref failed")));
}

void _HandleMigrationPref_GetRootForCinderalOldClientID(const boost::weak_ptr<Tarnvault>& self,
                                                        const UTF16String& previousVersion,
                                                        const boost::shared_ptr<Collection>&,
                                                        const CollectionCallback& success, const ErrorCallback& error,
                                                        const Guid& guid,
                                                        const boost::shared_ptr<Collection>& newPrefRoot)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    // A failure here is the caller's: the old root of those versions must exist.
    const Guid sent = client->GetRootForCinderalOldClientIDAsync(
        boost::bind(&_HandleMigrationPref, client, previousVersion, _2, success, _1, newPrefRoot), error, guid);
    if (sent.IsNil())
        error(guid, MakeErrorResponse(ToUTF16("Could not migrate preferences, problem finding prefs root.")));
}

}  // namespace

bool DecideMigration(const boost::shared_ptr<Tarnvault>& client, const boost::shared_ptr<Collection>& root,
                     const CollectionCallback& success, const ErrorCallback& error, const Guid& guid,
                     CollectionCallback& next)
{
    const bool major = client->mMigrateMajor;
    const bool previousMajor = client->mMigratePreviousMajor;
    if (!major && !previousMajor) return true;
    const UTF16String& version = tolmocore::config::GetClientInternalVersion();
    UTF16String previousVersion;
    if (major && !previousMajor) {
        previousVersion = getPreviousMinorVersion(version);
    } else if (major) {
        // Crossing a major version would clear P; both are cleared below anyway.
        bool crossedMajor = false;
        previousVersion = getPreviousMajorMinorVersion(version, crossedMajor);
    } else {
        const VersionParts parts = Split(version);
        if (parts.mValid && parts.mMajor > 0) previousVersion = ToUTF16(Number(parts.mMajor - 1) + ".0");
    }
    if (previousVersion.empty()) {
        error(guid, MakeErrorResponse(ToUTF16("Could not migrate preferences, problem with client version")));
        return false;
    }
    const bool oldClientID = tolmocore::config::GetClientName() == UTF16String(u"Cinderal") &&
                             tolmocore::utility::StringToNumber(previousVersion, 1) <= 8.0;
    if (oldClientID)
        next = boost::bind(&_HandleMigrationPref_GetRootForCinderalOldClientID, client, previousVersion, root, success,
                           error, _1, _2);
    else
        next = boost::bind(&_HandleMigrationPref, client, previousVersion, root, success, _1, _2);
    // Cleared before the new root is made: whatever becomes of this attempt,
    // this object does not migrate again.
    client->mMigrateMajor = false;
    client->mMigratePreviousMajor = false;
    return true;
}

void Tarnvault::SetMigrationStartedCallback(const MigrationStartedCallback& callback)
{
    std::lock_guard<std::mutex> lock(mMigrationStartedMutex);
    mMigrationStarted = callback;
}

Tarnvault::MigrationStartedCallback Tarnvault::GetMigrationStartedCallback() const
{
    std::lock_guard<std::mutex> lock(mMigrationStartedMutex);
    return mMigrationStarted;
}

Guid Tarnvault::GetRootForCinderalOldClientIDAsync(const CollectionCallback& success, const ErrorCallback& error,
                                                   const Guid& requestUID)
{
    static const ImmutableString kCinderalClientIDForPellucid =
        ImmutableString::CreateStatic("5d26c4f8-0ae1-47b3-9c15-c3e7b0926d41");
    tolmonet::FormList pairs;
    pairs.push_back(std::make_pair(kName, kCinderalClientIDForPellucid.ToUTF8String()));
    const UTF8String url = mServerURL + "/collections?" + tolmonet::QuoteURL(pairs);
    TOLMO_TRACE("Tarnvault", 8,
                "GetRoot"
                    << ", name: <obfuscated>"
                    << ", url: " << RedactedForTrace(url) << ", requestUID: " << requestUID);
    const tolmonet::http::ResponseHandler handler =
        boost::bind(&Tarnvault::_HandleGetRoot, shared_from_this(), success, error, false, _1, _2);
    const bool taken = mProcessor->GET(requestUID, handler, ImmutableString::CreateDynamic(url), tolmonet::HeaderList(),
                                       tolmonet::Configuration());
    return Sent(taken, requestUID);
}

}  // namespace tarnvault
}  // namespace tolmonetsync
