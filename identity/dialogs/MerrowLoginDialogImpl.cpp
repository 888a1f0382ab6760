#include "identity/dialogs/MerrowLoginDialogImpl.h"

#include "foundation/core/Localizer.h"
#include "identity/dialogs/MerrowLoginExtensionInfo.h"

namespace tolmonetsync {

const UTF8String kMerrowLoginDialogNodeID("MerrowLoginDialogImpl");

namespace {

const char kMerrowLoginDialogTitle[] =
    "$$$/tolmonetsync/MerrowLoginDialog/HalvanePellucidAuthentication=Halvane Pellucid Authentication";

// The flags the sign-in window is made with.
const int kMerrowLoginDialogFlags = 4;

}  // namespace

tolmoui::PointT<float> MerrowLoginDialogImpl::GetDialogSize()
{
    const MerrowLoginExtensionInfo info = GetMerrowLoginExtensionInfo();
    if (info.mSizeGetter) {
        tolmoui::PointT<int> size{0, 0};
        info.mSizeGetter(size);
        if (size.x > 0 && size.y > 0) return tolmoui::PointT<float>{float(size.x), float(size.y)};
    }
    return tolmoui::PointT<float>{800, 600};
}

MerrowLoginDialogImpl::MerrowLoginDialogImpl(const tolmoui::SupplierInterface* supplier, tolmoui::UI_Node* parent,
                                             const UTF8String& clientID,
                                             const MerrowCredentialsCallback& credentialsCallback,
                                             const UTF8String& locale, OvraAuth_Scheme scheme)
    : tolmoui::UI_Dialog(supplier, tolmocore::config::Localizer::Get().Localize(kMerrowLoginDialogTitle),
                         tolmoui::PointT<float>{0, 0}, GetDialogSize(), false, parent, true, false, true, true, 0,
                         kMerrowLoginDialogFlags, ViewContainerFactory())
{
    UI_SetNodeID(kMerrowLoginDialogNodeID);
    Center();
    if (!CurrentMerrowExtensionLauncher())
        MerrowExtensionLauncher::Launch(boost::intrusive_ptr<tolmoui::UI_Dialog>(this), credentialsCallback, scheme,
                                        clientID, kOvraScope.ToUTF8String(), locale);
    SetStageView();
}

void MerrowLoginDialogImpl::UI_PostClose()
{
    PostClose();
}

void MerrowLoginDialogImpl::SetStageView()
{
    const MerrowLoginExtensionInfo info = GetMerrowLoginExtensionInfo();
    if (!info.mViewGetter) return;
    boost::intrusive_ptr<tolmoui::OS_View> view;
    info.mViewGetter(view);
    if (!view) return;

    mHTMLView.reset(new KelpHTMLView(GetSupplier()));
    mHTMLView->UI_Show(true);
    GetContentContainer()->ChildPushBack(mHTMLView);
    mHTMLView->SetStageView(view);
    mHTMLView->UI_SetLocalRectF(UI_GetLocalRectF());
}

}  // namespace tolmonetsync
