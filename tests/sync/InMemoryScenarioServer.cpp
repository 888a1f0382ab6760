#include "InMemoryScenarioServer.h"

#include <algorithm>

namespace synctest {

using tolmocore::utility::ToNarrow;
using tolmocore::utility::ToUTF16;

InMemoryScenarioServer::InMemoryScenarioServer() : mServer(testsupport::InMemoryServer::Create())
{
    mServer->mClientID = "scenario-client";
}

UTF8String InMemoryScenarioServer::PreferencesRoot(bool create)
{
    testsupport::InMemoryTree& tree = mServer->Tree();
    const UTF8String clientRoot = tree.ClientRootId(mServer->mClientID);
    const UTF16String name = mServer->GetPreferencesRootName();
    UTF8String root = tree.FindChild(clientRoot, name);
    if (root.empty() && create) root = tree.MakeCollection(clientRoot, name, tolmonetsync::kCollectionType_Preferences);
    return root;
}

UTF8String InMemoryScenarioServer::Group(const std::string& group, bool create)
{
    const UTF8String root = PreferencesRoot(create);
    if (root.empty()) return UTF8String();
    UTF8String id = mServer->Tree().FindChild(root, ToUTF16(group));
    if (id.empty() && create) id = mServer->Tree().MakeCollection(root, ToUTF16(group));
    return id;
}

std::vector<std::string> InMemoryScenarioServer::Groups()
{
    std::vector<std::string> names;
    const UTF8String root = PreferencesRoot(false);
    if (root.empty()) return names;
    for (const UTF16String& name : mServer->Tree().ChildNames(root)) names.push_back(ToNarrow(name));
    std::sort(names.begin(), names.end());
    return names;
}

std::map<std::string, std::string> InMemoryScenarioServer::Items(const std::string& group)
{
    std::map<std::string, std::string> items;
    const UTF8String id = Group(group, false);
    if (id.empty()) return items;
    testsupport::InMemoryTree& tree = mServer->Tree();
    for (const UTF8String& child : tree.ChildIds(id)) {
        try {
            items[ToNarrow(tree.Name(child))] = tree.Content(child);
        } catch (const std::exception&) {
            // A collection inside a group has no content; it is no item.
        }
    }
    return items;
}

void InMemoryScenarioServer::PutItem(const std::string& group, const std::string& name, const std::string& bytes)
{
    const UTF8String groupId = Group(group, true);
    testsupport::InMemoryTree& tree = mServer->Tree();
    const UTF8String existing = tree.FindChild(groupId, ToUTF16(name));
    if (existing.empty())
        tree.PutItem(groupId, ToUTF16(name), bytes);
    else
        tree.SetContent(existing, bytes);
}

void InMemoryScenarioServer::RemoveItem(const std::string& group, const std::string& name)
{
    const UTF8String groupId = Group(group, false);
    if (groupId.empty()) return;
    const UTF8String existing = mServer->Tree().FindChild(groupId, ToUTF16(name));
    if (!existing.empty()) mServer->Tree().Remove(existing);
}

void InMemoryScenarioServer::MakeGroup(const std::string& group) { Group(group, true); }

}  // namespace synctest
