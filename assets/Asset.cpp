#include "assets/Asset.h"

#include <boost/date_time/posix_time/posix_time_io.hpp>

namespace tolmonetsync {

UTF8String AssetBase::GetURI() const
{
    return UTF8String(is_collection() ? "/collections/" : "/assets/") + mId;
}

std::ostream& operator<<(std::ostream& stream, const boost::shared_ptr<AssetBase>& asset)
{
    const UTF8String name = tolmocore::utility::UTF16to8(asset->mName);
    if (asset->is_collection()) {
        const Collection& collection = static_cast<const Collection&>(*asset);
        stream << "Collection(type: " << static_cast<std::int32_t>(collection.mType) << ", id: " << asset->mId;
    } else {
        const Item& item = static_cast<const Item&>(*asset);
        stream << "Item(content-type: " << item.mContentType << ", etag: " << item.mEtag << ", id: " << asset->mId;
    }
    return stream << ", name: '" << name << "'"
                  << ", created: " << asset->mCreated << ", modified: " << asset->mModified << ")";
}

std::ostream& operator<<(std::ostream& stream, const boost::shared_ptr<Collection>& collection)
{
    return stream << boost::shared_ptr<AssetBase>(collection);
}

std::ostream& operator<<(std::ostream& stream, const boost::shared_ptr<Item>& item)
{
    return stream << boost::shared_ptr<AssetBase>(item);
}

}  // namespace tolmonetsync
