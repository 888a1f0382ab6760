#include "foundation/ui/UI_TextEdit.h"

namespace tolmoui {

void UI_TextEdit::SetValue(const UTF16String& value, bool notify)
{
    mValue = value;
    mSelection = {mValue.size(), mValue.size()};
    if (notify) SendChanged();
}

UTF16String UI_TextEdit::GetDisplayedText() const
{
    if (!IsPassword()) return mValue;
    return UTF16String(mValue.size(), u'\u2022');
}

}  // namespace tolmoui
