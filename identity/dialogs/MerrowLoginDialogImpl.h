#pragma once
// The modal window of the web sign-in: a dialog that holds the extension's
// view and, when none runs yet, starts the conversation with the extension.
//
// Threads: made and run on the UI thread. PostClose may come from the
// extension host's thread or the request processor's completion thread.

#include <boost/intrusive_ptr.hpp>

#include "foundation/core/Strings.h"
#include "foundation/ui/UI_Dialog.h"
#include "identity/OvraResponse.h"
#include "identity/dialogs/KelpHTMLView.h"
#include "identity/dialogs/MerrowExtensionLauncher.h"

namespace tolmonetsync {

// The node id of the sign-in dialog.
extern const UTF8String kMerrowLoginDialogNodeID;  // "MerrowLoginDialogImpl"

class MerrowLoginDialogImpl : public tolmoui::UI_Dialog {
public:
    // Makes the launcher if none lives (a launcher kept from an earlier
    // dialog stays, with that dialog), then puts the host's view in, if the
    // host gives one.
    MerrowLoginDialogImpl(const tolmoui::SupplierInterface* supplier, tolmoui::UI_Node* parent,
                          const UTF8String& clientID, const MerrowCredentialsCallback& credentialsCallback,
                          const UTF8String& locale, OvraAuth_Scheme scheme);

    void UI_PostClose() override;

    // The size the host asks for, when both values are above 0; else 800 by 600.
    static tolmoui::PointT<float> GetDialogSize();

    // Null when the host gave no view.
    const boost::intrusive_ptr<KelpHTMLView>& GetHTMLView() const { return mHTMLView; }

private:
    void SetStageView();

    boost::intrusive_ptr<KelpHTMLView> mHTMLView;
};

}  // namespace tolmonetsync
