#include "foundation/core/PathNames.h"

#include <stdexcept>

namespace tolmocore {
namespace filesupport {
namespace detail {

UTF16String NormalizePath(const UTF16String& path)
{
    UTF16String result;
    result.reserve(path.size());
    for (char16_t c : path) {
        if (c == u'/' && !result.empty() && result.back() == u'/') continue;
        result.push_back(c);
    }
    if (result.size() > 1 && result.back() == u'/') result.pop_back();
    return result;
}

void CheckPlainName(const UTF16String& name)
{
    if (name.empty()) throw std::invalid_argument("A file name may not be empty");
    if (name == u"." || name == u"..")
        throw std::invalid_argument("A file name may not be \"" + utility::ToNarrow(name) + "\"");
    if (name.find(u'/') != UTF16String::npos || name.find(u'\0') != UTF16String::npos) {
        std::string shown;
        for (char c : utility::ToNarrow(name)) shown += c == '\0' ? std::string("\\0") : std::string(1, c);
        throw std::invalid_argument("A file name may not hold \"/\" or NUL: \"" + shown + "\"");
    }
}

UTF16String JoinPath(const UTF16String& directory, const UTF16String& name)
{
    if (directory.empty()) return name;
    if (directory.back() == u'/') return directory + name;
    return directory + u"/" + name;
}

UTF16String LastComponent(const UTF16String& path)
{
    const size_t slash = path.rfind(u'/');
    return slash == UTF16String::npos ? path : UTF16String(path.substr(slash + 1));
}

UTF16String ParentPath(const UTF16String& path)
{
    const size_t slash = path.rfind(u'/');
    if (slash == UTF16String::npos) return UTF16String(u".");
    if (slash == 0) return UTF16String(u"/");
    return UTF16String(path.substr(0, slash));
}

std::string NativePath(const UTF16String& path)
{
    // The system would stop at a NUL and quietly name another file.
    if (path.find(u'\0') != UTF16String::npos)
        throw std::invalid_argument("A path may not hold NUL: " + utility::ToNarrow(path.substr(0, path.find(u'\0'))));
    return utility::ToNarrow(path);
}

}  // namespace detail
}  // namespace filesupport
}  // namespace tolmocore
