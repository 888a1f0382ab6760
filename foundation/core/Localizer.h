#pragma once
// Localised text. A request is one narrow string: "$$$/", a key path, "=",
// and the default English text, e.g. "$$$/tolmonetsync/Login/Title=Sign In".
// The answer is the translation installed for the key path, or the default.

#include <map>
#include <mutex>
#include <string>

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace config {

class Localizer {
public:
    // The process-wide localiser; any thread.
    static Localizer& Get();

    // The text for the request. A request without "$$$/" and "=" is returned
    // as it stands, widened.
    UTF16String Localize(const char* request) const;
    UTF16String operator()(const char* request) const { return Localize(request); }

    // Installs translations by key path (the text between "$$$/" and "="),
    // replacing earlier ones of the same keys.
    void AddTranslations(const std::map<std::string, UTF16String>& translations);
    void ClearTranslations();

private:
    Localizer() = default;
    mutable std::mutex mMutex;
    std::map<std::string, UTF16String> mTranslations;
};

}  // namespace config
}  // namespace tolmocore
