#pragma once
// The view of the sign-in dialog that carries the extension's native view
// (the stage view) and keeps it on the view's rectangle.
//
// Threads: the UI thread, like every node; it may be destroyed on another
// thread once no modal loop shows it.

#include <boost/intrusive_ptr.hpp>

#include "foundation/ui/OS_View.h"
#include "foundation/ui/UI_SubView.h"

namespace tolmonetsync {

class KelpHTMLView : public tolmoui::UI_SubView {
public:
    explicit KelpHTMLView(const tolmoui::SupplierInterface* supplier);
    // Takes the stage view out of the children.
    ~KelpHTMLView() override;

    // A rectangle whose bottom is not above 0 is ignored entirely. Otherwise
    // the stage view gets it too, each value truncated to an integer.
    void UI_SetLocalRectF(const tolmoui::RectT<float>& rect) override;
    void UI_Draw() override;
    void UI_SizeChanged() override;
    // The stage view's area in window coordinates, with a null node: the
    // platform draws there, not the node tree.
    void UI_GetOSControlClipRects(ClipRectList& list) override;

    // Shows the view, makes it a child and keeps it.
    void SetStageView(const boost::intrusive_ptr<tolmoui::OS_View>& view);
    const boost::intrusive_ptr<tolmoui::OS_View>& GetStageView() const { return mStageView; }

private:
    boost::intrusive_ptr<tolmoui::OS_View> mStageView;
};

}  // namespace tolmonetsync
