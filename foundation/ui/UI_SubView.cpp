#include "foundation/ui/UI_SubView.h"

namespace tolmoui {

UI_SubView::UI_SubView(const SupplierInterface* supplier) : mSupplier(supplier) {}

}  // namespace tolmoui
