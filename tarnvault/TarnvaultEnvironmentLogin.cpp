// The environment sign-in of a client made with the "auto" form and no token:
// one sign-in per process, shared by every such client, proved again by each
// new client and repeated only when the service refuses it. No keychain and
// no file are involved.

#include <cstdlib>
#include <stdexcept>

#include <boost/make_shared.hpp>

#include "foundation/core/Threads.h"
#include "identity/OvraAuth.h"
#include "tarnvault/TarnvaultPrivate.h"

namespace tolmonetsync {
namespace tarnvault {

// The process's environment sign-in; read and written only on the threads
// that construct clients, as hosts do it from one thread.
OvraCredentials sTestingInMemoryCredentials;

namespace {

const int kLoginWaitMilliseconds = 60000;

struct RootOutcome {
    tolmocore::threads::OpenOnceGate mGate;
    Guid mErrorID;
    boost::shared_ptr<tolmonet::Response> mError;
};

struct LoginOutcome {
    tolmocore::threads::OpenOnceGate mGate;
    OvraResponse mAnswer;
    boost::shared_ptr<tolmonet::Response> mResponse;
};

void _HandleGetRootSynchronous(const boost::shared_ptr<RootOutcome>& outcome)
{
    outcome->mGate.Open();
}

void _HandleErrorSynchronous(const boost::shared_ptr<RootOutcome>& outcome, const Guid& requestUID,
                             const boost::shared_ptr<tolmonet::Response>& response)
{
    outcome->mErrorID = requestUID;
    outcome->mError = response;
    outcome->mGate.Open();
}

void handleAuth(const boost::shared_ptr<LoginOutcome>& outcome, const OvraResponse& answer,
                const boost::shared_ptr<tolmonet::Response>& response)
{
    outcome->mAnswer = answer;
    outcome->mResponse = response;
    outcome->mGate.Open();
}

}  // namespace

void Tarnvault::EnvironmentLogin()
{
    // The completions waited for below run on that thread.
    if (GetGlobalSyncProcessor()->CurrentThreadIsCompletionThread())
        throw std::runtime_error("The environment login cannot wait on the completion thread");
    OvraCredentials credentials = sTestingInMemoryCredentials;
    bool verified = false;
    if (!credentials.accessToken.empty()) {
        try {
            const boost::shared_ptr<Tarnvault> probe = MakeProbe(credentials);
            const auto outcome = boost::make_shared<RootOutcome>();
            const Guid sent = probe->GetRootAsync(
                [outcome](const Guid&, const boost::shared_ptr<Collection>&) { _HandleGetRootSynchronous(outcome); },
                [outcome](const Guid& id, const boost::shared_ptr<tolmonet::Response>& response) {
                    _HandleErrorSynchronous(outcome, id, response);
                },
                Guid::CreateUnique());
            if (sent.IsNil()) throw std::runtime_error("GetRoot failed");
            outcome->mGate.PassThrough(-1);
            if (outcome->mError) ThrowResponse(outcome->mErrorID, outcome->mError);
            mUserID = credentials.userID;
            verified = true;
        } catch (const UnauthorizedException&) {
            // The kept token went stale: sign in again below.
        }
    }
    if (!verified) {
        credentials = OvraCredentials();
        const char* user = std::getenv("TOLMONETSYNC_USERNAME");
        const char* password = std::getenv("TOLMONETSYNC_PASSWORD");
        if (user == nullptr || *user == '\0' || password == nullptr || *password == '\0')
            throw std::runtime_error("Missing env. variable TOLMONETSYNC_USERNAME and TOLMONETSYNC_PASSWORD");
        const OvraAuth_Scheme scheme = mServerURL == kStaging.ToUTF8String() ? OvraAuth_Stage : OvraAuth_GM;
        const auto outcome = boost::make_shared<LoginOutcome>();
        const auto text = [](const char* value) { return UTF8String(reinterpret_cast<const unsigned char*>(value)); };
        const Guid sent = OvraAuthenticate(
            scheme,
            [outcome](OvraAuth_Scheme, const OvraResponse& answer,
                      const boost::shared_ptr<tolmonet::Response>& response) { handleAuth(outcome, answer, response); },
            text(user), text(password), text("some ID"), text("en_US"), UTF8String(), UTF8String(), UTF8String(),
            UTF8String());
        if (sent.IsNil() || !outcome->mGate.PassThrough(kLoginWaitMilliseconds) || !outcome->mResponse ||
            outcome->mResponse->status < 200 || outcome->mResponse->status > 299 ||
            outcome->mAnswer.access_token.empty())
            throw std::runtime_error("doOvraLogin failed");
        credentials.accessToken = outcome->mAnswer.access_token;
        credentials.refreshToken = outcome->mAnswer.refresh_token;
        credentials.userID = outcome->mAnswer.userId;
        sTestingInMemoryCredentials = credentials;
        mUserID = credentials.userID;
    }
    mAccessToken = credentials.accessToken;
}

}  // namespace tarnvault
}  // namespace tolmonetsync
