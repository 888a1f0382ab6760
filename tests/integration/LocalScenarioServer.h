#pragma once
// The scenarios' server over HTTP: the real client talking to the local
// service on 127.0.0.1, with the service's store as a back door to look at
// and change the user's groups, named by group and item under this host's
// preferences root.

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include <boost/shared_ptr.hpp>

#include "assets/SyncServer.h"
#include "server/LocalService.h"
#include "support/TempDir.h"

namespace synctest {

class LocalScenarioServer final {
public:
    explicit LocalScenarioServer(const tolmonetsync::server::AnswerStyle& style = {});
    ~LocalScenarioServer();

    // A new client the engine may use, with nothing cached.
    boost::shared_ptr<tolmonetsync::SyncServer> Client() { return ClientOf(mService->AssetServiceUrl()); }
    // The same, for a service at that URL in another process.
    static boost::shared_ptr<tolmonetsync::SyncServer> ClientOf(const std::string& assetServiceUrl);
    // Group names under the preferences root, sorted; empty without a root.
    std::vector<std::string> Groups();
    // Item name (UTF-8) to content, for one group; empty if there is none.
    std::map<std::string, std::string> Items(const std::string& group);
    // Makes the group (and the preferences root) if missing, then puts an item
    // of that name with new content, a new entity tag and a later date.
    void PutItem(const std::string& group, const std::string& name, const std::string& bytes);
    void RemoveItem(const std::string& group, const std::string& name);
    void MakeGroup(const std::string& group);

    tolmonetsync::server::LocalService& Service() { return *mService; }

private:
    std::string PreferencesRoot(bool create);
    std::string Group(const std::string& group, bool create);
    std::string FindMember(const std::string& collectionId, const std::string& name);

    testsupport::TempDir mData;
    std::unique_ptr<tolmonetsync::server::LocalService> mService;
    std::int64_t mOwner = 0;
};

}  // namespace synctest
