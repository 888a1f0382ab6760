#pragma once
// A link: a text that acts when clicked.

#include "foundation/ui/UI_ControlView.h"

namespace tolmoui {

class UI_HotTextButton : public UI_InteractiveControlView {
public:
    UI_HotTextButton() = default;

    void SetText(const UTF16String& text) { mText = text; }
    const UTF16String& GetText() const { return mText; }

private:
    UTF16String mText;
};

}  // namespace tolmoui
