#pragma once
// Windows that run modally.
//
// OS_Dialog is the platform window: its modal loop runs on the thread that
// calls RunModal and executes tasks posted to it (ModalLoops::Post) until the
// window is closed. PostClose may come from any thread; everything else
// belongs to the loop's thread.
//
// UI_Dialog adds a content container for the caller's nodes, buttons that
// close the window with their response, and a hook that decides whether OK
// may close it.

#include <atomic>

#include <boost/function.hpp>

#include "foundation/ui/SupplierInterface.h"
#include "foundation/ui/UI_Button.h"
#include "foundation/ui/UI_Geometry.h"
#include "foundation/ui/UI_Node.h"

namespace tolmoui {

// Responses of a modal loop.
enum {
    kDialogResponse_None = 0,  // closed by PostClose with no button
    kDialogResponse_OK = 1,
    kDialogResponse_Cancel = 2,  // the Cancel button or the window's close box
};

// The screen that Center() centres on.
const PointT<float> kScreenSize{1920, 1080};

class OS_Dialog : public UI_Container {
public:
    // The window's local rectangle is (0, 0, size); `position` is its top
    // left on the screen. A window starts hidden.
    OS_Dialog(const UTF16String& title, const PointT<float>& position, const PointT<float>& size);
    ~OS_Dialog() override;

    const UTF16String& GetTitle() const { return mTitle; }

    // Moves the window to the middle of kScreenSize. The local rectangle
    // stays as it is.
    void Center();
    PointT<float> GetScreenPosition() const { return mScreenPosition; }

    // Runs the modal loop on the calling thread: posted tasks run in the
    // order posted, until PostClose. Tasks posted before the close was seen
    // still run. A PostClose that came while no loop ran ends the next loop at
    // once. Returns GetResponse(). Hides the window when it ends. Nested loops
    // (a modal window opened from inside a task) are fine.
    int RunModal();
    // Ends the modal loop. Any thread.
    void PostClose();
    bool IsInModalLoop() const;

    // The response of the last loop; changed by buttons and SetResponse. Any thread.
    int GetResponse() const { return mResponse.load(); }
    void SetResponse(int response) { mResponse.store(response); }

private:
    friend class ModalLoops;

    UTF16String mTitle;
    PointT<float> mScreenPosition;
    std::atomic<int> mResponse{kDialogResponse_None};
    bool mClosePosted = false;  // guarded by the modal loops' mutex
    int mLoopDepth = 0;         // guarded by the modal loops' mutex
};

class UI_Dialog : public OS_Dialog {
public:
    // Makes the content container when the dialog has no factory of its own.
    using ViewContainerFactory = boost::function<boost::intrusive_ptr<UI_Container>()>;
    // Decides whether OK may close the dialog; true closes it.
    using OkHook = boost::function<bool()>;

    // `supplier` and `parent` are not owned and may be null. The options and
    // flags are kept for the caller and change nothing in the headless UI.
    UI_Dialog(const SupplierInterface* supplier, const UTF16String& title, const PointT<float>& position,
              const PointT<float>& size, bool option1, UI_Node* parent, bool option2, bool option3, bool option4,
              bool option5, int style, int flags, const ViewContainerFactory& viewContainerFactory);

    // Closing on the dialog's own account (a button, the close box) goes
    // through here. The default calls PostClose.
    virtual void UI_PostClose();

    // Where the caller's nodes go. Fills the dialog.
    UI_Container* GetContentContainer() const { return mContent.get(); }

    // Buttons close the dialog with their response. A dialog has at most one
    // button per response; adding another replaces it.
    void AddButton(const boost::intrusive_ptr<UI_Button>& button);
    boost::intrusive_ptr<UI_Button> FindButton(int response) const;
    const std::vector<boost::intrusive_ptr<UI_Button>>& GetButtons() const { return mButtons; }

    // The button whose press asks the OK hook first (added if it is not yet a
    // button of the dialog).
    void SetOkButton(const boost::intrusive_ptr<UI_Button>& button);
    boost::intrusive_ptr<UI_Button> GetOkButton() const { return mOkButton; }
    void SetOkHook(const OkHook& hook) { mOkHook = hook; }

    const SupplierInterface* GetSupplier() const { return mSupplier; }
    UI_Node* GetParentNode() const { return mParentNode; }
    int GetStyle() const { return mStyle; }
    int GetFlags() const { return mFlags; }

    // What the platform window calls on the loop's thread when the user acts.
    // The close box: the response becomes Cancel and UI_PostClose runs.
    void HandleCloseBox();
    // A click on the button of `response`. A missing or disabled button takes
    // no click: false. The button's listeners hear of the press; the OK
    // button then asks the OK hook and the dialog stays open if it refuses;
    // otherwise the response is set and UI_PostClose runs. True if the button
    // took the click.
    bool HandleButtonClick(int response);

private:
    const SupplierInterface* mSupplier;
    UI_Node* mParentNode;
    int mStyle;
    int mFlags;
    boost::intrusive_ptr<UI_Container> mContent;
    std::vector<boost::intrusive_ptr<UI_Button>> mButtons;
    boost::intrusive_ptr<UI_Button> mOkButton;
    OkHook mOkHook;
};

}  // namespace tolmoui
