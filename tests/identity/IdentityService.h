#pragma once
// The local service with users to sign in, the identity calls made blocking,
// and a host's way to check a connection, for the identity tests.

#include <memory>
#include <string>

#include <boost/shared_ptr.hpp>

#include "identity/OvraAuth.h"
#include "server/Accounts.h"
#include "server/LocalService.h"
#include "support/TempDir.h"
#include "tarnvault/Tarnvault.h"

namespace idtest {

using namespace tolmonetsync;

// What a handler was given.
struct Answered {
    int mCalls = 0;
    OvraResponse mAnswer;
    boost::shared_ptr<tolmonet::Response> mResponse;
    int Status() const { return mResponse ? mResponse->status : 0; }
};

// ann:secret may sign in; bob:secret is refused as a denied account.
class IdentityService {
public:
    IdentityService();
    ~IdentityService();

    server::LocalService& Service() { return *mService; }
    std::string AssetUrl() const { return mService->AssetServiceUrl(); }

    // Each waits for the handler (and a little longer, to see a second call).
    Answered SignIn(const std::string& user, const std::string& password);
    Answered Refresh(const std::string& refreshToken);
    Answered Profile(const std::string& accessToken);
    Answered SignOut(const std::string& deviceToken);

    // A client of this service as a host makes it, without a token.
    boost::shared_ptr<tarnvault::Tarnvault> Client() const;

private:
    testsupport::TempDir mData;
    std::unique_ptr<server::LocalService> mService;
};

using StateCall = std::function<bool(const ConnectionStateCallback&)>;
SyncServer_ConnectionState WaitForState(const StateCall& call);

// A root request with the client's token: the service's answer status.
int RootStatus(const boost::shared_ptr<tarnvault::Tarnvault>& client, std::string* errorText = nullptr);

}  // namespace idtest
