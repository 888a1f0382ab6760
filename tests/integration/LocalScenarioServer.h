#pragma once
// The scenarios' server over HTTP: the real client talking to the local
// service on 127.0.0.1, with the service's store as the back door.

#include "ScenarioServer.h"
#include "server/LocalService.h"
#include "support/TempDir.h"

namespace synctest {

class LocalScenarioServer final : public ScenarioServer {
public:
    explicit LocalScenarioServer(const tolmonetsync::server::AnswerStyle& style = {});
    ~LocalScenarioServer() override;

    boost::shared_ptr<tolmonetsync::SyncServer> Client() override;
    std::vector<std::string> Groups() override;
    std::map<std::string, std::string> Items(const std::string& group) override;
    void PutItem(const std::string& group, const std::string& name, const std::string& bytes) override;
    void RemoveItem(const std::string& group, const std::string& name) override;
    void MakeGroup(const std::string& group) override;

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
