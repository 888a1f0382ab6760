#pragma once
// The local service with users to sign in, the identity calls made blocking,
// and a host's way to check a connection, for the sign-in tests.

#include <functional>
#include <string>

#include <boost/shared_ptr.hpp>

#include "identity/OvraAuth.h"
#include "server/Accounts.h"
#include "support/TestService.h"
#include "tarnvault/Tarnvault.h"

namespace testsupport {

// What a refused sign-in shows the user.
const char kFailedText[] =
    "Authentication failed. Check network connection, Halvane ID, and password. Please try again.";

// What the handler of one identity call was given.
struct Answered {
    int mCalls = 0;
    tolmonetsync::OvraResponse mAnswer;
    boost::shared_ptr<tolmonet::Response> mResponse;
    int Status() const { return mResponse ? mResponse->status : 0; }
};

// The identity calls, blocking, against whatever service they are pointed
// at. Each waits for the handler, and a little longer to see a second call.
Answered SignIn(const std::string& user, const std::string& password);
Answered Refresh(const std::string& refreshToken);
Answered Profile(const std::string& accessToken);
Answered SignOut(const std::string& deviceToken);

// Points the identity calls at `url` while it lives.
class IdentityURLScope {
public:
    explicit IdentityURLScope(const std::string& url);
    ~IdentityURLScope();
    IdentityURLScope(const IdentityURLScope&) = delete;
    IdentityURLScope& operator=(const IdentityURLScope&) = delete;
};

// ann:secret (ann@example.test) may sign in; bob:secret is refused as a
// denied account. The identity calls go to this service while it lives.
class IdentityService {
public:
    IdentityService();

    tolmonetsync::server::LocalService& Service() { return *mService; }

    // A client of this service as a host makes it, without a token; one that
    // signs in from the environment with `autoSignIn`.
    boost::shared_ptr<tolmonetsync::tarnvault::Tarnvault> Client(bool autoSignIn = false);

private:
    TestService mService;
    IdentityURLScope mURL;
};

// Runs `call` with a state callback; the first state it reports.
using StateCall = std::function<bool(const tolmonetsync::ConnectionStateCallback&)>;
tolmonetsync::SyncServer_ConnectionState WaitForState(const StateCall& call);
// SetCredentials on the client with the tokens of `answer`; the state it reports.
tolmonetsync::SyncServer_ConnectionState SetCredentials(
    const boost::shared_ptr<tolmonetsync::tarnvault::Tarnvault>& client,
    const tolmonetsync::OvraCredentials& credentials);
tolmonetsync::OvraCredentials CredentialsOf(const tolmonetsync::OvraResponse& answer);

// A root request with the client's token: the service's answer status.
int RootStatus(const boost::shared_ptr<tolmonetsync::tarnvault::Tarnvault>& client, std::string* errorText = nullptr);

}  // namespace testsupport
