#include "identity/dialogs/MerrowLoginExtensionInfo.h"

#include <mutex>

namespace tolmonetsync {

namespace {

// The host may set it from another thread than the one a dialog reads it on.
std::mutex sMerrowLoginExtensionInfoMutex;
MerrowLoginExtensionInfo sMerrowLoginExtensionInfo;

}  // namespace

void SetMerrowLoginExtensionInfo(MerrowLoginExtensionInfo& info)
{
    std::lock_guard<std::mutex> lock(sMerrowLoginExtensionInfoMutex);
    sMerrowLoginExtensionInfo.mViewGetter = info.mViewGetter;
    sMerrowLoginExtensionInfo.mSizeGetter = info.mSizeGetter;
}

MerrowLoginExtensionInfo GetMerrowLoginExtensionInfo()
{
    std::lock_guard<std::mutex> lock(sMerrowLoginExtensionInfoMutex);
    return sMerrowLoginExtensionInfo;
}

}  // namespace tolmonetsync
