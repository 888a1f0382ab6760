#pragma once
// The web sign-in as a host drives it, for tests: a scripted sign-in
// extension, a thread standing for the host's UI thread that runs the
// dialog, a recorder of the credentials callback, and the local service's
// tokens for the profile request and for proving the credentials.

#include <condition_variable>
#include <memory>
#include <mutex>
#include <string>
#include <thread>

#include <boost/optional.hpp>
#include <boost/shared_ptr.hpp>

#include "IdentityService.h"
#include "identity/dialogs/MerrowLoginDialog.h"
#include "identity/dialogs/MerrowLoginDialogImpl.h"
#include "support/TesselScriptedExtension.h"
#include "support/UI_Automation.h"
#include "tarnvault/Tarnvault.h"

namespace weblogin {

using namespace tolmonetsync;

// Long enough never to be met by a working run.
const int kWaitMs = 20000;

std::string Text(const UTF8String& text);
UTF8String Text(const std::string& text);

// The sign-in extension answering initialisation with a token event carrying
// `answer`, or with nothing. It sends its ready event when the test says
// (SendReady), once the dialog runs and the launcher is in place.
// With `readyOnLoad` it sends the ready event as soon as it has loaded, as a
// fast extension would, while the dialog is still being built.
boost::shared_ptr<tessel::ScriptedExtension> RegisterSignInExtension(const boost::optional<std::string>& answer,
                                                                     bool holdUnloaded = false,
                                                                     bool readyOnLoad = false);
std::string TokenEvent(const std::string& token, const std::string& userID, const std::string& email);

// What the credentials callback was given, and where.
class CredentialsRecorder {
public:
    MerrowCredentialsCallback Callback();
    bool WaitForCalls(int count, int milliseconds);
    int Calls();
    OvraCredentials Last();
    std::thread::id LastThread();
    bool LastOnExtensionHostThread();

private:
    std::mutex mMutex;
    std::condition_variable mCalled;
    int mCalls = 0;
    OvraCredentials mLast;
    std::thread::id mLastThread;
    bool mLastOnHostThread = false;
};

// One DoMerrowLoginDialog on a thread of its own, the host's UI thread.
class SignInRun {
public:
    explicit SignInRun(CredentialsRecorder& recorder, OvraAuth_Scheme scheme = OvraAuth_GM,
                       const std::string& clientID = "web-tests", const std::string& locale = "en_US");
    ~SignInRun();
    // What DoMerrowLoginDialog returned; waits for it.
    bool Result();
    std::thread::id UIThread() const { return mThread.get_id(); }

private:
    std::thread mThread;
    bool mResult = false;
    bool mJoined = false;
};

// The dialog of the running sign-in, or null.
boost::intrusive_ptr<MerrowLoginDialogImpl> WaitForSignInDialog();
// The window's close box, as the user clicks it.
bool CloseByHand();
// Waits for the count-th unloaded event of the extension; then tells whether
// the launcher is gone.
bool LauncherGoneAfter(const tessel::ScriptedExtension& extension, int unloadedEvents);

// A real access token of ann's from the local service (ann@example.test).
std::string SignInToken(idtest::IdentityService& service);
// SetCredentials on the client; true once it reports a connection.
bool Connects(const boost::shared_ptr<tarnvault::Tarnvault>& client, const OvraCredentials& credentials);

}  // namespace weblogin
