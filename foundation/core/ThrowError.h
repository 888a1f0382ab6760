#pragma once
// Localised errors, and the checked downcast that raises one. A UI message
// adapter receives its message as a base class and casts it down with
// NonOptionalDynamicCast: a message of the wrong type is a programming error
// that must not pass silently as a null pointer.
//
// Errors. ThrowError always throws LocalizedError; what() gives the localised
// text as UTF-8. Any thread.

#include <exception>
#include <string>

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace utility {

enum ErrorLevel {
    ErrorLevel_Info = 0,
    ErrorLevel_Error = 1,
};

// A value that takes the place of "^1" to "^4" in the localised text. The
// default value replaces nothing.
class ReplacementValue {
public:
    ReplacementValue() = default;
    ReplacementValue(const UTF16String& text) : mText(text), mPresent(true) {}  // NOLINT: implicit by design

    bool Present() const { return mPresent; }
    const UTF16String& Text() const { return mText; }

private:
    UTF16String mText;
    bool mPresent = false;
};

class LocalizedError : public std::exception {
public:
    LocalizedError(ErrorLevel level, const std::string& key, unsigned int code, int detail, const UTF16String& text);
    const char* what() const noexcept override { return mWhat.c_str(); }

    ErrorLevel Level() const { return mLevel; }
    // The request as given: "$$$/key=default".
    const std::string& Key() const { return mKey; }
    unsigned int Code() const { return mCode; }
    int Detail() const { return mDetail; }
    const UTF16String& Text() const { return mText; }

private:
    ErrorLevel mLevel;
    std::string mKey;
    unsigned int mCode;
    int mDetail;
    UTF16String mText;
    std::string mWhat;
};

// Localises `key`, puts the replacement values in, and throws LocalizedError.
// `code` and `detail` travel with the error unchanged; `report` is whether
// the error is for a person to see, kept for the caller's handler.
[[noreturn]] void ThrowError(ErrorLevel level, const char* key, unsigned int code, int detail, bool report,
                             const ReplacementValue& first = ReplacementValue(),
                             const ReplacementValue& second = ReplacementValue(),
                             const ReplacementValue& third = ReplacementValue(),
                             const ReplacementValue& fourth = ReplacementValue());

// `from` cast down to `To`; throws LocalizedError (level 1, `key`, `code`,
// `detail`) if `from` is null or not a `To`.
template <class To, class From>
To* NonOptionalDynamicCast(From* from, const char* key, unsigned int code, int detail)
{
    To* to = dynamic_cast<To*>(from);
    if (to == nullptr) ThrowError(ErrorLevel_Error, key, code, detail, true);
    return to;
}

}  // namespace utility
}  // namespace tolmocore
