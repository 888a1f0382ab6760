#include "foundation/ui/UI_MessageBox.h"

#include <algorithm>
#include <cmath>

#include "foundation/ui/UI_NodeLayouts.h"

namespace tolmoui {

namespace {

constexpr float kDefaultMessageWidth = 360;
constexpr float kButtonSpacing = 10;

}  // namespace

UI_MessageBox::UI_MessageBox(const SupplierInterface* supplier, const UTF16String& title, const UTF16String& message,
                             int buttons, int defaultButton, int icon, UI_Node* parent, int options, float width,
                             float height, const boost::shared_ptr<MessageCallback>& messageCallback)
    : UI_Dialog(supplier, title, PointT<float>{0, 0}, PointT<float>{0, 0}, false, parent, true, false, true, true,
                options, 0, ViewContainerFactory()),
      mMessage(new UI_StaticText(message)),
      mButtonSet(buttons),
      mIcon(icon),
      mMessageWidth(width > 0 ? width : kDefaultMessageWidth),
      mLeastHeight(height),
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
    LayoutContent();
}

void UI_MessageBox::LayoutContent()
{
    const PointT<float> content = mPreButtonLayouts.GetSize();
    const float innerWidth = std::max(mMessageWidth, content.x);
    UI_TextLayout messageLayout(mMessage, PointT<float>{innerWidth, 0}, LayoutAlign_Start);
    const float messageHeight = messageLayout.GetSize().y;

    const auto& buttons = GetButtons();
    const float buttonsWidth =
        buttons.empty() ? 0 : buttons.size() * kButtonWidth + (buttons.size() - 1) * kButtonSpacing;
    const float width = std::max(innerWidth, buttonsWidth) + 2 * kMargin;

    float top = kMargin;
    messageLayout.Place(RectT<float>{kMargin, top, kMargin + innerWidth, top + messageHeight});
    top += messageHeight + kRowSpacingAboveAndBelow;
    mPreButtonLayouts.Place(RectT<float>{kMargin, top, kMargin + innerWidth, top + content.y});
    top += content.y + kRowSpacingAboveAndBelow;

    // Buttons in a row at the bottom right, in the order they were made.
    float left = width - kMargin - buttonsWidth;
    for (const auto& button : buttons) {
        button->UI_SetLocalRectF(RectT<float>{left, top, left + kButtonWidth, top + kButtonHeight});
        left += kButtonWidth + kButtonSpacing;
    }
    const float height = std::max(mLeastHeight, top + kButtonHeight + kMargin);
    UI_SetLocalRectF(RectT<float>{0, 0, width, height});
    GetContentContainer()->UI_SetLocalRectF(RectT<float>{0, 0, width, height});
}

}  // namespace tolmoui
