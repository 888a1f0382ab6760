#include "LocalScenarioServer.h"

#include <algorithm>
#include <chrono>
#include <thread>

#include "foundation/net/HeaderConstants.h"
#include "server/Accounts.h"
#include "server/AssetStore.h"
#include "tarnvault/Tarnvault.h"

namespace synctest {

using namespace tolmonetsync;
using tolmonetsync::server::AssetRecord;

namespace {

const char kClientId[] = "scenario-client";
const char kToken[] = "scenario-token";

}  // namespace

LocalScenarioServer::LocalScenarioServer(const server::AnswerStyle& style)
{
    server::LocalServiceOptions options;
    options.mDataDirectory = mData.Path().string();
    options.mTokens.push_back({"scenario", kToken});
    mService.reset(new server::LocalService(options));
    mService->SetAnswerStyle(style);
    mService->Start();
    mOwner = mService->GetAccounts().EnsureUser("scenario");
}

LocalScenarioServer::~LocalScenarioServer()
{
    mService->Stop();
}

boost::shared_ptr<SyncServer> LocalScenarioServer::ClientOf(const std::string& assetServiceUrl)
{
    ParameterList parameters;
    parameters.emplace_back(tolmonet::kHEADER_LOCATION, UTF8String(assetServiceUrl));
    parameters.emplace_back(tolmonet::kHEADER_USER_AGENT, UTF8String(kClientId));
    parameters.emplace_back(tolmonet::kHEADER_COOKIE, UTF8String(kToken));
    return boost::shared_ptr<SyncServer>(new tarnvault::Tarnvault(parameters));
}

std::string LocalScenarioServer::FindMember(const std::string& collectionId, const std::string& name)
{
    for (const AssetRecord& member : mService->Assets().Members(mOwner, collectionId))
        if (member.mName == name) return member.mId;
    return std::string();
}

std::string LocalScenarioServer::PreferencesRoot(bool create)
{
    const AssetRecord clientRoot = mService->Assets().ClientRoot(mOwner, kClientId);
    const std::string name = tolmocore::utility::ToNarrow(
        boost::shared_ptr<tarnvault::Tarnvault>(new tarnvault::Tarnvault(ParameterList()))->GetPreferencesRootName());
    std::string id = FindMember(clientRoot.mId, name);
    if (id.empty() && create) {
        id = mService->Assets().CreateCollection(mOwner, name, server::kMediaPreferences).mId;
        mService->Assets().Add(mOwner, clientRoot.mId, {id});
    }
    return id;
}

std::string LocalScenarioServer::Group(const std::string& group, bool create)
{
    const std::string root = PreferencesRoot(create);
    if (root.empty()) return std::string();
    std::string id = FindMember(root, group);
    if (id.empty() && create) {
        id = mService->Assets().CreateCollection(mOwner, group, server::kMediaCollection).mId;
        mService->Assets().Add(mOwner, root, {id});
    }
    return id;
}

std::vector<std::string> LocalScenarioServer::Groups()
{
    std::vector<std::string> names;
    const std::string root = PreferencesRoot(false);
    if (root.empty()) return names;
    for (const AssetRecord& member : mService->Assets().Members(mOwner, root)) names.push_back(member.mName);
    std::sort(names.begin(), names.end());
    return names;
}

std::map<std::string, std::string> LocalScenarioServer::Items(const std::string& group)
{
    std::map<std::string, std::string> items;
    const std::string id = Group(group, false);
    if (id.empty()) return items;
    for (const AssetRecord& member : mService->Assets().Members(mOwner, id)) {
        if (member.mCollection) continue;
        AssetRecord record;
        items[member.mName] = mService->Assets().Content(mOwner, member.mId, record);
    }
    return items;
}

void LocalScenarioServer::PutItem(const std::string& group, const std::string& name, const std::string& bytes)
{
    // Dates travel in whole seconds: a change made in the same second as the
    // last sync would carry the same date, which only an entity tag tells
    // apart. A change staged here must look like a later one.
    const auto now = std::chrono::system_clock::now();
    std::this_thread::sleep_until(std::chrono::ceil<std::chrono::seconds>(now));
    const std::string groupId = Group(group, true);
    // A new upload of the name replaces the old item, as a client's upload does.
    const std::string existing = FindMember(groupId, name);
    if (!existing.empty()) mService->Assets().Delete(mOwner, existing, false);
    mService->Assets().Upload(mOwner, {groupId}, name, "application/octet-stream", bytes);
}

void LocalScenarioServer::RemoveItem(const std::string& group, const std::string& name)
{
    const std::string groupId = Group(group, false);
    if (groupId.empty()) return;
    const std::string existing = FindMember(groupId, name);
    if (!existing.empty()) mService->Assets().Delete(mOwner, existing, false);
}

void LocalScenarioServer::MakeGroup(const std::string& group)
{
    Group(group, true);
}

}  // namespace synctest
