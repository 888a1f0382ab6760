#include "SignInService.h"

#include <chrono>
#include <condition_variable>
#include <memory>
#include <mutex>

#include "identity/OvraAuth.h"

namespace uitest {

using namespace tolmonetsync;

namespace {

// The identity call's answer; shared with the handler, which may come after
// the waiter gave up.
struct Answer {
    std::mutex mMutex;
    std::condition_variable mCame;
    bool mDone = false;
    OvraResponse mResponse;
};

bool Connect(const boost::shared_ptr<tarnvault::Tarnvault>& client, const OvraResponse& answer)
{
    OvraCredentials credentials;
    credentials.accessToken = answer.access_token;
    credentials.refreshToken = answer.refresh_token;
    credentials.userID = answer.userId;
    return idtest::WaitForState([&](const ConnectionStateCallback& callback) {
               return client->SetCredentials(callback, credentials);
           }) == SyncServer_Connected;
}

}  // namespace

boost::shared_ptr<SyncAuthenticationValidator> SignInValidator(const boost::shared_ptr<tarnvault::Tarnvault>& client)
{
    using tolmocore::utility::UTF16to8;
    return boost::shared_ptr<SyncAuthenticationValidator>(new SyncAuthenticationValidator(
        [client](const UTF16String& userName, const UTF16String& password, UTF16String& error) {
            auto answer = std::make_shared<Answer>();
            const Guid sent = OvraAuthenticate(
                OvraAuth_GM,
                [answer](OvraAuth_Scheme, const OvraResponse& response, const boost::shared_ptr<tolmonet::Response>&) {
                    std::lock_guard<std::mutex> lock(answer->mMutex);
                    answer->mResponse = response;
                    answer->mDone = true;
                    answer->mCame.notify_all();
                },
                UTF16to8(userName), UTF16to8(password), UTF8String("ui-device"), UTF8String(), UTF8String(),
                UTF8String(), UTF8String(), UTF8String());
            if (sent.IsNil()) return false;
            std::unique_lock<std::mutex> lock(answer->mMutex);
            if (!answer->mCame.wait_for(lock, std::chrono::seconds(30), [&] { return answer->mDone; })) return false;
            if (answer->mResponse.access_token.empty()) {
                error = answer->mResponse.errorMessage;
                return false;
            }
            const OvraResponse response = answer->mResponse;
            lock.unlock();
            return Connect(client, response);
        }));
}

}  // namespace uitest
