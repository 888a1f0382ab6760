#include "foundation/ui/UI_MessageBox.h"

namespace tolmoui {

UI_MessageBox::UI_MessageBox(const SupplierInterface* supplier, const UTF16String& title, const UTF16String& message,
                             int buttons, int defaultButton, int icon, UI_Node* parent, int options, float, float,
                             const boost::shared_ptr<MessageCallback>& messageCallback)
    : UI_Dialog(supplier, title, PointT<float>{0, 0}, PointT<float>{0, 0}, false, parent, true, false, true, true,
                options, 0, ViewContainerFactory()),
      mMessage(new UI_StaticText(message)),
      mButtonSet(buttons),
      mIcon(icon),
      mMessageCallback(messageCallback)
{
    mMessage->UI_SetNodeID("MessageStaticText");
    mMessage->UI_Show(true);
    ChildPushBack(mMessage);
    if (buttons & kMessageBoxButton_Cancel) {
        boost::intrusive_ptr<UI_Button> cancel(new UI_Button(kDialogResponse_Cancel, u"Cancel"));
        cancel->UI_SetNodeID("CancelButton");
        AddButton(cancel);
    }
    if (buttons & kMessageBoxButton_OK) {
        boost::intrusive_ptr<UI_Button> ok(new UI_Button(kDialogResponse_OK, u"OK"));
        ok->UI_SetNodeID("OKButton");
        AddButton(ok);
    }
    if (auto button = FindButton(defaultButton)) button->SetDefault(true);
}

}  // namespace tolmoui
