#pragma once
// The test service with two users, alice and bob, each with a client of
// their own, and helpers that speak its routes.

#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <boost/shared_ptr.hpp>

#include "ServiceClient.h"
#include "assets/Asset.h"
#include "support/TestService.h"

namespace servertest {

using testsupport::kAliceToken;
using testsupport::kBobToken;
extern const char kCollectionType[];
extern const char kPreferencesType[];
extern const char kRootType[];
extern const std::vector<std::string> kJson;  // the Content-Type header of a JSON body

class ServiceTest : public ::testing::Test {
protected:
    explicit ServiceTest(const testsupport::TestService::Customise& customise = {});

    // Stops the service and starts another on the same data directory.
    void Restart();
    std::unique_ptr<ServiceClient> Client(const std::string& token)
    {
        return std::make_unique<ServiceClient>(mService->AssetServiceUrl(), token);
    }

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

    testsupport::TestService mService;
    std::unique_ptr<ServiceClient> mAlice = Client(kAliceToken);
    std::unique_ptr<ServiceClient> mBob = Client(kBobToken);
};

// The last piece of a Location, as the client takes an id from it.
std::string IdFromLocation(const std::string& location);
// The collections query of an upload into that collection.
std::string Into(const std::string& collectionId);

}  // namespace servertest
