// The client object: its configuration and its ownership, and the service and
// cache types that hold it.

#include <stdexcept>

#include <boost/algorithm/string/classification.hpp>
#include <boost/algorithm/string/split.hpp>
#include <boost/bind/bind.hpp>
#include <boost/thread/lock_guard.hpp>

#include "assets/ChildrenMutex.h"
#include "foundation/net/HeaderConstants.h"
#include "tarnvault/TarnvaultPrivate.h"

namespace tolmonetsync {
namespace tarnvault {

namespace {

bool IsForm(const UTF8String& value, const char* form)
{
    return value == form;
}

}  // namespace

Tarnvault::Tarnvault(const ParameterList& parameters)
{
    bool autoLogin = false;
    for (const auto& parameter : parameters) {
        const ImmutableString& key = parameter.first;
        const UTF8String& value = parameter.second;
        if (key.IsSameAs(tolmonet::kHEADER_LOCATION)) {
            mServerURL = value;
        } else if (key.IsSameAs(tolmonet::kHEADER_COOKIE)) {
            mAccessToken = value;
        } else if (key.IsSameAs(tolmonet::kHEADER_USER_AGENT)) {
            mClientID = value;
        } else if (key.IsSameAs(tolmonet::kHEADER_SET_COOKIE)) {
            autoLogin = IsForm(value, "auto");
        } else if (key.IsSameAs(tolmonet::kHEADER_CACHECONTROL) && IsForm(value, "migrate-major")) {
            mMigrateMajor = true;
        } else if (key.IsSameAs(tolmonet::kHEADER_CACHECONTROL) && IsForm(value, "migrate-previous-major")) {
            mMigratePreviousMajor = true;
        } else {
            TOLMO_TRACE("Tarnvault", 1, "Unknown form parameter: " << key);
        }
    }
    if (mServerURL.empty()) mServerURL = kProduction.ToUTF8String();
    mAutoLogin = autoLogin;
    mProcessor.reset(new TarnvaultProcessor(GetGlobalSyncProcessor(), &mAccessToken));
    if (autoLogin && mAccessToken.empty()) EnvironmentLogin();
}

Tarnvault::~Tarnvault()
{
    // The root first and the processor before the token it points at.
    mRootCollection.reset();
    mProcessor.reset();
}

UTF8String Tarnvault::GetUIDFromLocation(const boost::shared_ptr<tolmonet::Response>& response)
{
    const std::string location = LastHeader(response, tolmonet::kHEADER_LOCATION).ToStdString();
    std::vector<std::string> pieces;
    boost::algorithm::split(pieces, location, boost::algorithm::is_any_of("/"));
    if (pieces.size() < 3) return UTF8String();
    return UTF8String(pieces.back());
}

boost::shared_ptr<Collection> Tarnvault::CachedRoot() const
{
    boost::lock_guard<boost::recursive_mutex> lock(ChildrenMutex());
    return mRootCollection;
}

SyncTarnvault::SyncTarnvault(const ParameterList& parameters)
    : SyncFilesService(parameters), mApi(boost::shared_ptr<Tarnvault>(new Tarnvault(parameters)))
{
}

SyncTarnvault::~SyncTarnvault() = default;

boost::shared_ptr<SyncFilesService> SyncTarnvault::CreateTarnvaultHelper(const ParameterList& parameters)
{
    return boost::shared_ptr<SyncFilesService>(new SyncTarnvault(parameters));
}

const boost::shared_ptr<SyncServer>& SyncTarnvault::GetApi() const
{
    return mApi;
}

SyncServiceType SyncTarnvault::GetType() const
{
    return SyncServiceType_Tarnvault;
}

boost::shared_ptr<SyncCache> SyncTarnvault::CreateCache(const std::vector<SyncFile>& files,
                                                        const std::vector<SyncDir>& dirs,
                                                        const ProgressCallback& progress,
                                                        const ItemToFileCallback& itemToFile)
{
    return boost::shared_ptr<SyncCache>(new TarnvaultCache(files, dirs, progress, itemToFile, mApi));
}

TarnvaultCache::TarnvaultCache(const std::vector<SyncFile>& files, const std::vector<SyncDir>& dirs,
                               const ProgressCallback& progress, const ItemToFileCallback& itemToFile,
                               const boost::shared_ptr<SyncServer>& api)
    : SyncCache(files, dirs, progress, itemToFile), mApi(api)
{
}

TarnvaultCache::~TarnvaultCache() = default;

const boost::shared_ptr<SyncServer>& TarnvaultCache::GetApi() const
{
    return mApi;
}

}  // namespace tarnvault

boost::shared_ptr<SyncFilesService> CreateSyncFilesService(SyncServiceType type, const ParameterList& parameters)
{
    if (type != SyncServiceType_Tarnvault) throw std::runtime_error("Unimplemented");
    return tarnvault::SyncTarnvault::CreateTarnvaultHelper(parameters);
}

}  // namespace tolmonetsync
