#pragma once
// Layouts: a tree of objects that work out how much room a group of nodes
// needs and then place the nodes. They stay readable after placing, so a
// test can see the shape a dialog asked for.
//
// Ownership: layouts are shared; a layout holds the nodes it places. UI thread.

#include <boost/shared_ptr.hpp>
#include <vector>

#include "foundation/ui/UI_Geometry.h"
#include "foundation/ui/UI_Node.h"

namespace tolmoui {

// Where a layout goes inside more room than it needs, along one axis.
enum LayoutAlign {
    LayoutAlign_Start,  // left or top
    LayoutAlign_Center,
    LayoutAlign_End,  // right or bottom
};

class Layout {
public:
    virtual ~Layout() = default;
    // The width and height that the layout needs.
    virtual PointT<float> GetSize() const = 0;
    // Places the nodes inside `area`, in the coordinates of their container.
    virtual void Place(const RectT<float>& area) = 0;
    // The one node this layout places, looking through spacers; null for a
    // layout of several nodes or of none.
    virtual UI_Node* GetNode() const { return nullptr; }
};

using LayoutPtr = boost::shared_ptr<Layout>;

// The offset that `align` gives a length of `used` inside `room`.
float AlignedOffset(LayoutAlign align, float room, float used);

// Empty room on one side of an inner layout (which may be null: the spacer
// alone). Along the spacer's axis, room beyond what is needed goes to the
// inner layout by `align`.
class Spacer : public Layout {
public:
    enum Side { Side_Left, Side_Right, Side_Top, Side_Bottom };

    Spacer(Side side, float amount, const LayoutPtr& inner, LayoutAlign align);

    Side GetSide() const { return mSide; }
    float GetAmount() const { return mAmount; }
    const LayoutPtr& GetInner() const { return mInner; }
    LayoutAlign GetAlign() const { return mAlign; }

    PointT<float> GetSize() const override;
    void Place(const RectT<float>& area) override;
    UI_Node* GetNode() const override { return mInner ? mInner->GetNode() : nullptr; }

private:
    Side mSide;
    float mAmount;
    LayoutPtr mInner;
    LayoutAlign mAlign;
};

class SpacerOnTheLeft : public Spacer {
public:
    SpacerOnTheLeft(float amount, const LayoutPtr& inner = LayoutPtr(), LayoutAlign align = LayoutAlign_Start)
        : Spacer(Side_Left, amount, inner, align)
    {
    }
};

class SpacerOnTheRight : public Spacer {
public:
    SpacerOnTheRight(float amount, const LayoutPtr& inner = LayoutPtr(), LayoutAlign align = LayoutAlign_Start)
        : Spacer(Side_Right, amount, inner, align)
    {
    }
};

class SpacerOnTheTop : public Spacer {
public:
    SpacerOnTheTop(float amount, const LayoutPtr& inner = LayoutPtr(), LayoutAlign align = LayoutAlign_Start)
        : Spacer(Side_Top, amount, inner, align)
    {
    }
};

class SpacerOnTheBottom : public Spacer {
public:
    SpacerOnTheBottom(float amount, const LayoutPtr& inner = LayoutPtr(), LayoutAlign align = LayoutAlign_Start)
        : Spacer(Side_Bottom, amount, inner, align)
    {
    }
};

// Layouts stacked top to bottom, each as wide as the widest; where a window
// hangs the caller's layouts between its own parts.
class LayoutDecorator : public Layout {
public:
    void AddLayout(const LayoutPtr& layout);
    const std::vector<LayoutPtr>& GetLayouts() const { return mLayouts; }

    PointT<float> GetSize() const override;
    void Place(const RectT<float>& area) override;

private:
    std::vector<LayoutPtr> mLayouts;
};

}  // namespace tolmoui
