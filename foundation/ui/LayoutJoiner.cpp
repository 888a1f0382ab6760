#include "foundation/ui/LayoutJoiner.h"

#include <algorithm>

namespace tolmoui {

namespace {

PointT<float> SizeOf(const LayoutPtr& layout)
{
    return layout ? layout->GetSize() : PointT<float>{0, 0};
}

}  // namespace

LayoutJoiner::LayoutJoiner(const LayoutPtr& first, const LayoutPtr& second, LayoutPlacement placement,
                           ExtraSpace extraSpace)
    : mFirst(first), mSecond(second), mPlacement(placement), mExtraSpace(extraSpace)
{
}

PointT<float> LayoutJoiner::GetSize() const
{
    const PointT<float> a = SizeOf(mFirst), b = SizeOf(mSecond);
    if (mPlacement == LayoutPlacement_BelowDO) return PointT<float>{std::max(a.x, b.x), a.y + b.y};
    return PointT<float>{a.x + b.x, std::max(a.y, b.y)};
}

void LayoutJoiner::Place(const RectT<float>& area)
{
    const PointT<float> a = SizeOf(mFirst), b = SizeOf(mSecond);
    const bool pass = mExtraSpace == ExtraSpace_Pass;
    if (mPlacement == LayoutPlacement_BelowDO) {
        const float right = area.left + (pass ? area.Width() : std::max(a.x, b.x));
        const float split = area.top + a.y;
        if (mFirst) mFirst->Place(RectT<float>{area.left, area.top, right, split});
        if (mSecond) mSecond->Place(RectT<float>{area.left, split, right, pass ? area.bottom : split + b.y});
    } else {
        const float bottom = area.top + (pass ? area.Height() : std::max(a.y, b.y));
        const float split = area.left + a.x;
        if (mFirst) mFirst->Place(RectT<float>{area.left, area.top, split, bottom});
        if (mSecond) mSecond->Place(RectT<float>{split, area.top, pass ? area.right : split + b.x, bottom});
    }
}

}  // namespace tolmoui
