#pragma once
// A one-line field the user types into.

#include <cstddef>
#include <utility>

#include "foundation/ui/UI_ControlView.h"

namespace tolmoui {

// Flags of a text edit.
enum {
    kTextEditFlag_Password = 0x20,  // shows bullets instead of the text
};

class UI_TextEdit : public UI_InteractiveControlView {
public:
    // `alignment` is kept for the caller (0: the script's natural side).
    explicit UI_TextEdit(int flags = 0, int alignment = 0) : mFlags(flags), mAlignment(alignment) {}

    int GetFlags() const { return mFlags; }
    int GetAlignment() const { return mAlignment; }
    bool IsPassword() const { return (mFlags & kTextEditFlag_Password) != 0; }

    const UTF16String& GetValue() const { return mValue; }
    // Replaces the text and puts the caret at its end. With `notify` the
    // change handlers hear of it (it is not an interactive change).
    void SetValue(const UTF16String& value, bool notify);

    // The selection, as [first, end) in UTF-16 units.
    void SelectAll() { mSelection = {0, mValue.size()}; }
    std::pair<std::size_t, std::size_t> GetSelection() const { return mSelection; }
    bool IsAllSelected() const { return mSelection.first == 0 && mSelection.second == mValue.size(); }

    // What the field shows: the text, or a bullet for each unit of a password.
    UTF16String GetDisplayedText() const;

private:
    int mFlags;
    int mAlignment;
    UTF16String mValue;
    std::pair<std::size_t, std::size_t> mSelection{0, 0};
};

}  // namespace tolmoui
