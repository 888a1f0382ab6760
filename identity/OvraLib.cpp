#include "identity/OvraLib.h"

#include <dlfcn.h>

#include <exception>
#include <mutex>

#include "foundation/core/Dir.h"
#include "foundation/core/Trace.h"

namespace tolmonetsync {

std::string sRecommendedOvraPath;

namespace {

using tolmocore::filesupport::Dir;
using tolmocore::filesupport::File;

std::mutex& PathMutex()
{
    static std::mutex* mutex = new std::mutex;  // never destroyed: constructors may run during exit
    return *mutex;
}

std::string LibraryPath()
{
    {
        std::lock_guard<std::mutex> lock(PathMutex());
        if (!sRecommendedOvraPath.empty()) return sRecommendedOvraPath;
    }
    try {
        const File library(Dir(Dir::AppDir(), u"Frameworks"), u"OvraLib.dylib");
        return tolmocore::utility::UTF16to8(library.FullPath()).ToStdString();
    } catch (const std::exception& e) {
        TOLMO_TRACE("OvraConnection", 1, "GetOvraLib: no application directory: " << e.what());
        return std::string();
    }
}

template <typename Function>
void Take(void* library, const char* name, Function& function)
{
    function = reinterpret_cast<Function>(dlsym(library, name));
}

OvraLibWrapper* Load()
{
    OvraLibWrapper* lib = new OvraLibWrapper;
    const std::string path = LibraryPath();
    // dlopen("") would hand back the running program itself.
    if (path.empty()) return lib;
    lib->mLibrary = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (lib->mLibrary == nullptr) {
        const char* reason = dlerror();
        TOLMO_TRACE("OvraConnection", 8, "GetOvraLib: not loaded: " << (reason ? reason : path.c_str()));
        return lib;
    }
    Take(lib->mLibrary, "OVRA_createRef", lib->mCreateRef);
    Take(lib->mLibrary, "OVRA_createRefEx", lib->mCreateRefEx);
    Take(lib->mLibrary, "OVRA_releaseRef", lib->mReleaseRef);
    Take(lib->mLibrary, "OVRA_fetchDefaultUserInfoForClientId", lib->mFetchDefaultUserInfoForClientId);
    Take(lib->mLibrary, "OVRA_fetchAccessToken", lib->mFetchAccessToken);
    Take(lib->mLibrary, "OVRA_fetchContinueToken", lib->mFetchContinueToken);
    Take(lib->mLibrary, "OVRA_getDeviceID", lib->mGetDeviceID);
    Take(lib->mLibrary, "OVRA_revokeDeviceToken", lib->mRevokeDeviceToken);
    Take(lib->mLibrary, "OVRA_fetchAccounts", lib->mFetchAccounts);
    Take(lib->mLibrary, "OVRA_releaseData", lib->mReleaseData);
    Take(lib->mLibrary, "OVRA_fetchIDPResponseForKey", lib->mFetchIDPResponseForKey);
    TOLMO_TRACE("OvraConnection", 8, "GetOvraLib: loaded " << path);
    return lib;
}

}  // namespace

const OvraLibWrapper& GetOvraLib()
{
    // Never destroyed: the library stays loaded, and may call back, until exit.
    static OvraLibWrapper* sLib = nullptr;
    static std::once_flag sOnce;
    std::call_once(sOnce, [] { sLib = Load(); });
    return *sLib;
}

void RecommendOvraPathIfUnset(const std::string& path)
{
    std::lock_guard<std::mutex> lock(PathMutex());
    if (sRecommendedOvraPath.empty()) sRecommendedOvraPath = path;
}

}  // namespace tolmonetsync
