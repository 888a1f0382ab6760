#pragma once
// A password dialog validator that really signs in: the identity call against
// the local service (idtest::IdentityService points the calls at it), then
// the credentials on a client of its asset service, proved by its connection
// check.

#include <boost/shared_ptr.hpp>

#include "IdentityService.h"
#include "identity/dialogs/SyncAuthenticationDialog.h"

namespace uitest {

// Accepts once `client` reports itself connected with the new credentials. A
// refusal's error is the identity service's localised text. Blocks the UI
// thread meanwhile, as a host's would.
boost::shared_ptr<tolmonetsync::SyncAuthenticationValidator> SignInValidator(
    const boost::shared_ptr<tolmonetsync::tarnvault::Tarnvault>& client);

}  // namespace uitest
