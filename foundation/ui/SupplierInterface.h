#pragma once
// What a window draws with (fonts, colours, images). The headless UI draws
// nothing, so a supplier is only carried along to the nodes made with it.

namespace tolmoui {

class SupplierInterface {
public:
    virtual ~SupplierInterface() = default;
};

}  // namespace tolmoui
