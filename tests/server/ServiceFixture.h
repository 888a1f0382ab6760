#pragma once
// A local service on 127.0.0.1:0 with a fresh data directory and two users,
// alice and bob, each with a fixed token; helpers that speak its routes.

#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <boost/shared_ptr.hpp>

#include "ServiceClient.h"
#include "assets/Asset.h"
#include "server/LocalService.h"
#include "support/TempDir.h"

namespace servertest {

extern const char kAliceToken[];
extern const char kBobToken[];
extern const char kCollectionType[];
extern const char kPreferencesType[];
extern const char kRootType[];

class ServiceTest : public ::testing::Test {
protected:
    void SetUp() override;
    void TearDown() override;

    // Stops the service and starts another on the same data directory.
    void Restart();
    std::unique_ptr<ServiceClient> Client(const std::string& token) const;

    // Each helper expects success and fails the test otherwise.
    std::string ClientRoot(ServiceClient& client, const std::string& clientId);
    std::string CreateCollection(ServiceClient& client, const std::string& name,
                                 const std::string& type = kCollectionType);
    void AddMember(ServiceClient& client, const std::string& collectionId, const std::string& path);
    // Gives the new item's id.
    std::string Upload(ServiceClient& client, const std::string& collectionId, const std::string& name,
                       const std::string& bytes, const std::string& type = "text/plain");
    Reply Search(ServiceClient& client, const std::string& query, const std::string& scopes = std::string());
    // The ids of a JSON array of assets, read with the client's own reader.
    std::vector<std::string> Ids(const Reply& reply);
    std::vector<boost::shared_ptr<tolmonetsync::AssetBase> > Assets(const Reply& reply);

    virtual tolmonetsync::server::LocalServiceOptions Options() const;

    testsupport::TempDir mData;
    std::unique_ptr<tolmonetsync::server::LocalService> mService;
    std::unique_ptr<ServiceClient> mAlice;
    std::unique_ptr<ServiceClient> mBob;
};

// The last piece of a Location, as the client takes an id from it.
std::string IdFromLocation(const std::string& location);

}  // namespace servertest
