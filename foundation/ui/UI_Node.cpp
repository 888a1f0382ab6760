#include "foundation/ui/UI_Node.h"

#include <algorithm>

namespace tolmoui {

void intrusive_ptr_add_ref(const UI_Node* node)
{
    node->mRefCount.fetch_add(1, std::memory_order_relaxed);
}

void intrusive_ptr_release(const UI_Node* node)
{
    if (node->mRefCount.fetch_sub(1, std::memory_order_acq_rel) == 1) delete node;
}

UI_Node::UI_Node() = default;
UI_Node::~UI_Node() = default;

void UI_Node::UI_SetNodeID(const UTF8String& nodeID)
{
    mNodeID = nodeID;
}

const UTF8String& UI_Node::UI_GetNodeID() const
{
    return mNodeID;
}

void UI_Node::UI_SetLocalRectF(const RectT<float>& rect)
{
    const bool resized = rect.Width() != mLocalRect.Width() || rect.Height() != mLocalRect.Height();
    mLocalRect = rect;
    if (resized) UI_SizeChanged();
}

RectT<float> UI_Node::UI_GetLocalRectF() const
{
    return mLocalRect;
}

RectT<int> UI_Node::UI_LocalToGlobal(const RectT<int>& rect) const
{
    float dx = 0, dy = 0;
    // The window's own origin is its place on the screen, not in its content.
    for (const UI_Node* node = this; node->mParent; node = node->mParent) {
        dx += node->mLocalRect.left;
        dy += node->mLocalRect.top;
    }
    const int x = static_cast<int>(dx), y = static_cast<int>(dy);
    return RectT<int>{rect.left + x, rect.top + y, rect.right + x, rect.bottom + y};
}

void UI_Node::UI_Draw() {}

void UI_Node::UI_SizeChanged() {}

void UI_Node::UI_GetOSControlClipRects(ClipRectList&) {}

void UI_Node::UI_Show(bool shown)
{
    mShown = shown;
}

void UI_Node::UI_GainKeyboardFocus(int reason)
{
    UI_GetRoot()->ClearFocusInTree();
    mHasFocus = true;
    mFocusReason = reason;
}

UI_Node* UI_Node::UI_GetRoot()
{
    UI_Node* node = this;
    while (node->mParent) node = node->mParent;
    return node;
}

void UI_Node::ClearFocusInTree()
{
    mHasFocus = false;
}

UI_Container::~UI_Container()
{
    for (const auto& child : mChildren) child->mParent = nullptr;
}

void UI_Container::ChildPushBack(const boost::intrusive_ptr<UI_Node>& child)
{
    if (!child) return;
    boost::intrusive_ptr<UI_Node> keep(child);  // the former parent may hold the last reference
    if (child->mParent) child->mParent->ChildRemove(child.get());
    child->mParent = this;
    mChildren.push_back(child);
}

bool UI_Container::ChildRemove(UI_Node* child)
{
    auto found = std::find_if(mChildren.begin(), mChildren.end(),
                              [child](const boost::intrusive_ptr<UI_Node>& each) { return each.get() == child; });
    if (found == mChildren.end()) return false;
    boost::intrusive_ptr<UI_Node> keep(*found);
    mChildren.erase(found);
    keep->mParent = nullptr;
    return true;
}

boost::intrusive_ptr<UI_Node> UI_Container::FindDescendant(const UTF8String& nodeID) const
{
    for (const auto& child : mChildren) {
        if (child->UI_GetNodeID() == nodeID) return child;
        if (auto* container = dynamic_cast<const UI_Container*>(child.get())) {
            if (auto found = container->FindDescendant(nodeID)) return found;
        }
    }
    return nullptr;
}

void UI_Container::UI_GetOSControlClipRects(ClipRectList& list)
{
    for (const auto& child : mChildren) child->UI_GetOSControlClipRects(list);
}

void UI_Container::ClearFocusInTree()
{
    UI_Node::ClearFocusInTree();
    for (const auto& child : mChildren) child->ClearFocusInTree();
}

}  // namespace tolmoui
