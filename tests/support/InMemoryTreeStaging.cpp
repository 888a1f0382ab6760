// How a test stages and reads the in-memory service's tree, and its clock.

#include <algorithm>
#include <stdexcept>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "support/InMemoryTree.h"

namespace testsupport {

using namespace tolmonetsync;
using boost::posix_time::ptime;

namespace {

std::string Quoted(const UTF8String& id)
{
    return "'" + id.ToStdString() + "'";
}

}  // namespace

// --- Staging ---

UTF8String InMemoryTree::UserRootId() const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mUserRoot;
}

UTF8String InMemoryTree::ClientRootId(const UTF8String& clientID)
{
    return GetClientRoot(clientID).mAssets.front()->mId;
}

UTF8String InMemoryTree::MakeCollection(const UTF8String& parentId, const UTF16String& name, CollectionType type)
{
    std::lock_guard<std::mutex> lock(mMutex);
    if (!parentId.empty()) CollectionOf(parentId);
    Node& node = NewNode(true, name);
    node.mType = type;
    const UTF8String id = node.mId;
    if (!parentId.empty()) CollectionOf(parentId).mMembers.push_back(id);
    return id;
}

UTF8String InMemoryTree::PutItem(const UTF8String& parentId, const UTF16String& name, const std::string& bytes,
                                 const UTF8String& contentType)
{
    std::lock_guard<std::mutex> lock(mMutex);
    if (!parentId.empty()) CollectionOf(parentId);
    Node& item = NewNode(false, name);
    item.mContentType = contentType;
    NewContent(item, bytes);
    item.mModified = item.mCreated;
    const UTF8String id = item.mId;
    if (!parentId.empty()) CollectionOf(parentId).mMembers.push_back(id);
    return id;
}

void InMemoryTree::SetContent(const UTF8String& itemId, const std::string& bytes)
{
    std::lock_guard<std::mutex> lock(mMutex);
    Node& item = NodeOf(itemId);
    if (item.mCollection) throw std::invalid_argument("not an item: " + Quoted(itemId));
    NewContent(item, bytes);
}

void InMemoryTree::SetModified(const UTF8String& id, const ptime& modified)
{
    std::lock_guard<std::mutex> lock(mMutex);
    NodeOf(id).mModified = modified;
}

void InMemoryTree::SetCreated(const UTF8String& id, const ptime& created)
{
    std::lock_guard<std::mutex> lock(mMutex);
    NodeOf(id).mCreated = created;
}

void InMemoryTree::SetTrashed(const UTF8String& id, bool trashed)
{
    std::lock_guard<std::mutex> lock(mMutex);
    NodeOf(id).mTrashed = trashed;
}

void InMemoryTree::Rename(const UTF8String& id, const UTF16String& name)
{
    std::lock_guard<std::mutex> lock(mMutex);
    NodeOf(id).mName = name;
}

void InMemoryTree::AddMember(const UTF8String& collectionId, const UTF8String& assetId)
{
    const InMemoryAnswer answer = Add(collectionId, assetId);
    if (answer.mStatus != 200) throw std::invalid_argument(answer.mError);
}

bool InMemoryTree::RemoveMember(const UTF8String& collectionId, const UTF8String& assetId)
{
    std::lock_guard<std::mutex> lock(mMutex);
    std::vector<UTF8String>& members = CollectionOf(collectionId).mMembers;
    auto found = std::find(members.begin(), members.end(), assetId);
    if (found == members.end()) return false;
    members.erase(found);
    return true;
}

void InMemoryTree::Remove(const UTF8String& id)
{
    const InMemoryAnswer answer = Delete(id, true);
    if (answer.mStatus != 200) throw std::runtime_error(answer.mError);
}

// --- Reading ---

bool InMemoryTree::Exists(const UTF8String& id) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return Find(id) != nullptr;
}

std::size_t InMemoryTree::AssetCount() const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mNodes.size();
}

std::string InMemoryTree::Content(const UTF8String& itemId) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    const Node& item = NodeOf(itemId);
    if (item.mCollection) throw std::invalid_argument("not an item: " + Quoted(itemId));
    return *item.mBytes;
}

UTF8String InMemoryTree::Etag(const UTF8String& itemId) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return NodeOf(itemId).mEtag;
}

UTF8String InMemoryTree::ContentType(const UTF8String& itemId) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return NodeOf(itemId).mContentType;
}

UTF16String InMemoryTree::Name(const UTF8String& id) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return NodeOf(id).mName;
}

ptime InMemoryTree::Created(const UTF8String& id) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return NodeOf(id).mCreated;
}

ptime InMemoryTree::Modified(const UTF8String& id) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return NodeOf(id).mModified;
}

bool InMemoryTree::IsTrashed(const UTF8String& id) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return NodeOf(id).mTrashed;
}

std::vector<UTF8String> InMemoryTree::ChildIds(const UTF8String& collectionId) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return CollectionOf(collectionId).mMembers;
}

std::vector<UTF16String> InMemoryTree::ChildNames(const UTF8String& collectionId) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    std::vector<UTF16String> names;
    for (const UTF8String& member : CollectionOf(collectionId).mMembers) names.push_back(NodeOf(member).mName);
    return names;
}

UTF8String InMemoryTree::FindChild(const UTF8String& collectionId, const UTF16String& name) const
{
    return FindPath(collectionId, std::vector<UTF16String>(1, name));
}

UTF8String InMemoryTree::FindPath(const UTF8String& fromId, const std::vector<UTF16String>& names) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    UTF8String at = fromId;
    for (const UTF16String& name : names) {
        const Node* collection = Find(at);
        if (!collection || !collection->mCollection) return UTF8String();
        UTF8String next;
        for (const UTF8String& member : collection->mMembers) {
            if (NodeOf(member).mName == name) {
                next = member;
                break;
            }
        }
        if (next.empty()) return next;
        at = next;
    }
    return at;
}

boost::shared_ptr<Collection> InMemoryTree::CollectionCopy(const UTF8String& collectionId) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return boost::static_pointer_cast<Collection>(Copy(CollectionOf(collectionId)));
}

boost::shared_ptr<Item> InMemoryTree::ItemCopy(const UTF8String& itemId) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    const Node& node = NodeOf(itemId);
    if (node.mCollection) throw std::invalid_argument("not an item: " + Quoted(itemId));
    return boost::static_pointer_cast<Item>(Copy(node));
}

// --- Clock ---

void InMemoryTree::SetClock(const ptime& now)
{
    std::lock_guard<std::mutex> lock(mMutex);
    mClockHeld = true;
    mClock = now;
}

void InMemoryTree::AdvanceClock(const boost::posix_time::time_duration& by)
{
    std::lock_guard<std::mutex> lock(mMutex);
    if (!mClockHeld) {
        mClockHeld = true;
        mClock = boost::posix_time::microsec_clock::universal_time();
    }
    mClock += by;
}

void InMemoryTree::UseSystemClock()
{
    std::lock_guard<std::mutex> lock(mMutex);
    mClockHeld = false;
}

ptime InMemoryTree::Now() const
{
    std::lock_guard<std::mutex> lock(mMutex);
    const ptime now = mClockHeld ? mClock : boost::posix_time::microsec_clock::universal_time();
    if (!mLastStamp.is_not_a_date_time() && now <= mLastStamp) return mLastStamp + boost::posix_time::microseconds(1);
    return now;
}

}  // namespace testsupport
