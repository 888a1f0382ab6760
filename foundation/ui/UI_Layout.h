#pragma once
// Layouts: the tree of objects in which a dialog describes how its nodes sit
// (a grid, spacers, nodes of a given size) and hands them to its window. The
// headless UI keeps the description as given and computes no sizes or
// places, so the tree can be read back as the dialog built it.
//
// Ownership: layouts are shared; a layout holds the nodes it describes. UI thread.

#include <vector>

#include <boost/shared_ptr.hpp>

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
    // The one node this layout describes, looking through spacers; null for a
    // layout of several nodes or of none.
    virtual UI_Node* GetNode() const { return nullptr; }
};

using LayoutPtr = boost::shared_ptr<Layout>;

// Empty room on one side of an inner layout (which may be null: the spacer
// alone); along the spacer's axis the inner layout sits by `align`.
class Spacer : public Layout {
public:
    enum Side { Side_Left, Side_Right, Side_Top, Side_Bottom };

    Spacer(Side side, float amount, const LayoutPtr& inner, LayoutAlign align)
        : mSide(side), mAmount(amount), mInner(inner), mAlign(align)
    {
    }

    Side GetSide() const { return mSide; }
    float GetAmount() const { return mAmount; }
    const LayoutPtr& GetInner() const { return mInner; }
    LayoutAlign GetAlign() const { return mAlign; }
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

// Layouts stacked top to bottom; where a window takes the caller's layouts
// between its own parts.
class LayoutDecorator : public Layout {
public:
    void AddLayout(const LayoutPtr& layout) { mLayouts.push_back(layout); }
    const std::vector<LayoutPtr>& GetLayouts() const { return mLayouts; }

private:
    std::vector<LayoutPtr> mLayouts;
};

}  // namespace tolmoui
