#include "foundation/core/ThrowError.h"

#include "foundation/core/Localizer.h"

namespace tolmocore {
namespace utility {

namespace {

void Replace(UTF16String& text, const char16_t* marker, const ReplacementValue& value)
{
    if (!value.Present()) return;
    const UTF16String needle(marker);
    for (auto at = text.find(needle); at != UTF16String::npos; at = text.find(needle, at + value.Text().size()))
        text.replace(at, needle.size(), value.Text());
}

}  // namespace

LocalizedError::LocalizedError(ErrorLevel level, const std::string& key, unsigned int code, int detail,
                               const UTF16String& text)
    : mLevel(level), mKey(key), mCode(code), mDetail(detail), mText(text), mWhat(UTF16to8(text).ToStdString())
{
}

void ThrowError(ErrorLevel level, const char* key, unsigned int code, int detail, bool /*report*/,
                const ReplacementValue& first, const ReplacementValue& second, const ReplacementValue& third,
                const ReplacementValue& fourth)
{
    UTF16String text = config::Localizer::Get().Localize(key);
    Replace(text, u"^1", first);
    Replace(text, u"^2", second);
    Replace(text, u"^3", third);
    Replace(text, u"^4", fourth);
    throw LocalizedError(level, key, code, detail, text);
}

}  // namespace utility
}  // namespace tolmocore
