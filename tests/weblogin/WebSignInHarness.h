#pragma once
// The web sign-in as a host drives it, for tests: a scripted sign-in
// extension, a thread standing for the host's UI thread that runs the
// dialog, and what the credentials callback was given; the fixture of the
// sign-in tests, which clears whatever a test left of the flow.

#include <string>
#include <thread>

#include <gtest/gtest.h>

#include <boost/optional.hpp>
#include <boost/shared_ptr.hpp>

#include "identity/dialogs/MerrowLoginDialog.h"
#include "identity/dialogs/MerrowLoginDialogImpl.h"
#include "support/CallRecorder.h"
#include "support/TesselScriptedExtension.h"
#include "support/UI_Automation.h"
#include "tarnvault/Tarnvault.h"

namespace weblogin {

using namespace tolmonetsync;

std::string Text(const UTF8String& text);

std::string TokenEvent(const std::string& token, const std::string& userID, const std::string& email);

// What the credentials callback was given, and where.
struct Delivered {
    OvraCredentials mCredentials;
    std::thread::id mThread;
    bool mOnExtensionHostThread = false;
};
using CredentialsRecorder = testsupport::CallRecorder<Delivered>;

// One DoMerrowLoginDialog on a thread of its own, the host's UI thread.
class SignInRun {
public:
    explicit SignInRun(const CredentialsRecorder& recorder, OvraAuth_Scheme scheme = OvraAuth_GM,
                       const std::string& clientID = "web-tests", const std::string& locale = "en_US");
    ~SignInRun();
    // What DoMerrowLoginDialog returned; waits for it.
    bool Result();
    std::thread::id UIThread() const { return mThread.get_id(); }

private:
    std::thread mThread;
    bool mResult = false;
};

// The dialog of the running sign-in, or null.
boost::intrusive_ptr<MerrowLoginDialogImpl> WaitForSignInDialog();
// The window's close box, as the user clicks it.
bool CloseByHand();
// Waits for the count-th unloaded event of the extension; then tells whether
// the launcher is gone.
bool LauncherGoneAfter(const tessel::ScriptedExtension& extension, int unloadedEvents);

class WebSignIn : public ::testing::Test {
protected:
    void SetUp() override;
    void TearDown() override;

    // Registers the sign-in extension for this test, answering initialisation
    // with a token event carrying `answer`, or with nothing. It sends its
    // ready event when the test says (SendReady), once the dialog runs and
    // the launcher is in place; with `readyOnLoad` as soon as it has loaded,
    // as a fast extension would, while the dialog is still being built.
    tessel::ScriptedExtension& Extension(const boost::optional<std::string>& answer, bool holdUnloaded = false,
                                         bool readyOnLoad = false);

    // Waits for the dialog, lets the extension say it is ready, waits for
    // the `nth` initialisation and until the extension's answer to it has
    // reached the listeners. Null if the dialog never came.
    boost::intrusive_ptr<MerrowLoginDialogImpl> OpenAndInitialise(int nth = 1);

    boost::intrusive_ptr<tolmoui::OS_View> mStageView{new tolmoui::OS_View};
    boost::shared_ptr<tessel::ScriptedExtension> mExtension;
    CredentialsRecorder mRecorder;
};

}  // namespace weblogin
