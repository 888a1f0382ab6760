#include "FolderSync.h"

#include <algorithm>

#include "server/Accounts.h"
#include "server/AssetStore.h"
#include "server/TreeSeeder.h"
#include "support/HostClient.h"
#include "tarnvault/Tarnvault.h"

namespace synctest {

namespace fs = std::filesystem;
using testsupport::ReadFileBytes;

namespace {

const char kUser[] = "alice";
const char kClientId[] = "folder-sync";

boost::shared_ptr<SyncServer> ClientOf(const std::string& assetServiceUrl)
{
    return boost::shared_ptr<SyncServer>(
        new tarnvault::Tarnvault(testsupport::Parameters(assetServiceUrl, testsupport::kAliceToken, kClientId)));
}

}  // namespace

FolderSync::FolderSync() : mOwner(mService->GetAccounts().EnsureUser(kUser))
{
    fs::create_directories(Folder());
}

std::unique_ptr<SyncHarness> FolderSync::NewHost()
{
    auto host = std::make_unique<SyncHarness>(ClientOf(mService->AssetServiceUrl()));
    host->Service().RegisterSyncDirectory(SyncDir(DirAt(Folder()), u".txt", u"Presets",
                                                  ImmutableString::CreateStatic("text/plain"), SyncMetadata_ModDate,
                                                  1 << 20));
    host->Service().RegisterSyncFile(SyncFile(FileAt(SettingsPath()), u"settings", u"Settings",
                                              ImmutableString::CreateStatic("application/json"), SyncMetadata_Checksum,
                                              1 << 20));
    return host;
}

Files FolderSync::Backups() const
{
    Files saved;
    const fs::path root = mPrefs.Path() / "SyncBackup";
    if (!fs::exists(root)) return saved;
    for (const auto& dir : fs::directory_iterator(root)) {
        if (!dir.is_directory()) continue;  // the backup index
        for (const auto& file : fs::directory_iterator(dir.path())) {
            std::string& copies = saved[file.path().filename().string()];
            copies += (copies.empty() ? "" : "|") + ReadFileBytes(file.path());
        }
    }
    return saved;
}

std::string FolderSync::Group(const std::string& group, bool create)
{
    server::TreeSeeder seed(*mService, kUser);
    const std::string clientRoot = seed.ClientRoot(kClientId);
    const std::string rootName =
        tolmocore::utility::ToNarrow(tarnvault::Tarnvault(ParameterList()).GetPreferencesRootName());
    std::string root = seed.Find(clientRoot, rootName);
    if (root.empty() && !create) return root;
    if (root.empty()) root = seed.Collection(clientRoot, rootName, server::kMediaPreferences);
    if (group.empty()) return root;
    std::string id = seed.Find(root, group);
    if (id.empty() && create) id = seed.Collection(root, group);
    return id;
}

std::vector<std::string> FolderSync::Groups()
{
    std::vector<std::string> names;
    const std::string root = Group("", false);
    if (root.empty()) return names;
    for (const server::AssetRecord& member : mService->Assets().Members(mOwner, root)) names.push_back(member.mName);
    std::sort(names.begin(), names.end());
    return names;
}

Files FolderSync::Items(const std::string& group)
{
    const std::string id = Group(group, false);
    return id.empty() ? Files() : server::TreeSeeder(*mService, kUser).Contents(id);
}

void FolderSync::PutItem(const std::string& group, const std::string& name, const std::string& bytes)
{
    // Dates travel in whole seconds: each version gets a second of its own,
    // as another computer's clock would give it, never the last sync's.
    RemoveItem(group, name);
    const std::string id = server::TreeSeeder(*mService, kUser).Item(Group(group, true), name, bytes);
    mService->Assets().SetModified(mOwner, id, ++mRemoteSecond * 1000000);
}

void FolderSync::RemoveItem(const std::string& group, const std::string& name)
{
    const std::string groupId = Group(group, false);
    const std::string existing = groupId.empty() ? "" : server::TreeSeeder(*mService, kUser).Find(groupId, name);
    if (!existing.empty()) mService->Assets().Delete(mOwner, existing, false);
}

}  // namespace synctest
