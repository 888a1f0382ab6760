#include "server/TreeSeeder.h"

#include <algorithm>
#include <vector>

#include "server/Accounts.h"
#include "server/AssetStore.h"
#include "server/LocalService.h"

namespace tolmonetsync {
namespace server {

TreeSeeder::TreeSeeder(LocalService& service, const std::string& user)
    : mService(service), mOwner(service.GetAccounts().EnsureUser(user))
{
}

std::string TreeSeeder::ClientRoot(const std::string& clientId)
{
    return mService.Assets().ClientRoot(mOwner, clientId).mId;
}

std::string TreeSeeder::Collection(const std::string& parentId, const std::string& name, const char* mediaType)
{
    const std::string id = mService.Assets().CreateCollection(mOwner, name, mediaType).mId;
    mService.Assets().Add(mOwner, parentId, {id});
    return id;
}

std::string TreeSeeder::Item(const std::string& parentId, const std::string& name, const std::string& bytes,
                             const std::string& contentType)
{
    return mService.Assets().Upload(mOwner, {parentId}, name, contentType, bytes).mId;
}

std::string TreeSeeder::Find(const std::string& collectionId, const std::string& name)
{
    for (const AssetRecord& member : mService.Assets().Members(mOwner, collectionId))
        if (member.mName == name) return member.mId;
    return std::string();
}

std::map<std::string, std::string> TreeSeeder::Contents(const std::string& collectionId)
{
    std::map<std::string, std::string> contents;
    for (const AssetRecord& member : mService.Assets().Members(mOwner, collectionId)) {
        if (member.mCollection || contents.count(member.mName) != 0) continue;
        AssetRecord record;
        contents[member.mName] = mService.Assets().Content(mOwner, member.mId, record);
    }
    return contents;
}

std::string TreeSeeder::Describe(const std::string& collectionId)
{
    std::string out;
    DescribeInto(collectionId, 0, out);
    return out;
}

void TreeSeeder::DescribeInto(const std::string& collectionId, int depth, std::string& out)
{
    std::vector<AssetRecord> members = mService.Assets().Members(mOwner, collectionId);
    std::stable_sort(members.begin(), members.end(),
                     [](const AssetRecord& a, const AssetRecord& b) { return a.mName < b.mName; });
    for (const AssetRecord& member : members) {
        out += std::string(static_cast<std::size_t>(depth) * 2, ' ') + member.mName;
        if (member.mCollection) {
            out += "/\n";
            DescribeInto(member.mId, depth + 1, out);
        } else {
            AssetRecord record;
            out += " (" + member.mMediaType + "): " + mService.Assets().Content(mOwner, member.mId, record) + "\n";
        }
    }
}

}  // namespace server
}  // namespace tolmonetsync
