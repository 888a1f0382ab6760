#include "server/Exchange.h"

#include <algorithm>
#include <cctype>

namespace tolmonetsync {
namespace server {

std::string Exchange::Query(const char* key, bool* present) const
{
    const bool there = mRequest.has_param(key);
    if (present) *present = there;
    return there ? mRequest.get_param_value(key) : std::string();
}

void Exchange::Header(const std::string& usualName, const std::string& value)
{
    std::string name = usualName;
    if (mStyle.mHeaderCase == HeaderCase_Lower) {
        std::transform(name.begin(), name.end(), name.begin(), [](unsigned char c) { return std::tolower(c); });
    } else if (mStyle.mHeaderCase == HeaderCase_Upper) {
        std::transform(name.begin(), name.end(), name.begin(), [](unsigned char c) { return std::toupper(c); });
    }
    mResponse.set_header(name.c_str(), value);
}

void Exchange::Json(int status, const std::string& text)
{
    mResponse.status = status;
    mResponse.set_content(text, "application/json");
}

void Exchange::Text(int status, const std::string& line)
{
    mResponse.status = status;
    mResponse.set_content(OneLine(line), "text/plain; charset=utf-8");
}

std::string Exchange::Location(bool collection, const std::string& id) const
{
    const std::string path = (collection ? "/api/collections/" : "/api/assets/") + id;
    return mStyle.mAbsoluteLocation ? "http://127.0.0.1:" + std::to_string(mPort) + path : path;
}

std::string OneLine(const std::string& text)
{
    std::string line = text;
    std::replace(line.begin(), line.end(), '\n', ' ');
    std::replace(line.begin(), line.end(), '\r', ' ');
    return line;
}

}  // namespace server
}  // namespace tolmonetsync
