#include "assets/SearchQuery.h"

namespace tolmonetsync {

SearchQuery::SearchQuery() : SearchQuery(kCollectionType_None, UTF16String()) {}

SearchQuery::SearchQuery(CollectionType type, const UTF16String& name) : mType(type), mName(name)
{
    mTrashed.mModifier = kSearchModifier_NotEqual;
    mTrashed.mValue = true;
}

SearchQuery::SearchQuery(const boost::shared_ptr<Collection>& collection, const UTF16String& name)
    : SearchQuery(kCollectionType_None, name)
{
    AddScope(collection);
}

void SearchQuery::AddScope(const boost::shared_ptr<Collection>& collection)
{
    mScopes.push_back(UTF8String("/collections/") + collection->mId);
}

}  // namespace tolmonetsync
