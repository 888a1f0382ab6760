// The in-memory service's tree answering requests. Staging, reading and
// the clock are in InMemoryTreeStaging.cpp.

#include "support/InMemoryTree.h"

#include <algorithm>
#include <cctype>
#include <set>
#include <stdexcept>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "assets/CollectionType.h"
#include "foundation/core/Guid.h"

namespace testsupport {

using namespace tolmonetsync;
using boost::posix_time::ptime;

namespace {

const char kScopePrefix[] = "/collections/";

InMemoryAnswer Failure(tolmonet::StatusCode status, const std::string& text)
{
    InMemoryAnswer answer;
    answer.mStatus = status;
    answer.mError = text;
    return answer;
}

// Opaque, URL-safe and never reused, like the ids of a real service.
UTF8String NewId()
{
    std::string text;
    for (char c : Guid::CreateUnique().AsStdString()) {
        if (c != '-') text += static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    }
    return UTF8String(text);
}

std::string Quoted(const UTF8String& id)
{
    return "'" + id.ToStdString() + "'";
}

bool MatchesTrashed(const SearchCriteria& criterion, bool trashed)
{
    switch (criterion.mModifier) {
        case kSearchModifier_None:
            return true;
        case kSearchModifier_Equal:
        case kSearchModifier_Contains:
            return trashed == criterion.mValue;
        case kSearchModifier_NotEqual:
            return trashed != criterion.mValue;
    }
    return false;
}

}  // namespace

InMemoryTree::InMemoryTree()
{
    std::lock_guard<std::mutex> lock(mMutex);
    Node& root = NewNode(true, u"root");
    root.mType = kCollectionType_Root;
    mUserRoot = root.mId;
}

// --- Requests ---

InMemoryAnswer InMemoryTree::GetClientRoot(const UTF8String& clientID)
{
    std::lock_guard<std::mutex> lock(mMutex);
    auto found = mClientRoots.find(clientID);
    if (found == mClientRoots.end()) {
        Node& root = NewNode(true, tolmocore::utility::UTF8to16(clientID));
        root.mType = kCollectionType_Root;
        root.mClientRoot = true;
        found = mClientRoots.emplace(clientID, root.mId).first;
    }
    InMemoryAnswer answer;
    answer.mAssets.push_back(Copy(NodeOf(found->second)));
    return answer;
}

InMemoryAnswer InMemoryTree::Search(CollectionType type, const UTF16String& name, const SearchCriteria& trashed,
                                    const std::vector<UTF8String>& scopes)
{
    std::lock_guard<std::mutex> lock(mMutex);
    if (trashed.mModifier < kSearchModifier_None || trashed.mModifier > kSearchModifier_Contains) {
        return Failure(400, "bad criterion on trashed");
    }
    std::vector<const Node*> candidates;
    if (scopes.empty()) {
        for (const auto& entry : mNodes) {
            if (!entry.second.mClientRoot) candidates.push_back(&entry.second);
        }
        std::sort(candidates.begin(), candidates.end(),
                  [](const Node* a, const Node* b) { return a->mSequence < b->mSequence; });
    } else {
        std::set<UTF8String> seen;
        for (const UTF8String& scope : scopes) {
            const std::string text = scope.ToStdString();
            if (text.compare(0, sizeof(kScopePrefix) - 1, kScopePrefix) != 0) {
                return Failure(400, "bad scope " + text);
            }
            const Node* collection = Find(UTF8String(text.substr(sizeof(kScopePrefix) - 1)));
            if (!collection || !collection->mCollection) return Failure(404, "no collection for scope " + text);
            for (const UTF8String& member : collection->mMembers) {
                if (seen.insert(member).second) candidates.push_back(&NodeOf(member));
            }
        }
    }
    InMemoryAnswer answer;
    for (const Node* node : candidates) {
        if (type != kCollectionType_None && (!node->mCollection || node->mType != type)) continue;
        if (!name.empty() && node->mName != name) continue;
        if (!MatchesTrashed(trashed, node->mTrashed)) continue;
        answer.mAssets.push_back(Copy(*node));
    }
    return answer;
}

InMemoryAnswer InMemoryTree::Header(const UTF8String& id)
{
    std::lock_guard<std::mutex> lock(mMutex);
    const Node* node = Find(id);
    if (!node) return Failure(404, "no asset " + Quoted(id));
    InMemoryAnswer answer;
    answer.mAssets.push_back(Copy(*node));
    return answer;
}

InMemoryAnswer InMemoryTree::CreateCollection(const UTF16String& name, CollectionType type)
{
    std::lock_guard<std::mutex> lock(mMutex);
    if (type != kCollectionType_Collection && type != kCollectionType_Preferences) {
        return Failure(400, "cannot create a collection of kind " + std::to_string(type));
    }
    Node& node = NewNode(true, name);
    node.mType = type;
    InMemoryAnswer answer;
    answer.mStatus = 201;
    answer.mId = node.mId;
    return answer;
}

InMemoryAnswer InMemoryTree::Add(const UTF8String& collectionId, const UTF8String& assetId)
{
    std::lock_guard<std::mutex> lock(mMutex);
    Node* collection = Find(collectionId);
    if (!collection || !collection->mCollection) return Failure(404, "no collection " + Quoted(collectionId));
    const Node* asset = Find(assetId);
    if (!asset) return Failure(404, "no asset " + Quoted(assetId));
    if (assetId == collectionId || (asset->mCollection && Contains(*asset, collectionId))) {
        return Failure(409, "a collection cannot be inside itself");
    }
    std::vector<UTF8String>& members = collection->mMembers;
    if (std::find(members.begin(), members.end(), assetId) == members.end()) members.push_back(assetId);
    return InMemoryAnswer();
}

InMemoryAnswer InMemoryTree::Delete(const UTF8String& id, bool recursive)
{
    std::lock_guard<std::mutex> lock(mMutex);
    return DeleteLocked(id, recursive);
}

InMemoryAnswer InMemoryTree::Upload(const UTF8String& collectionId, const UTF16String& name,
                                    const UTF8String& contentType, const std::string& bytes)
{
    std::lock_guard<std::mutex> lock(mMutex);
    Node* collection = Find(collectionId);
    if (!collection || !collection->mCollection) return Failure(404, "no collection " + Quoted(collectionId));
    // A collection's media type would make the new asset read back as a
    // collection: refused, so no client ever meets an "item" of that kind.
    if (tarnvault::StringToCollectionType(contentType) != kCollectionType_None) {
        return Failure(400, "a collection's media type is no content type");
    }
    Node& item = NewNode(false, name);
    item.mContentType = contentType.empty() ? UTF8String("application/octet-stream") : contentType;
    item.mModified = item.mCreated;
    item.mBytes.reset(new std::string(bytes));
    item.mEtag = UTF8String("\"") + UTF8String(std::to_string(mNextEtag++)) + "\"";
    collection->mMembers.push_back(item.mId);  // a map insertion moves no node
    InMemoryAnswer answer;
    answer.mStatus = 201;
    answer.mId = item.mId;
    answer.mEtag = item.mEtag;
    return answer;
}

InMemoryAnswer InMemoryTree::Download(const UTF8String& id, const UTF8String& etag)
{
    std::lock_guard<std::mutex> lock(mMutex);
    const Node* item = Find(id);
    if (!item || item->mCollection) return Failure(404, "no item " + Quoted(id));
    InMemoryAnswer answer;
    if (!etag.empty() && etag == item->mEtag) {
        answer.mStatus = 304;
        return answer;
    }
    answer.mBytes = item->mBytes;
    answer.mEtag = item->mEtag;
    answer.mContentType = item->mContentType;
    answer.mModified = item->mModified;
    return answer;
}

// --- Private, with mMutex held ---

ptime InMemoryTree::Stamp()
{
    ptime now = mClockHeld ? mClock : boost::posix_time::microsec_clock::universal_time();
    if (!mLastStamp.is_not_a_date_time() && now <= mLastStamp) now = mLastStamp + boost::posix_time::microseconds(1);
    mLastStamp = now;
    return now;
}

InMemoryTree::Node& InMemoryTree::NewNode(bool collection, const UTF16String& name)
{
    Node node;
    node.mId = NewId();
    node.mCollection = collection;
    node.mType = collection ? kCollectionType_Collection : kCollectionType_None;
    node.mName = name;
    node.mCreated = Stamp();
    node.mModified = node.mCreated;
    node.mSequence = mNextSequence++;
    const UTF8String id = node.mId;
    return mNodes.emplace(id, std::move(node)).first->second;
}

const InMemoryTree::Node* InMemoryTree::Find(const UTF8String& id) const
{
    auto found = mNodes.find(id);
    return found == mNodes.end() ? nullptr : &found->second;
}

InMemoryTree::Node* InMemoryTree::Find(const UTF8String& id)
{
    auto found = mNodes.find(id);
    return found == mNodes.end() ? nullptr : &found->second;
}

const InMemoryTree::Node& InMemoryTree::NodeOf(const UTF8String& id) const
{
    const Node* node = Find(id);
    if (!node) throw std::invalid_argument("no asset " + Quoted(id));
    return *node;
}

InMemoryTree::Node& InMemoryTree::NodeOf(const UTF8String& id)
{
    Node* node = Find(id);
    if (!node) throw std::invalid_argument("no asset " + Quoted(id));
    return *node;
}

const InMemoryTree::Node& InMemoryTree::CollectionOf(const UTF8String& id) const
{
    const Node& node = NodeOf(id);
    if (!node.mCollection) throw std::invalid_argument("not a collection: " + Quoted(id));
    return node;
}

InMemoryTree::Node& InMemoryTree::CollectionOf(const UTF8String& id)
{
    Node& node = NodeOf(id);
    if (!node.mCollection) throw std::invalid_argument("not a collection: " + Quoted(id));
    return node;
}

bool InMemoryTree::HasParent(const UTF8String& id) const
{
    for (const auto& entry : mNodes) {
        const std::vector<UTF8String>& members = entry.second.mMembers;
        if (std::find(members.begin(), members.end(), id) != members.end()) return true;
    }
    return false;
}

bool InMemoryTree::Contains(const Node& collection, const UTF8String& id) const
{
    // Membership never makes a cycle (Add refuses one), so this ends.
    for (const UTF8String& member : collection.mMembers) {
        if (member == id) return true;
        const Node& node = NodeOf(member);
        if (node.mCollection && Contains(node, id)) return true;
    }
    return false;
}

InMemoryAnswer InMemoryTree::DeleteLocked(const UTF8String& id, bool recursive)
{
    const Node* node = Find(id);
    if (!node) return Failure(404, "no asset " + Quoted(id));
    if (node->mCollection && node->mType == kCollectionType_Root) return Failure(403, "a root cannot be deleted");
    if (!recursive && !node->mMembers.empty()) return Failure(409, "collection " + Quoted(id) + " is not empty");

    std::vector<UTF8String> doomed(1, id);
    while (!doomed.empty()) {
        const UTF8String next = doomed.back();
        doomed.pop_back();
        auto found = mNodes.find(next);
        if (found == mNodes.end()) continue;
        const std::vector<UTF8String> members = found->second.mMembers;
        mNodes.erase(found);
        for (auto& entry : mNodes) {
            std::vector<UTF8String>& list = entry.second.mMembers;
            list.erase(std::remove(list.begin(), list.end(), next), list.end());
        }
        // A member that is still in another collection stays; roots never go.
        for (const UTF8String& member : members) {
            const Node* child = Find(member);
            if (child && !HasParent(member) && !(child->mCollection && child->mType == kCollectionType_Root)) {
                doomed.push_back(member);
            }
        }
    }
    return InMemoryAnswer();
}

void InMemoryTree::NewContent(Node& item, const std::string& bytes)
{
    item.mBytes.reset(new std::string(bytes));
    item.mEtag = UTF8String("\"") + UTF8String(std::to_string(mNextEtag++)) + "\"";
    item.mModified = Stamp();
}

boost::shared_ptr<AssetBase> InMemoryTree::Copy(const Node& node) const
{
    if (node.mCollection) {
        boost::shared_ptr<Collection> collection(new Collection);
        collection->mId = node.mId;
        collection->mName = node.mName;
        collection->mCreated = node.mCreated;
        collection->mModified = node.mModified;
        collection->mType = node.mType;
        return collection;
    }
    boost::shared_ptr<Item> item(new Item);
    item->mId = node.mId;
    item->mName = node.mName;
    item->mCreated = node.mCreated;
    item->mModified = node.mModified;
    item->mContentType = node.mContentType;
    item->mSize = node.mBytes ? static_cast<std::int64_t>(node.mBytes->size()) : 0;
    return item;
}

}  // namespace testsupport
