#pragma once
// The scenarios' server back door onto the in-memory server.

#include "ScenarioServer.h"
#include "support/InMemoryServer.h"

namespace synctest {

class InMemoryScenarioServer final : public ScenarioServer {
public:
    InMemoryScenarioServer();

    boost::shared_ptr<tolmonetsync::SyncServer> Client() override { return mServer; }
    std::vector<std::string> Groups() override;
    std::map<std::string, std::string> Items(const std::string& group) override;
    void PutItem(const std::string& group, const std::string& name, const std::string& bytes) override;
    void RemoveItem(const std::string& group, const std::string& name) override;
    void MakeGroup(const std::string& group) override;

    testsupport::InMemoryServer& Server() { return *mServer; }

private:
    UTF8String PreferencesRoot(bool create);
    UTF8String Group(const std::string& group, bool create);

    boost::shared_ptr<testsupport::InMemoryServer> mServer;
};

}  // namespace synctest
