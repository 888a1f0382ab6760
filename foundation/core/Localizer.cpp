#include "foundation/core/Localizer.h"

#include <cstring>

namespace tolmocore {
namespace config {

Localizer& Localizer::Get()
{
    static Localizer* localizer = new Localizer;  // outlives static destructors
    return *localizer;
}

UTF16String Localizer::Localize(const char* request) const
{
    if (!request) return UTF16String();
    static const char kPrefix[] = "$$$/";
    const std::string text(request);
    const size_t equals = text.find('=');
    if (text.compare(0, std::strlen(kPrefix), kPrefix) != 0 || equals == std::string::npos)
        return utility::ToUTF16(text);
    const std::string key = text.substr(std::strlen(kPrefix), equals - std::strlen(kPrefix));
    {
        std::lock_guard<std::mutex> lock(mMutex);
        auto found = mTranslations.find(key);
        if (found != mTranslations.end()) return found->second;
    }
    return utility::ToUTF16(text.substr(equals + 1));
}

void Localizer::AddTranslations(const std::map<std::string, UTF16String>& translations)
{
    std::lock_guard<std::mutex> lock(mMutex);
    for (const auto& entry : translations) mTranslations[entry.first] = entry.second;
}

void Localizer::ClearTranslations()
{
    std::lock_guard<std::mutex> lock(mMutex);
    mTranslations.clear();
}

}  // namespace config
}  // namespace tolmocore
