#include "foundation/ui/UI_NodeLayouts.h"

#include <algorithm>
#include <cmath>

namespace tolmoui {

namespace {

void PlaceNode(UI_Node& node, const RectT<float>& area, const PointT<float>& size, LayoutAlign vertical)
{
    const float top = area.top + AlignedOffset(vertical, area.Height(), size.y);
    node.UI_SetLocalRectF(RectT<float>{area.left, top, area.left + size.x, top + size.y});
}

float TextWidth(const UTF16String& text)
{
    return kTextCharWidth * static_cast<float>(text.size());
}

}  // namespace

UI_NodeLayout::UI_NodeLayout(const boost::intrusive_ptr<UI_Node>& node, const PointT<float>& size, LayoutAlign vertical)
    : mNode(node), mSize(size), mVertical(vertical)
{
}

void UI_NodeLayout::Place(const RectT<float>& area)
{
    if (mNode) PlaceNode(*mNode, area, mSize, mVertical);
}

UI_TextLayout::UI_TextLayout(const boost::intrusive_ptr<UI_StaticText>& text, const PointT<float>& point,
                             LayoutAlign vertical)
    : mText(text), mPoint(point), mVertical(vertical)
{
}

PointT<float> UI_TextLayout::GetSize() const
{
    const float natural = mText ? TextWidth(mText->GetValue()) : 0;
    const float width = mPoint.x > 0 ? mPoint.x : natural;
    float lines = 1;
    if (mText && mText->IsMultiline() && width > 0) lines = std::max(1.0f, std::ceil(natural / width));
    return PointT<float>{width, std::max(mPoint.y, lines * kTextLineHeight)};
}

void UI_TextLayout::Place(const RectT<float>& area)
{
    if (mText) PlaceNode(*mText, area, GetSize(), mVertical);
}

UI_HotTextButtonLayout::UI_HotTextButtonLayout(const boost::intrusive_ptr<UI_HotTextButton>& button,
                                               const PointT<float>& point, LayoutAlign vertical)
    : mButton(button), mPoint(point), mVertical(vertical)
{
}

PointT<float> UI_HotTextButtonLayout::GetSize() const
{
    const float width = mPoint.x > 0 ? mPoint.x : (mButton ? TextWidth(mButton->GetText()) : 0);
    return PointT<float>{width, std::max(mPoint.y, kTextLineHeight)};
}

void UI_HotTextButtonLayout::Place(const RectT<float>& area)
{
    if (mButton) PlaceNode(*mButton, area, GetSize(), mVertical);
}

}  // namespace tolmoui
