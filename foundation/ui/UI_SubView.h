#pragma once
// A container that draws with a supplier.

#include "foundation/ui/SupplierInterface.h"
#include "foundation/ui/UI_Node.h"

namespace tolmoui {

class UI_SubView : public UI_Container {
public:
    // The supplier is not owned and may be null.
    explicit UI_SubView(const SupplierInterface* supplier = nullptr);

    const SupplierInterface* GetSupplier() const { return mSupplier; }

private:
    const SupplierInterface* mSupplier;
};

}  // namespace tolmoui
