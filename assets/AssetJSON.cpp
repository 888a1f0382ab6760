#include "assets/AssetJSON.h"

#include <cstdlib>
#include <stdexcept>


#include "foundation/json/JSON.h"

namespace tolmocore {
namespace serialization {

using namespace tolmonetsync;

namespace {

void EraseAll(UTF8String& text, const char* pattern)
{
    const UTF8String needle(pattern);
    for (std::size_t at = text.find(needle); at != UTF8String::npos; at = text.find(needle, at))
        text.erase(at, needle.size());
}

void ReadItemFields(const JSONObject& object, Item& item)
{
    ExtractOptionalPropertyFromObjectGeneric(object, "shareable", item.mShareable);
    ExtractOptionalPropertyFromObjectGeneric(object, "shared", item.mShared);
    if (ObjectHasProperty(object, "size", false)) {
        try {
            item.mSize = ExtractPropertyFromObject<long long>(object, "size");
        } catch (const std::exception&) {
            // Some answers carry the size as text; no leading digits reads as 0.
            const UTF8String text = ExtractPropertyFromObject<UTF8String>(object, "size");
            item.mSize = std::strtoll(text.Chars(), nullptr, 10);
        }
    }
    ExtractOptionalPropertyFromObjectGeneric(object, "aspect_ratio", item.mAspectRatio);
}

}  // namespace

boost::shared_ptr<AssetBase> JSONConvert<boost::shared_ptr<AssetBase> >::FromJSON(const boost::any& value)
{
    const JSONObject& object = boost::any_cast<const JSONObject&>(value);
    const boost::posix_time::ptime modified = parse_iso8601_time(object, "modified");
    const boost::posix_time::ptime created = parse_iso8601_time(object, "created");
    UTF8String id;
    UTF16String name;
    ExtractOptionalPropertyFromObjectGeneric(object, "id", id);
    ExtractOptionalPropertyFromObjectGeneric(object, "name", name);
    if (id.empty()) ExtractOptionalPropertyFromObjectGeneric(object, "url", id);
    const UTF8String type = ExtractPropertyFromObject<UTF8String>(object, "type");

    auto fill = [&](AssetBase& asset) {
        asset.mId = id;
        asset.mName = name;
        asset.mCreated = created;
        asset.mModified = modified;
    };
    const CollectionType collectionType = tarnvault::StringToCollectionType(type);
    if (collectionType != kCollectionType_None) {
        boost::shared_ptr<Collection> collection(new Collection);
        EraseAll(id, "/api/collections/");
        EraseAll(id, "/collections/");
        fill(*collection);
        collection->mType = collectionType;
        return collection;
    }
    boost::shared_ptr<Item> item(new Item);
    EraseAll(id, "/assets/");
    fill(*item);
    item->mContentType = type;
    ReadItemFields(object, *item);
    return item;
}

std::vector<boost::shared_ptr<AssetBase> > JSONConvert<std::vector<boost::shared_ptr<AssetBase> > >::FromJSON(
    const boost::any& value)
{
    std::vector<boost::shared_ptr<AssetBase> > assets;
    JSONConvertStdVector<boost::shared_ptr<AssetBase> >::FromJSON(value, assets);
    return assets;
}

boost::any JSONConvert<SearchCriteria>::ToJSON(const SearchCriteria& criteria)
{
    switch (criteria.mModifier) {
    case kSearchModifier_Equal:
        return boost::any(criteria.mValue);
    case kSearchModifier_NotEqual: {
        boost::any object = JSONObject();
        AddToObject(object, "$ne", boost::any(criteria.mValue));
        return object;
    }
    case kSearchModifier_Contains: {
        boost::any object = JSONObject();
        AddToObject(object, "$contains", boost::any(criteria.mValue));
        return object;
    }
    default:
        throw std::runtime_error("SearchCriteria Modifier error");
    }
}

boost::any JSONConvert<SearchQuery>::ToJSON(const SearchQuery& query)
{
    boost::any object = JSONObject();
    const UTF8String type = tarnvault::CollectionTypeToString(query.mType);
    if (!type.empty()) AddToObjectGeneric(object, "type", type);
    if (query.mTrashed.mModifier != kSearchModifier_None)
        AddToObject(object, "trashed", JSONConvert<SearchCriteria>::ToJSON(query.mTrashed));
    if (!query.mName.empty()) AddToObjectGeneric(object, "name", query.mName);
    return object;
}

}  // namespace serialization
}  // namespace tolmocore
