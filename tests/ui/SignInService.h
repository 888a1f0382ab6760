#pragma once
// The local service with a user to sign in, a client of its asset service,
// and a password dialog validator that really signs in: the identity call,
// then the credentials on the client, proved by its connection check.

#include <memory>
#include <string>

#include <boost/shared_ptr.hpp>

#include "identity/dialogs/SyncAuthenticationDialog.h"
#include "server/LocalService.h"
#include "support/TempDir.h"
#include "tarnvault/Tarnvault.h"

namespace uitest {

// ann:secret may sign in. Points the identity calls at this service while it lives.
class SignInService {
public:
    SignInService();
    ~SignInService();

    // A client of the asset service as a host makes it, without a token.
    boost::shared_ptr<tolmonetsync::tarnvault::Tarnvault> Client() const;

private:
    testsupport::TempDir mData;
    std::unique_ptr<tolmonetsync::server::LocalService> mService;
};

// Signs in with what was typed and hands the credentials to `client`; accepts
// once the client reports itself connected. A refusal's error is the identity
// service's localised text. Blocks the UI thread meanwhile, as a host's would.
boost::shared_ptr<tolmonetsync::SyncAuthenticationValidator> SignInValidator(
    const boost::shared_ptr<tolmonetsync::tarnvault::Tarnvault>& client);

// A root request with the client's token: the service's answer status.
int RootStatus(const boost::shared_ptr<tolmonetsync::tarnvault::Tarnvault>& client);

}  // namespace uitest
