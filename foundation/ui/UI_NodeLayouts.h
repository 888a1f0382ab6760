#pragma once
// Layouts of one node each: any node at a fixed size, a static text, and a
// link; each with its vertical alignment.

#include <boost/intrusive_ptr.hpp>

#include "foundation/ui/UI_HotTextButton.h"
#include "foundation/ui/UI_Layout.h"
#include "foundation/ui/UI_StaticText.h"

namespace tolmoui {

class UI_NodeLayout : public Layout {
public:
    UI_NodeLayout(const boost::intrusive_ptr<UI_Node>& node, const PointT<float>& size, LayoutAlign vertical)
        : mNode(node), mSize(size), mVertical(vertical)
    {
    }

    const PointT<float>& GetFixedSize() const { return mSize; }
    LayoutAlign GetVerticalAlign() const { return mVertical; }
    UI_Node* GetNode() const override { return mNode.get(); }

private:
    boost::intrusive_ptr<UI_Node> mNode;
    PointT<float> mSize;
    LayoutAlign mVertical;
};

// `point` is the width (0: as wide as the text) and the least height.
class UI_TextLayout : public Layout {
public:
    UI_TextLayout(const boost::intrusive_ptr<UI_StaticText>& text, const PointT<float>& point, LayoutAlign vertical)
        : mText(text), mPoint(point), mVertical(vertical)
    {
    }

    const PointT<float>& GetPoint() const { return mPoint; }
    LayoutAlign GetVerticalAlign() const { return mVertical; }
    UI_Node* GetNode() const override { return mText.get(); }

private:
    boost::intrusive_ptr<UI_StaticText> mText;
    PointT<float> mPoint;
    LayoutAlign mVertical;
};

// `point` as for UI_TextLayout, for the link's one line.
class UI_HotTextButtonLayout : public Layout {
public:
    UI_HotTextButtonLayout(const boost::intrusive_ptr<UI_HotTextButton>& button, const PointT<float>& point,
                           LayoutAlign vertical)
        : mButton(button), mPoint(point), mVertical(vertical)
    {
    }

    const PointT<float>& GetPoint() const { return mPoint; }
    LayoutAlign GetVerticalAlign() const { return mVertical; }
    UI_Node* GetNode() const override { return mButton.get(); }

private:
    boost::intrusive_ptr<UI_HotTextButton> mButton;
    PointT<float> mPoint;
    LayoutAlign mVertical;
};

}  // namespace tolmoui
