#include "assets/CollectionType.h"

namespace tolmonetsync {
namespace tarnvault {
namespace {

const char kRootMediaType[] = "application/vnd.halvane.tarnvault.collection.root";
const char kCollectionMediaType[] = "application/vnd.halvane.tarnvault.collection";
const char kPreferencesMediaType[] = "application/vnd.halvane.tarnvault.collection.preferences";

}  // namespace

UTF8String CollectionTypeToString(CollectionType type)
{
    switch (type) {
    case kCollectionType_Root:
        return UTF8String(kRootMediaType);
    case kCollectionType_Collection:
        return UTF8String(kCollectionMediaType);
    case kCollectionType_Preferences:
        return UTF8String(kPreferencesMediaType);
    default:
        return UTF8String();
    }
}

CollectionType StringToCollectionType(const UTF8String& mediaType)
{
    if (mediaType == kRootMediaType) return kCollectionType_Root;
    if (mediaType == kCollectionMediaType) return kCollectionType_Collection;
    if (mediaType == kPreferencesMediaType) return kCollectionType_Preferences;
    return kCollectionType_None;
}

}  // namespace tarnvault
}  // namespace tolmonetsync
