#pragma once
// Assets as the client holds them: collections (folders) and items (files),
// owned through boost::shared_ptr. Only the JSON reader makes them.
//
// Fields do not change after the reader returns, except mChildren (guarded by
// ChildrenMutex) and the mId/mEtag of an asset a follow-up request has just
// read, before it is handed to anybody.

#include <cstdint>
#include <ostream>
#include <vector>

#include <boost/date_time/posix_time/posix_time_types.hpp>
#include <boost/shared_ptr.hpp>

#include "assets/CollectionType.h"
#include "foundation/core/Strings.h"

namespace tolmonetsync {

class AssetBase {
public:
    virtual bool is_collection() const { return false; }
    virtual bool is_root() const { return false; }

    // "/collections/<id>" for a collection, "/assets/<id>" for an item.
    UTF8String GetURI() const;

    UTF8String mId;    // the last segment of the asset's URL
    UTF8String mEtag;  // set only by a finished upload
    UTF16String mName;
    boost::posix_time::ptime mCreated;
    boost::posix_time::ptime mModified;

protected:
    // Assets are deleted through shared pointers made from their concrete type.
    ~AssetBase() = default;
};

class Collection final : public AssetBase {
public:
    bool is_collection() const override { return true; }
    bool is_root() const override { return mType == kCollectionType_Root; }

    CollectionType mType = kCollectionType_Collection;
    // The members known to this client. Change and overlapping reads only with
    // ChildrenMutex() held; a delete does not take anything out.
    std::vector<boost::shared_ptr<AssetBase> > mChildren;
};

class Item final : public AssetBase {
public:
    UTF8String mContentType;
    bool mShareable = false;
    bool mShared = false;
    std::int64_t mSize = -1;  // -1: the service gave no size
    double mAspectRatio = 0.0;
};

// One line for trace text; the pointer must not be null.
std::ostream& operator<<(std::ostream& stream, const boost::shared_ptr<AssetBase>& asset);
std::ostream& operator<<(std::ostream& stream, const boost::shared_ptr<Collection>& collection);
std::ostream& operator<<(std::ostream& stream, const boost::shared_ptr<Item>& item);

}  // namespace tolmonetsync
