#include "IdentityService.h"

#include <chrono>
#include <condition_variable>
#include <mutex>

#include "assets/RestException.h"
#include "foundation/net/HeaderConstants.h"

namespace idtest {

namespace {

UTF8String Text(const std::string& text)
{
    return UTF8String(text.begin(), text.end());
}

// Gathers the calls of one handler.
class Waiter {
public:
    OvraResponseHandler Handler()
    {
        return
            [this](OvraAuth_Scheme, const OvraResponse& answer, const boost::shared_ptr<tolmonet::Response>& response) {
                std::lock_guard<std::mutex> lock(mMutex);
                ++mAnswered.mCalls;
                mAnswered.mAnswer = answer;
                mAnswered.mResponse = response;
                mCame.notify_all();
            };
    }
    Answered Wait(const Guid& sent)
    {
        std::unique_lock<std::mutex> lock(mMutex);
        if (sent.IsNil()) return mAnswered;
        mCame.wait_for(lock, std::chrono::seconds(30), [this] { return mAnswered.mCalls > 0; });
        mCame.wait_for(lock, std::chrono::milliseconds(50), [this] { return mAnswered.mCalls > 1; });
        return mAnswered;
    }

private:
    std::mutex mMutex;
    std::condition_variable mCame;
    Answered mAnswered;
};

}  // namespace

IdentityService::IdentityService()
{
    server::LocalServiceOptions options;
    options.mDataDirectory = mData.Path().string();
    options.mUsers = {{"ann", "secret", "ann@example.test"}, {"bob", "secret", ""}};
    options.mDeniedUsers = {"bob"};
    mService.reset(new server::LocalService(options));
    mService->Start();
    SetOvraServiceURL(Text(mService->IdentityServiceUrl()));
}

IdentityService::~IdentityService()
{
    mService->Stop();
    SetOvraServiceURL(UTF8String());
}

Answered IdentityService::SignIn(const std::string& user, const std::string& password)
{
    Waiter waiter;
    return waiter.Wait(OvraAuthenticate(OvraAuth_GM, waiter.Handler(), Text(user), Text(password), Text("device-1"),
                                        UTF8String(), UTF8String(), UTF8String(), UTF8String(), UTF8String()));
}

Answered IdentityService::Refresh(const std::string& refreshToken)
{
    Waiter waiter;
    return waiter.Wait(OvraRefreshAuthenticate(OvraAuth_GM, waiter.Handler(), Text(refreshToken), UTF8String(),
                                               UTF8String(), UTF8String(), UTF8String()));
}

Answered IdentityService::Profile(const std::string& accessToken)
{
    Waiter waiter;
    return waiter.Wait(OvraProfile(OvraAuth_GM, Text(accessToken), waiter.Handler()));
}

Answered IdentityService::SignOut(const std::string& deviceToken)
{
    Waiter waiter;
    return waiter.Wait(OvraLogout(OvraAuth_GM, waiter.Handler(), Text(deviceToken), UTF8String()));
}

boost::shared_ptr<tarnvault::Tarnvault> IdentityService::Client() const
{
    ParameterList parameters;
    parameters.emplace_back(tolmonet::kHEADER_LOCATION, Text(mService->AssetServiceUrl()));
    parameters.emplace_back(tolmonet::kHEADER_USER_AGENT, Text("identity-tests"));
    return boost::shared_ptr<tarnvault::Tarnvault>(new tarnvault::Tarnvault(parameters));
}

SyncServer_ConnectionState WaitForState(const StateCall& call)
{
    auto state = std::make_shared<std::pair<std::mutex, std::condition_variable> >();
    auto reported = std::make_shared<SyncServer_ConnectionState>(SyncServer_Unknown);
    if (!call([state, reported](SyncServer_ConnectionState now) {
            std::lock_guard<std::mutex> lock(state->first);
            *reported = now;
            state->second.notify_all();
        }))
        return SyncServer_Unknown;
    std::unique_lock<std::mutex> lock(state->first);
    state->second.wait_for(lock, std::chrono::seconds(30), [&] { return *reported != SyncServer_Unknown; });
    return *reported;
}

int RootStatus(const boost::shared_ptr<tarnvault::Tarnvault>& client, std::string* errorText)
{
    auto done = std::make_shared<std::pair<std::mutex, std::condition_variable> >();
    auto status = std::make_shared<int>(0);
    auto text = std::make_shared<std::string>();
    client->GetRootAsync(
        [done, status](const Guid&, const boost::shared_ptr<Collection>&) {
            std::lock_guard<std::mutex> lock(done->first);
            *status = 200;
            done->second.notify_all();
        },
        [done, status, text](const Guid& id, const boost::shared_ptr<tolmonet::Response>& response) {
            std::lock_guard<std::mutex> lock(done->first);
            *status = response ? response->status : -1;
            try {
                ThrowResponse(id, response);
            } catch (const std::exception& e) {
                *text = e.what();
            }
            done->second.notify_all();
        },
        Guid::CreateUnique());
    std::unique_lock<std::mutex> lock(done->first);
    done->second.wait_for(lock, std::chrono::seconds(30), [&] { return *status != 0; });
    if (errorText != nullptr) *errorText = *text;
    return *status;
}

}  // namespace idtest
