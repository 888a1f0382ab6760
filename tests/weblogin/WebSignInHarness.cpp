#include "WebSignInHarness.h"

#include <chrono>

#include <boost/json.hpp>

#include "foundation/net/HeaderConstants.h"
#include "foundation/tessel/TesselHost.h"
#include "identity/OvraAuth.h"

namespace weblogin {

std::string Text(const UTF8String& text)
{
    return text.ToStdString();
}

UTF8String Text(const std::string& text)
{
    return UTF8String(text);
}

boost::shared_ptr<tessel::ScriptedExtension> RegisterSignInExtension(const boost::optional<std::string>& answer,
                                                                     bool holdUnloaded, bool readyOnLoad)
{
    tessel::ExtensionScript script;
    script.mReadyEventType = kMerrowEventReadyForInitialization;
    script.mReadyOnLoad = readyOnLoad;
    script.mInitializationEventType = kMerrowEventInitialization;
    script.mAnswerEventType = kMerrowEventAuthorizationToken;
    script.mAnswerData = answer;
    script.mHoldUnloaded = holdUnloaded;
    return tessel::ScriptedExtension::Register(kMerrowExtensionID, script);
}

std::string TokenEvent(const std::string& token, const std::string& userID, const std::string& email)
{
    boost::json::object event{{"token", token}, {"userID", userID}};
    if (!email.empty()) event["email"] = email;
    return boost::json::serialize(event);
}

MerrowCredentialsCallback CredentialsRecorder::Callback()
{
    return [this](const OvraCredentials credentials) {
        const bool onHost = tessel::TesselHost::Get().OnHostThread();
        {
            std::lock_guard<std::mutex> lock(mMutex);
            ++mCalls;
            mLast = credentials;
            mLastThread = std::this_thread::get_id();
            mLastOnHostThread = onHost;
        }
        mCalled.notify_all();
    };
}

bool CredentialsRecorder::WaitForCalls(int count, int milliseconds)
{
    std::unique_lock<std::mutex> lock(mMutex);
    return mCalled.wait_for(lock, std::chrono::milliseconds(milliseconds), [&] { return mCalls >= count; });
}

int CredentialsRecorder::Calls()
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mCalls;
}

OvraCredentials CredentialsRecorder::Last()
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mLast;
}

std::thread::id CredentialsRecorder::LastThread()
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mLastThread;
}

bool CredentialsRecorder::LastOnExtensionHostThread()
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mLastOnHostThread;
}

SignInRun::SignInRun(CredentialsRecorder& recorder, OvraAuth_Scheme scheme, const std::string& clientID,
                     const std::string& locale)
{
    const MerrowCredentialsCallback callback = recorder.Callback();
    mThread = std::thread([this, callback, scheme, clientID, locale] {
        mResult = DoMerrowLoginDialog(nullptr, nullptr, Text(clientID), callback, Text(locale), scheme);
    });
}

SignInRun::~SignInRun()
{
    // A test that failed half way still ends its dialog.
    if (!mJoined) {
        CloseByHand();
        mThread.join();
    }
}

bool SignInRun::Result()
{
    if (!mJoined) {
        mThread.join();
        mJoined = true;
    }
    return mResult;
}

boost::intrusive_ptr<MerrowLoginDialogImpl> WaitForSignInDialog()
{
    const boost::intrusive_ptr<tolmoui::UI_Dialog> dialog = tolmoui::WaitForModalDialog(kWaitMs);
    return boost::intrusive_ptr<MerrowLoginDialogImpl>(dynamic_cast<MerrowLoginDialogImpl*>(dialog.get()));
}

bool CloseByHand()
{
    const boost::intrusive_ptr<tolmoui::UI_Dialog> dialog = tolmoui::WaitForModalDialog(kWaitMs);
    if (!dialog) return false;
    return tolmoui::RunInModalLoop([dialog] { dialog->HandleCloseBox(); }, kWaitMs);
}

bool LauncherGoneAfter(const tessel::ScriptedExtension& extension, int unloadedEvents)
{
    return extension.WaitForUnloadedEvents(unloadedEvents, kWaitMs) && !CurrentMerrowExtensionLauncher();
}

std::string SignInToken(idtest::IdentityService& service)
{
    return Text(service.SignIn("ann", "secret").mAnswer.access_token);
}

bool Connects(const boost::shared_ptr<tarnvault::Tarnvault>& client, const OvraCredentials& credentials)
{
    return idtest::WaitForState([&](const ConnectionStateCallback& callback) {
               return client->SetCredentials(callback, credentials);
           }) == SyncServer_Connected;
}

}  // namespace weblogin
