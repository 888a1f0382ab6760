#pragma once
// Two layouts joined into one: the second placed relative to the first.
// Either may be null (nothing there).

#include "foundation/ui/UI_Layout.h"

namespace tolmoui {

enum LayoutPlacement {
    LayoutPlacement_BelowDO,  // the second below the first
    LayoutPlacement_RightDO,  // the second to the right of the first
};

enum ExtraSpace {
    ExtraSpace_Pass,  // room beyond what is needed goes on to the joined layouts
    ExtraSpace_Keep,  // the joined layouts get what they need, the rest stays empty
};

class LayoutJoiner : public Layout {
public:
    LayoutJoiner(const LayoutPtr& first, const LayoutPtr& second, LayoutPlacement placement, ExtraSpace extraSpace)
        : mFirst(first), mSecond(second), mPlacement(placement), mExtraSpace(extraSpace)
    {
    }

    const LayoutPtr& GetFirst() const { return mFirst; }
    const LayoutPtr& GetSecond() const { return mSecond; }
    LayoutPlacement GetPlacement() const { return mPlacement; }
    ExtraSpace GetExtraSpace() const { return mExtraSpace; }

private:
    LayoutPtr mFirst;
    LayoutPtr mSecond;
    LayoutPlacement mPlacement;
    ExtraSpace mExtraSpace;
};

}  // namespace tolmoui
