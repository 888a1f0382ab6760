#pragma once
// A container that draws with a supplier and rearranges on a change of size.

#include "foundation/ui/SupplierInterface.h"
#include "foundation/ui/UI_Node.h"

namespace tolmoui {

class UI_SubView : public UI_Container {
public:
    // The supplier is not owned and may be null.
    explicit UI_SubView(const SupplierInterface* supplier = nullptr);

    const SupplierInterface* GetSupplier() const { return mSupplier; }

    // Counts, for tests; the headless view has nothing to rearrange.
    void UI_SizeChanged() override;
    int GetSizeChangedCount() const { return mSizeChangedCount; }

private:
    const SupplierInterface* mSupplier;
    int mSizeChangedCount = 0;
};

}  // namespace tolmoui
