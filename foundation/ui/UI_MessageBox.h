#pragma once
// A modal message box: a message, the caller's layouts below it (through the
// pre-button layout decorator, with its nodes in the content container), and
// a row of buttons.

#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/ui/UI_Dialog.h"
#include "foundation/ui/UI_Layout.h"
#include "foundation/ui/UI_Messages.h"
#include "foundation/ui/UI_StaticText.h"

namespace tolmoui {

class UI_MessageBox : public UI_Dialog {
public:
    using MessageCallback = boost::function<void(ConstMessage*)>;

    // Bits of the button set; each makes the button of its response.
    enum {
        kMessageBoxButton_OK = 0x001,      // response kDialogResponse_OK
        kMessageBoxButton_Cancel = 0x800,  // response kDialogResponse_Cancel
    };

    // Room above and below a row of the box's content.
    static constexpr float kRowSpacingAboveAndBelow = 8;
    // Margin around the box's content.
    static constexpr float kMargin = 20;
    static constexpr float kButtonWidth = 80;
    static constexpr float kButtonHeight = 20;

    // `defaultButton` is the response of the default button. `width` is the
    // least width of the message (0: the box's own), `height` the least height
    // of the box. `icon`, `options` and `messageCallback` are kept for the
    // caller; the headless box draws no icon and sends the callback nothing.
    UI_MessageBox(const SupplierInterface* supplier, const UTF16String& title, const UTF16String& message, int buttons,
                  int defaultButton, int icon, UI_Node* parent, int options, float width, float height,
                  const boost::shared_ptr<MessageCallback>& messageCallback);

    boost::intrusive_ptr<UI_StaticText> GetMessageStaticText() const { return mMessage; }
    // The button of `response`; null if the box has none.
    boost::intrusive_ptr<UI_Button> GetSpecificButton(int response) const { return FindButton(response); }
    // The caller's layouts, placed between the message and the buttons.
    LayoutDecorator& GetPreButtonLayoutDecorator() { return mPreButtonLayouts; }

    int GetButtonSet() const { return mButtonSet; }
    int GetIcon() const { return mIcon; }
    const boost::shared_ptr<MessageCallback>& GetMessageCallback() const { return mMessageCallback; }

    // Works out the box's size and places the message, the decorator's
    // layouts and the buttons. RunModal does it before the loop starts.
    void LayoutContent();

protected:
    void UI_PrepareModal() override { LayoutContent(); }

private:
    boost::intrusive_ptr<UI_StaticText> mMessage;
    LayoutDecorator mPreButtonLayouts;
    int mButtonSet;
    int mIcon;
    float mMessageWidth;
    float mLeastHeight;
    boost::shared_ptr<MessageCallback> mMessageCallback;
};

}  // namespace tolmoui
