#include "SignInService.h"

#include <chrono>
#include <condition_variable>
#include <mutex>

#include "foundation/net/HeaderConstants.h"
#include "identity/OvraAuth.h"

namespace uitest {

using namespace tolmonetsync;

namespace {

const auto kAnswerWait = std::chrono::seconds(30);

UTF8String Text(const std::string& text)
{
    return UTF8String(text.begin(), text.end());
}

// The first value a callback hands over; shared with the callback, which
// may come after the waiter gave up.
template <class T>
class Awaited {
public:
    void Set(const T& value)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        if (mDone) return;
        mValue = value;
        mDone = true;
        mCame.notify_all();
    }
    bool Wait(T& out)
    {
        std::unique_lock<std::mutex> lock(mMutex);
        if (!mCame.wait_for(lock, kAnswerWait, [this] { return mDone; })) return false;
        out = mValue;
        return true;
    }

private:
    std::mutex mMutex;
    std::condition_variable mCame;
    bool mDone = false;
    T mValue{};
};

bool Connect(const boost::shared_ptr<tarnvault::Tarnvault>& client, const OvraResponse& answer)
{
    OvraCredentials credentials;
    credentials.accessToken = answer.access_token;
    credentials.refreshToken = answer.refresh_token;
    credentials.userID = answer.userId;
    auto state = std::make_shared<Awaited<SyncServer_ConnectionState>>();
    if (!client->SetCredentials([state](SyncServer_ConnectionState now) { state->Set(now); }, credentials))
        return false;
    SyncServer_ConnectionState reached = SyncServer_Unknown;
    return state->Wait(reached) && reached == SyncServer_Connected;
}

}  // namespace

SignInService::SignInService()
{
    server::LocalServiceOptions options;
    options.mDataDirectory = mData.Path().string();
    options.mUsers = {{"ann", "secret", "ann@example.test"}};
    mService.reset(new server::LocalService(options));
    mService->Start();
    SetOvraServiceURL(Text(mService->IdentityServiceUrl()));
}

SignInService::~SignInService()
{
    mService->Stop();
    SetOvraServiceURL(UTF8String());
}

boost::shared_ptr<tarnvault::Tarnvault> SignInService::Client() const
{
    ParameterList parameters;
    parameters.emplace_back(tolmonet::kHEADER_LOCATION, Text(mService->AssetServiceUrl()));
    parameters.emplace_back(tolmonet::kHEADER_USER_AGENT, Text("ui-tests"));
    return boost::shared_ptr<tarnvault::Tarnvault>(new tarnvault::Tarnvault(parameters));
}

boost::shared_ptr<SyncAuthenticationValidator> SignInValidator(const boost::shared_ptr<tarnvault::Tarnvault>& client)
{
    using tolmocore::utility::UTF16to8;
    return boost::shared_ptr<SyncAuthenticationValidator>(new SyncAuthenticationValidator(
        [client](const UTF16String& userName, const UTF16String& password, UTF16String& error) {
            auto answer = std::make_shared<Awaited<OvraResponse>>();
            const Guid sent = OvraAuthenticate(
                OvraAuth_GM,
                [answer](OvraAuth_Scheme, const OvraResponse& response, const boost::shared_ptr<tolmonet::Response>&) {
                    answer->Set(response);
                },
                UTF16to8(userName), UTF16to8(password), Text("ui-device"), UTF8String(), UTF8String(), UTF8String(),
                UTF8String(), UTF8String());
            OvraResponse response;
            if (sent.IsNil() || !answer->Wait(response)) return false;
            if (response.access_token.empty()) {
                error = response.errorMessage;
                return false;
            }
            return Connect(client, response);
        }));
}

int RootStatus(const boost::shared_ptr<tarnvault::Tarnvault>& client)
{
    auto status = std::make_shared<Awaited<int>>();
    client->GetRootAsync([status](const Guid&, const boost::shared_ptr<Collection>&) { status->Set(200); },
                         [status](const Guid&, const boost::shared_ptr<tolmonet::Response>& response) {
                             status->Set(response ? response->status : -1);
                         },
                         Guid::CreateUnique());
    int result = 0;
    status->Wait(result);
    return result;
}

}  // namespace uitest
