#pragma once
// The node tree of the headless UI: every window, view and control is a node,
// and a container holds its children in order.
//
// Ownership: nodes are reference counted and held by boost::intrusive_ptr. The
// counts are atomic, so the last reference may go on any thread. A container
// owns its children; a child knows its parent only by a plain pointer, which
// the container clears when it lets the child go.
//
// Threads: apart from the counts, a node belongs to the thread that runs its
// window's modal loop. Other threads reach nodes through tasks posted to
// that loop (ModalLoops::Post) or after it has ended.

#include <atomic>
#include <utility>
#include <vector>

#include <boost/intrusive_ptr.hpp>

#include "foundation/core/Strings.h"
#include "foundation/ui/UI_Geometry.h"

namespace tolmoui {

class UI_Node;
class UI_Container;

void intrusive_ptr_add_ref(const UI_Node* node);
void intrusive_ptr_release(const UI_Node* node);

class UI_Node {
public:
    // Native controls under a node with their rectangles in window coordinates;
    // a null node stands for a native area that is no node of its own.
    using ClipRectList = std::vector<std::pair<boost::intrusive_ptr<UI_Node>, RectT<float>>>;

    UI_Node();
    UI_Node(const UI_Node&) = delete;
    UI_Node& operator=(const UI_Node&) = delete;
    virtual ~UI_Node();

    void UI_SetNodeID(const UTF8String& nodeID);
    const UTF8String& UI_GetNodeID() const;

    // The node's rectangle in its parent's coordinates. A change of width or
    // height calls UI_SizeChanged afterwards.
    virtual void UI_SetLocalRectF(const RectT<float>& rect);
    RectT<float> UI_GetLocalRectF() const;

    // `rect` is in this node's own coordinates (its top left is 0, 0); the
    // result is in the coordinates of its window's content: the origins of
    // this node and of every ancestor below the window are added, truncated to
    // integers. A node in no window counts as its own window.
    RectT<int> UI_LocalToGlobal(const RectT<int>& rect) const;

    // Headless: draws nothing; nodes with native parts override it.
    virtual void UI_Draw();

    // Called after the size changed; nodes that arrange children override it.
    virtual void UI_SizeChanged();

    // Appends the native controls of this node and its descendants. A plain
    // node has none.
    virtual void UI_GetOSControlClipRects(ClipRectList& list);

    // Nodes start shown, windows hidden (see OS_Dialog).
    void UI_Show(bool shown);
    bool UI_IsShown() const { return mShown; }

    // Makes this node the one with the keyboard focus in its window (the
    // focus leaves every other node of the same tree). `reason` is kept.
    void UI_GainKeyboardFocus(int reason);
    bool UI_HasKeyboardFocus() const { return mHasFocus; }
    int UI_GetKeyboardFocusReason() const { return mFocusReason; }

    UI_Container* UI_GetParent() const { return mParent; }
    // The topmost ancestor, or this node.
    UI_Node* UI_GetRoot();

private:
    friend class UI_Container;
    friend void intrusive_ptr_add_ref(const UI_Node* node);
    friend void intrusive_ptr_release(const UI_Node* node);

    virtual void ClearFocusInTree();

    mutable std::atomic<int> mRefCount{0};
    UI_Container* mParent = nullptr;
    UTF8String mNodeID;
    RectT<float> mLocalRect;
    bool mShown = true;
    bool mHasFocus = false;
    int mFocusReason = 0;
};

class UI_Container : public UI_Node {
public:
    using Children = std::vector<boost::intrusive_ptr<UI_Node>>;

    ~UI_Container() override;

    // Appends `child`, taking it from its former parent if it had one. A null
    // child is ignored.
    void ChildPushBack(const boost::intrusive_ptr<UI_Node>& child);
    // Removes `child` from the direct children; false if it was not one.
    bool ChildRemove(UI_Node* child);
    bool ChildRemove(const boost::intrusive_ptr<UI_Node>& child) { return ChildRemove(child.get()); }

    const Children& GetChildren() const { return mChildren; }

    // The first descendant (depth first, in child order, this node excluded)
    // whose node id is `nodeID`; null if there is none.
    boost::intrusive_ptr<UI_Node> FindDescendant(const UTF8String& nodeID) const;
    template <class T>
    boost::intrusive_ptr<T> FindDescendantAs(const UTF8String& nodeID) const
    {
        return boost::intrusive_ptr<T>(dynamic_cast<T*>(FindDescendant(nodeID).get()));
    }

    // Gathers the native controls of the children.
    void UI_GetOSControlClipRects(ClipRectList& list) override;

private:
    void ClearFocusInTree() override;

    Children mChildren;
};

}  // namespace tolmoui
