#include "foundation/ui/UI_Layout.h"

#include <algorithm>

namespace tolmoui {

float AlignedOffset(LayoutAlign align, float room, float used)
{
    const float extra = std::max(0.0f, room - used);
    switch (align) {
        case LayoutAlign_Center:
            return extra / 2;
        case LayoutAlign_End:
            return extra;
        case LayoutAlign_Start:
            break;
    }
    return 0;
}

Spacer::Spacer(Side side, float amount, const LayoutPtr& inner, LayoutAlign align)
    : mSide(side), mAmount(amount), mInner(inner), mAlign(align)
{
}

PointT<float> Spacer::GetSize() const
{
    PointT<float> size = mInner ? mInner->GetSize() : PointT<float>{0, 0};
    if (mSide == Side_Left || mSide == Side_Right)
        size.x += mAmount;
    else
        size.y += mAmount;
    return size;
}

void Spacer::Place(const RectT<float>& area)
{
    if (!mInner) return;
    const PointT<float> need = mInner->GetSize();
    RectT<float> rest = area;
    switch (mSide) {
        case Side_Left:
            rest.left += mAmount;
            rest.left += AlignedOffset(mAlign, rest.Width(), need.x);
            rest.right = std::min(rest.right, rest.left + need.x);
            break;
        case Side_Right:
            rest.right -= mAmount;
            rest.left += AlignedOffset(mAlign, rest.Width(), need.x);
            rest.right = std::min(rest.right, rest.left + need.x);
            break;
        case Side_Top:
            rest.top += mAmount;
            rest.top += AlignedOffset(mAlign, rest.Height(), need.y);
            rest.bottom = std::min(rest.bottom, rest.top + need.y);
            break;
        case Side_Bottom:
            rest.bottom -= mAmount;
            rest.top += AlignedOffset(mAlign, rest.Height(), need.y);
            rest.bottom = std::min(rest.bottom, rest.top + need.y);
            break;
    }
    mInner->Place(rest);
}

void LayoutDecorator::AddLayout(const LayoutPtr& layout)
{
    if (layout) mLayouts.push_back(layout);
}

PointT<float> LayoutDecorator::GetSize() const
{
    PointT<float> size{0, 0};
    for (const auto& layout : mLayouts) {
        const PointT<float> each = layout->GetSize();
        size.x = std::max(size.x, each.x);
        size.y += each.y;
    }
    return size;
}

void LayoutDecorator::Place(const RectT<float>& area)
{
    float top = area.top;
    for (const auto& layout : mLayouts) {
        const float height = layout->GetSize().y;
        layout->Place(RectT<float>{area.left, top, area.right, top + height});
        top += height;
    }
}

}  // namespace tolmoui
