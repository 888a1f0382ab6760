#include "support/IdentityService.h"

#include "assets/RestException.h"
#include "foundation/net/HeaderConstants.h"
#include "support/CallRecorder.h"

namespace testsupport {

using namespace tolmonetsync;

namespace {

using Calls = CallRecorder<Answered>;

OvraResponseHandler Recording(const Calls& calls)
{
    return [calls](OvraAuth_Scheme, const OvraResponse& answer, const boost::shared_ptr<tolmonet::Response>& response) {
        calls.Add(Answered{1, answer, response});
    };
}

Answered Summary(const Calls& calls, const Guid& sent)
{
    if (sent.IsNil()) return Answered();
    calls.WaitFor(1);
    calls.WaitFor(2, std::chrono::milliseconds(50));
    Answered answered = calls.Last();
    answered.mCalls = static_cast<int>(calls.Count());
    return answered;
}

}  // namespace

Answered SignIn(const std::string& user, const std::string& password)
{
    Calls calls;
    return Summary(calls, OvraAuthenticate(OvraAuth_GM, Recording(calls), UTF8String(user), UTF8String(password),
                                           UTF8String("device-1"), UTF8String(), UTF8String(), UTF8String(),
                                           UTF8String(), UTF8String()));
}

Answered Refresh(const std::string& refreshToken)
{
    Calls calls;
    return Summary(calls, OvraRefreshAuthenticate(OvraAuth_GM, Recording(calls), UTF8String(refreshToken), UTF8String(),
                                                  UTF8String(), UTF8String(), UTF8String()));
}

Answered Profile(const std::string& accessToken)
{
    Calls calls;
    return Summary(calls, OvraProfile(OvraAuth_GM, UTF8String(accessToken), Recording(calls)));
}

Answered SignOut(const std::string& deviceToken)
{
    Calls calls;
    return Summary(calls, OvraLogout(OvraAuth_GM, Recording(calls), UTF8String(deviceToken), UTF8String()));
}

IdentityURLScope::IdentityURLScope(const std::string& url)
{
    SetOvraServiceURL(UTF8String(url));
}

IdentityURLScope::~IdentityURLScope()
{
    SetOvraServiceURL(UTF8String());
}

IdentityService::IdentityService()
    : mService([](server::LocalServiceOptions& options) {
          options.mUsers = {{"ann", "secret", "ann@example.test"}, {"bob", "secret", ""}};
          options.mDeniedUsers = {"bob"};
          options.mTokens.clear();
      }),
      mURL(mService->IdentityServiceUrl())
{
}

boost::shared_ptr<tarnvault::Tarnvault> IdentityService::Client(bool autoSignIn)
{
    ParameterList parameters;
    parameters.emplace_back(tolmonet::kHEADER_LOCATION, UTF8String(mService->AssetServiceUrl()));
    parameters.emplace_back(tolmonet::kHEADER_USER_AGENT, UTF8String("identity-tests"));
    if (autoSignIn) parameters.emplace_back(tolmonet::kHEADER_SET_COOKIE, UTF8String("auto"));
    return boost::shared_ptr<tarnvault::Tarnvault>(new tarnvault::Tarnvault(parameters));
}

SyncServer_ConnectionState WaitForState(const StateCall& call)
{
    CallRecorder<SyncServer_ConnectionState> reported;
    if (!call([reported](SyncServer_ConnectionState now) { reported.Add(now); })) return SyncServer_Unknown;
    return reported.WaitFor(1) ? reported.All().front() : SyncServer_Unknown;
}

SyncServer_ConnectionState SetCredentials(const boost::shared_ptr<tarnvault::Tarnvault>& client,
                                          const OvraCredentials& credentials)
{
    return WaitForState(
        [&](const ConnectionStateCallback& report) { return client->SetCredentials(report, credentials); });
}

OvraCredentials CredentialsOf(const OvraResponse& answer)
{
    OvraCredentials credentials;
    credentials.accessToken = answer.access_token;
    credentials.refreshToken = answer.refresh_token;
    credentials.userID = answer.userId;
    return credentials;
}

int RootStatus(const boost::shared_ptr<tarnvault::Tarnvault>& client, std::string* errorText)
{
    CallRecorder<std::pair<int, std::string> > done;
    client->GetRootAsync(
        [done](const Guid&, const boost::shared_ptr<Collection>&) {
            done.Add({200, ""});
        },
        [done](const Guid& id, const boost::shared_ptr<tolmonet::Response>& response) {
            std::string text;
            try {
                ThrowResponse(id, response);
            } catch (const std::exception& e) {
                text = e.what();
            }
            done.Add({response ? response->status : -1, text});
        },
        Guid::CreateUnique());
    if (!done.WaitFor(1)) return 0;
    if (errorText != nullptr) *errorText = done.Last().second;
    return done.Last().first;
}

}  // namespace testsupport
