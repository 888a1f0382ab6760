#pragma once
// The kinds of collection, and the media types the service tells them by.

#include <cstdint>

#include "foundation/core/Strings.h"

namespace tolmonetsync {

enum CollectionType : std::int32_t {
    kCollectionType_None = 0,         // no media type; every unknown one maps here
    kCollectionType_Root = 1,
    kCollectionType_Collection = 2,
    kCollectionType_Preferences = 3,
};

namespace tarnvault {

// The media type of a kind; empty for kCollectionType_None and unknown values.
UTF8String CollectionTypeToString(CollectionType type);
// The kind whose media type equals the text byte for byte; kCollectionType_None
// otherwise (the text is then an item's content type).
CollectionType StringToCollectionType(const UTF8String& mediaType);

}  // namespace tarnvault
}  // namespace tolmonetsync
