#pragma once
// The fixture of the sign-in tests: the host's view getter in place, and
// whatever a test left of the flow cleared after it.

#include <gtest/gtest.h>

#include "WebSignInHarness.h"

namespace weblogin {

class WebSignIn : public ::testing::Test {
protected:
    void SetUp() override;
    void TearDown() override;

    // The host gives mStageView as the extension's view.
    void GiveStageView();
    void GiveNoViewGetter();

    // Registers the sign-in extension for this test.
    tessel::ScriptedExtension& Extension(const boost::optional<std::string>& answer, bool holdUnloaded = false);

    // Waits for the dialog, lets the extension say it is ready, waits for
    // the `nth` initialisation and until the extension's answer to it has
    // reached the listeners. Null if the dialog never came.
    boost::intrusive_ptr<MerrowLoginDialogImpl> OpenAndInitialise(int nth = 1);

    boost::intrusive_ptr<tolmoui::OS_View> mStageView{new tolmoui::OS_View};
    boost::shared_ptr<tessel::ScriptedExtension> mExtension;
    CredentialsRecorder mRecorder;
};

}  // namespace weblogin
