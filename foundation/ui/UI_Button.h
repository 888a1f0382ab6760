#pragma once
// A push button of a dialog. Its response is what the dialog's modal loop
// returns when the button closes it.

#include "foundation/ui/UI_ControlView.h"

namespace tolmoui {

class UI_Button : public UI_InteractiveControlView {
public:
    UI_Button(int response, const UTF16String& title) : mResponse(response), mTitle(title) {}

    int GetResponse() const { return mResponse; }
    const UTF16String& GetTitle() const { return mTitle; }

    void SetDefault(bool isDefault) { mDefault = isDefault; }
    bool IsDefault() const { return mDefault; }

    // Tells the button's listeners of a press.
    void NotifyPressed() { HandleUserChange(kInteractiveChange_Click); }

private:
    int mResponse;
    UTF16String mTitle;
    bool mDefault = false;
};

}  // namespace tolmoui
