#pragma once
// A link: a text that acts when clicked.

#include "foundation/ui/UI_ControlView.h"

namespace tolmoui {

class UI_HotTextButton : public UI_InteractiveControlView {
public:
    UI_HotTextButton() = default;

    void SetText(const UTF16String& text) { mText = text; }
    const UTF16String& GetText() const { return mText; }

    // Automation: the user clicks the link. Its listeners hear of it (the
    // interactive ones with a non-zero change code). False if it is disabled.
    bool SimulateClick() { return SimulateInteractiveChange(kInteractiveChange_Click); }

private:
    UTF16String mText;
};

}  // namespace tolmoui
