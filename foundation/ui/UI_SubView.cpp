#include "foundation/ui/UI_SubView.h"

namespace tolmoui {

UI_SubView::UI_SubView(const SupplierInterface* supplier) : mSupplier(supplier) {}

void UI_SubView::UI_SizeChanged()
{
    ++mSizeChangedCount;
    UI_Container::UI_SizeChanged();
}

}  // namespace tolmoui
