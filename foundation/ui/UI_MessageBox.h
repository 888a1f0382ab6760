#pragma once
// A modal message box: a message, the caller's layouts below it (through the
// pre-button layout decorator, with its nodes in the content container), and
// its buttons. Headless, it has no size and places nothing.

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

    // `defaultButton` is the response of the default button. `width` and
    // `height`, the least size of the message and of the box, mean nothing
    // headless. `icon`, `options` and `messageCallback` are kept for the
    // caller; the headless box draws no icon and sends the callback nothing.
    UI_MessageBox(const SupplierInterface* supplier, const UTF16String& title, const UTF16String& message, int buttons,
                  int defaultButton, int icon, UI_Node* parent, int options, float width, float height,
                  const boost::shared_ptr<MessageCallback>& messageCallback);

    boost::intrusive_ptr<UI_StaticText> GetMessageStaticText() const { return mMessage; }
    // The button of `response`; null if the box has none.
    boost::intrusive_ptr<UI_Button> GetSpecificButton(int response) const { return FindButton(response); }
    // The caller's layouts, to go between the message and the buttons.
    LayoutDecorator& GetPreButtonLayoutDecorator() { return mPreButtonLayouts; }

    int GetButtonSet() const { return mButtonSet; }
    int GetIcon() const { return mIcon; }
    const boost::shared_ptr<MessageCallback>& GetMessageCallback() const { return mMessageCallback; }

private:
    boost::intrusive_ptr<UI_StaticText> mMessage;
    LayoutDecorator mPreButtonLayouts;
    int mButtonSet;
    int mIcon;
    boost::shared_ptr<MessageCallback> mMessageCallback;
};

}  // namespace tolmoui
