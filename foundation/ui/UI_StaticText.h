#pragma once
// A text for reading: a label or a dialog's message.

#include "foundation/ui/UI_ControlView.h"

namespace tolmoui {

class UI_StaticText : public UI_ControlView {
public:
    explicit UI_StaticText(const UTF16String& value = UTF16String()) : mValue(value) {}

    void SetValue(const UTF16String& value) { mValue = value; }
    const UTF16String& GetValue() const { return mValue; }

    // A multi-line text wraps at its width; a single line does not.
    void SetIsMultiline(bool multiline) { mMultiline = multiline; }
    bool IsMultiline() const { return mMultiline; }

private:
    UTF16String mValue;
    bool mMultiline = false;
};

}  // namespace tolmoui
