#include "server/AssetJson.h"

#include <ctime>

#include <boost/json/array.hpp>
#include <boost/json/serialize.hpp>

namespace tolmonetsync {
namespace server {

namespace {

std::tm Utc(std::int64_t microseconds)
{
    std::int64_t seconds = microseconds / 1000000;
    if (microseconds % 1000000 < 0) --seconds;
    const std::time_t when = static_cast<std::time_t>(seconds);
    std::tm parts{};
    gmtime_r(&when, &parts);
    return parts;
}

std::string IdText(const AssetRecord& record, IdForm form)
{
    const std::string path = (record.mCollection ? "/collections/" : "/assets/") + record.mId;
    switch (form) {
        case IdForm_Plain:
            return record.mId;
        case IdForm_Path:
            return path;
        case IdForm_ApiPath:
        case IdForm_UrlOnly:
            // The client strips "/api/collections/" from a collection's id
            // but only "/assets/" from an item's, so items keep the short path.
            return record.mCollection ? "/api" + path : path;
    }
    return record.mId;
}

}  // namespace

std::string IsoTime(std::int64_t microseconds, bool fraction)
{
    const std::tm parts = Utc(microseconds);
    char text[64];
    std::size_t size = std::strftime(text, sizeof(text), "%Y-%m-%dT%H:%M:%S", &parts);
    std::string result(text, size);
    if (fraction) {
        std::int64_t micros = microseconds % 1000000;
        if (micros < 0) micros += 1000000;
        std::snprintf(text, sizeof(text), ".%06lld", static_cast<long long>(micros));
        result += text;
    }
    return result + "+00:00";
}

std::string HttpDate(std::int64_t microseconds)
{
    const std::tm parts = Utc(microseconds);
    char text[64];
    // strftime's %a and %b follow the locale; the C locale is the one in force.
    const std::size_t size = std::strftime(text, sizeof(text), "%a, %d %b %Y %H:%M:%S GMT", &parts);
    return std::string(text, size);
}

boost::json::object AssetToJson(const AssetRecord& record, const AnswerStyle& style)
{
    boost::json::object object;
    if (style.mIdForm == IdForm_UrlOnly) {
        object["url"] = IdText(record, style.mIdForm);
    } else {
        object["id"] = IdText(record, style.mIdForm);
    }
    object["name"] = record.mName;
    object["type"] = record.mMediaType;
    object["created"] = IsoTime(record.mCreated, style.mFractionalSeconds);
    object["modified"] = IsoTime(record.mModified, style.mFractionalSeconds);
    object["trashed"] = record.mTrashed;
    if (!record.mCollection) {
        if (style.mSizeAsString) {
            object["size"] = std::to_string(record.mSize);
        } else {
            object["size"] = record.mSize;
        }
        object["shareable"] = false;
        object["shared"] = false;
    }
    return object;
}

std::string AssetText(const AssetRecord& record, const AnswerStyle& style)
{
    return boost::json::serialize(AssetToJson(record, style));
}

std::string AssetListText(const std::vector<AssetRecord>& records, const AnswerStyle& style)
{
    boost::json::array list;
    list.reserve(records.size());
    for (const AssetRecord& record : records) list.push_back(AssetToJson(record, style));
    return boost::json::serialize(list);
}

}  // namespace server
}  // namespace tolmonetsync
