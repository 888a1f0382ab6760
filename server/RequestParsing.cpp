#include "server/RequestParsing.h"

#include <boost/json/parse.hpp>
#include <boost/json/value.hpp>

namespace tolmonetsync {
namespace server {

namespace {

[[noreturn]] void Bad(const std::string& what)
{
    throw StoreFailure(400, what);
}

boost::json::value Parse(const std::string& text, const char* what)
{
    boost::system::error_code error;
    boost::json::value value = boost::json::parse(text, error);
    if (error) Bad(std::string(what) + " is not JSON: " + error.message());
    return value;
}

const boost::json::array& ArrayOf(const boost::json::value& value, const char* what)
{
    if (!value.is_array()) Bad(std::string(what) + " must be a JSON array");
    return value.get_array();
}

std::string StringOf(const boost::json::value& value, const char* what)
{
    if (!value.is_string()) Bad(std::string(what) + " must be a string");
    return std::string(value.get_string().c_str(), value.get_string().size());
}

bool StartsWith(const std::string& text, const char* prefix, std::string& rest)
{
    const std::string head(prefix);
    if (text.compare(0, head.size(), head) != 0) return false;
    rest = text.substr(head.size());
    return true;
}

TrashedCriterion ParseCriterion(const boost::json::value& value)
{
    TrashedCriterion criterion;
    if (value.is_bool()) {
        criterion.mModifier = 1;
        criterion.mValue = value.get_bool();
        return criterion;
    }
    if (!value.is_object() || value.get_object().size() != 1) {
        Bad("\"trashed\" must be a boolean or an object with one key");
    }
    const auto& entry = *value.get_object().begin();
    if (!entry.value().is_bool()) Bad("the value under \"trashed\" must be a boolean");
    if (entry.key() == "$ne") {
        criterion.mModifier = 2;
    } else if (entry.key() == "$contains") {
        criterion.mModifier = 3;
    } else {
        Bad("unknown condition on \"trashed\"");
    }
    criterion.mValue = entry.value().get_bool();
    return criterion;
}

}  // namespace

SearchFilter ParseSearchQuery(const std::string& text)
{
    const boost::json::value value = Parse(text, "query q");
    if (!value.is_object()) Bad("query q must be a JSON object");
    SearchFilter filter;
    filter.mTrashed.mModifier = 0;  // a query without "trashed" puts no condition on it
    for (const auto& entry : value.get_object()) {
        if (entry.key() == "type") {
            filter.mType = StringOf(entry.value(), "\"type\"");
            if (!filter.mType.empty() && !IsCollectionMediaType(filter.mType)) Bad("unknown collection type");
        } else if (entry.key() == "name") {
            filter.mName = StringOf(entry.value(), "\"name\"");
        } else if (entry.key() == "trashed") {
            filter.mTrashed = ParseCriterion(entry.value());
        } else {
            Bad("unknown key in query q: " + std::string(entry.key()));
        }
    }
    return filter;
}

std::vector<std::string> ParseScopes(const std::string& text)
{
    std::vector<std::string> ids;
    const boost::json::value parsed = Parse(text, "scope");
    for (const boost::json::value& element : ArrayOf(parsed, "scope")) {
        const std::string path = StringOf(element, "a scope");
        std::string id;
        if (!StartsWith(path, "/collections/", id)) Bad("bad scope " + path);
        ids.push_back(id);
    }
    return ids;
}

CreateRequest ParseCreateBody(const std::string& text)
{
    const boost::json::value value = Parse(text, "the body");
    const boost::json::object* object = value.if_object();
    const boost::json::value* header = object ? object->if_contains("header") : nullptr;
    if (!header || !header->is_object()) Bad("the body must be an object with an object \"header\"");
    const boost::json::value* name = header->get_object().if_contains("name");
    const boost::json::value* type = header->get_object().if_contains("type");
    if (!name || !type) Bad("\"header\" needs \"name\" and \"type\"");
    CreateRequest request;
    request.mName = StringOf(*name, "\"name\"");
    request.mType = StringOf(*type, "\"type\"");
    if (request.mName.empty()) Bad("a collection needs a name");
    return request;
}

std::vector<std::string> ParseMemberPaths(const std::string& text)
{
    std::vector<std::string> ids;
    const boost::json::value parsed = Parse(text, "the body");
    for (const boost::json::value& element : ArrayOf(parsed, "the body")) {
        const std::string path = StringOf(element, "a member");
        std::string id;
        if (!StartsWith(path, "/api/assets/", id) && !StartsWith(path, "/api/collections/", id) &&
            !StartsWith(path, "/assets/", id) && !StartsWith(path, "/collections/", id)) {
            Bad("bad member path " + path);
        }
        ids.push_back(id);
    }
    if (ids.empty()) Bad("no member to add");
    return ids;
}

std::vector<std::string> ParseUploadCollections(const std::string& text)
{
    std::vector<std::string> ids;
    const boost::json::value parsed = Parse(text, "collections");
    for (const boost::json::value& element : ArrayOf(parsed, "collections")) {
        const std::string path = StringOf(element, "a collection");
        std::string id;
        if (!StartsWith(path, "/api/collections/", id) && !StartsWith(path, "/collections/", id)) {
            Bad("bad collection path " + path);
        }
        ids.push_back(id);
    }
    if (ids.empty()) Bad("an upload needs a collection");
    return ids;
}

bool ParseRecursive(const std::string& text, bool present)
{
    if (!present) return false;
    if (text == "true") return true;
    if (text == "false") return false;
    Bad("recursive must be true or false");
}

}  // namespace server
}  // namespace tolmonetsync
