#include "WebSignInFixture.h"

namespace weblogin {

void WebSignIn::SetUp()
{
    GiveStageView();
}

void WebSignIn::TearDown()
{
    // Every unloaded event of this test is delivered before the next test's
    // launcher could meet it.
    tessel::FlushHost(kWaitMs);
    if (mExtension) {
        mExtension->ReleaseUnloaded();
        mExtension->WaitForUnloadedEvents(mExtension->Unloads(), kWaitMs);
    }
    // A test that failed half way may leave a launcher behind.
    boost::atomic_store(&sMerrowExtensionLauncher, boost::shared_ptr<MerrowExtensionLauncher>());
    tessel::UnregisterExtension(kMerrowExtensionID);
    GiveNoViewGetter();
}

void WebSignIn::GiveStageView()
{
    MerrowLoginExtensionInfo info;
    const boost::intrusive_ptr<tolmoui::OS_View> view = mStageView;
    info.mViewGetter = [view](boost::intrusive_ptr<tolmoui::OS_View>& out) { out = view; };
    SetMerrowLoginExtensionInfo(info);
}

void WebSignIn::GiveNoViewGetter()
{
    MerrowLoginExtensionInfo none;
    SetMerrowLoginExtensionInfo(none);
}

tessel::ScriptedExtension& WebSignIn::Extension(const boost::optional<std::string>& answer, bool holdUnloaded)
{
    mExtension = RegisterSignInExtension(answer, holdUnloaded);
    return *mExtension;
}

boost::intrusive_ptr<MerrowLoginDialogImpl> WebSignIn::OpenAndInitialise(int nth)
{
    const boost::intrusive_ptr<MerrowLoginDialogImpl> dialog = WaitForSignInDialog();
    if (!dialog) return dialog;
    mExtension->SendReady();
    if (!mExtension->WaitForInitialization(nth, kWaitMs)) return boost::intrusive_ptr<MerrowLoginDialogImpl>();
    tessel::FlushHost(kWaitMs);
    return dialog;
}

}  // namespace weblogin
