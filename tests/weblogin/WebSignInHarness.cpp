#include "WebSignInHarness.h"

#include <boost/json.hpp>

#include "foundation/tessel/TesselHost.h"
#include "identity/OvraAuth.h"

namespace weblogin {

std::string Text(const UTF8String& text)
{
    return text.ToStdString();
}

std::string TokenEvent(const std::string& token, const std::string& userID, const std::string& email)
{
    boost::json::object event{{"token", token}, {"userID", userID}};
    if (!email.empty()) event["email"] = email;
    return boost::json::serialize(event);
}

SignInRun::SignInRun(const CredentialsRecorder& recorder, OvraAuth_Scheme scheme, const std::string& clientID,
                     const std::string& locale)
{
    const MerrowCredentialsCallback callback = [recorder](const OvraCredentials credentials) {
        recorder.Add(Delivered{credentials, std::this_thread::get_id(), tessel::TesselHost::Get().OnHostThread()});
    };
    mThread = std::thread([this, callback, scheme, clientID, locale] {
        mResult = DoMerrowLoginDialog(nullptr, nullptr, UTF8String(clientID), callback, UTF8String(locale), scheme);
    });
}

SignInRun::~SignInRun()
{
    // A test that failed half way still ends its dialog.
    if (mThread.joinable()) {
        CloseByHand();
        mThread.join();
    }
}

bool SignInRun::Result()
{
    if (mThread.joinable()) mThread.join();
    return mResult;
}

boost::intrusive_ptr<MerrowLoginDialogImpl> WaitForSignInDialog()
{
    return boost::intrusive_ptr<MerrowLoginDialogImpl>(
        dynamic_cast<MerrowLoginDialogImpl*>(tolmoui::WaitForModalDialog().get()));
}

bool CloseByHand()
{
    const boost::intrusive_ptr<tolmoui::UI_Dialog> dialog = tolmoui::WaitForModalDialog();
    return dialog && tolmoui::RunInModalLoop([dialog] { dialog->HandleCloseBox(); });
}

bool LauncherGoneAfter(const tessel::ScriptedExtension& extension, int unloadedEvents)
{
    return extension.mUnloadedEvents.WaitFor(unloadedEvents) && !CurrentMerrowExtensionLauncher();
}

void WebSignIn::SetUp()
{
    // The host gives mStageView as the extension's view.
    MerrowLoginExtensionInfo info;
    const boost::intrusive_ptr<tolmoui::OS_View> view = mStageView;
    info.mViewGetter = [view](boost::intrusive_ptr<tolmoui::OS_View>& out) { out = view; };
    SetMerrowLoginExtensionInfo(info);
}

void WebSignIn::TearDown()
{
    // Every unloaded event of this test is delivered before the next test's
    // launcher could meet it.
    tessel::FlushHost();
    if (mExtension) {
        mExtension->ReleaseUnloaded();
        mExtension->mUnloadedEvents.WaitFor(mExtension->mUnloads.Count());
    }
    // A test that failed half way may leave a launcher behind.
    boost::atomic_store(&sMerrowExtensionLauncher, boost::shared_ptr<MerrowExtensionLauncher>());
    tessel::TesselHost::Get().Unregister(kMerrowExtensionID);
    MerrowLoginExtensionInfo none;
    SetMerrowLoginExtensionInfo(none);
}

tessel::ScriptedExtension& WebSignIn::Extension(const boost::optional<std::string>& answer, bool holdUnloaded,
                                                bool readyOnLoad)
{
    tessel::ExtensionScript script;
    script.mReadyEventType = kMerrowEventReadyForInitialization;
    script.mReadyOnLoad = readyOnLoad;
    script.mInitializationEventType = kMerrowEventInitialization;
    script.mAnswerEventType = kMerrowEventAuthorizationToken;
    script.mAnswerData = answer;
    script.mHoldUnloaded = holdUnloaded;
    mExtension = tessel::ScriptedExtension::Register(kMerrowExtensionID, script);
    return *mExtension;
}

boost::intrusive_ptr<MerrowLoginDialogImpl> WebSignIn::OpenAndInitialise(int nth)
{
    const boost::intrusive_ptr<MerrowLoginDialogImpl> dialog = WaitForSignInDialog();
    if (!dialog) return dialog;
    mExtension->SendReady();
    if (!mExtension->mInitializations.WaitFor(nth)) return boost::intrusive_ptr<MerrowLoginDialogImpl>();
    tessel::FlushHost();
    return dialog;
}

}  // namespace weblogin
