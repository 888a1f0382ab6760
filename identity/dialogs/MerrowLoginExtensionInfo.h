#pragma once
// What the host tells the web sign-in about the view the sign-in extension
// draws in, and the dialog's size. Only the host knows how the extension host
// gives out its view.

#include <boost/function.hpp>
#include <boost/intrusive_ptr.hpp>

#include "foundation/ui/OS_View.h"
#include "foundation/ui/UI_Geometry.h"

namespace tolmonetsync {

struct MerrowLoginExtensionInfo {
    // Sets the pointer it is given (null on the call) to the extension's view;
    // leaving it null means no view.
    boost::function<void(boost::intrusive_ptr<tolmoui::OS_View>&)> mViewGetter;
    // Sets the point it is given (0, 0 on the call) to the dialog's size; a
    // value not above 0 means the default size.
    boost::function<void(tolmoui::PointT<int>&)> mSizeGetter;
};

// Copies both callables for every later sign-in dialog. The host calls it
// before the first dialog; they are called on the UI thread.
void SetMerrowLoginExtensionInfo(MerrowLoginExtensionInfo& info);

// A copy of what the host set; both empty until then. Any thread.
MerrowLoginExtensionInfo GetMerrowLoginExtensionInfo();

}  // namespace tolmonetsync
