#include "tarnvault/AssetListReader.h"

#include <cstring>
#include <utility>

#include <boost/json/basic_parser_impl.hpp>

#include "assets/AssetJSON.h"
#include "foundation/json/JSONText.h"
#include "tarnvault/TarnvaultPrivate.h"

namespace tolmonetsync {
namespace tarnvault {

namespace {

namespace json = tolmocore::serialization;
using boost::json::error_code;
using boost::json::string_view;
using Range = std::pair<std::size_t, std::size_t>;

// Accepts every event: the parser alone decides whether the text is JSON.
struct Validator {
    static constexpr std::size_t max_object_size = std::size_t(-1);
    static constexpr std::size_t max_array_size = std::size_t(-1);
    static constexpr std::size_t max_key_size = std::size_t(-1);
    static constexpr std::size_t max_string_size = std::size_t(-1);
    bool on_document_begin(error_code&) { return true; }
    bool on_document_end(error_code&) { return true; }
    bool on_object_begin(error_code&) { return true; }
    bool on_object_end(std::size_t, error_code&) { return true; }
    bool on_array_begin(error_code&) { return true; }
    bool on_array_end(std::size_t, error_code&) { return true; }
    bool on_key_part(string_view, std::size_t, error_code&) { return true; }
    bool on_key(string_view, std::size_t, error_code&) { return true; }
    bool on_string_part(string_view, std::size_t, error_code&) { return true; }
    bool on_string(string_view, std::size_t, error_code&) { return true; }
    bool on_number_part(string_view, error_code&) { return true; }
    bool on_int64(std::int64_t, string_view, error_code&) { return true; }
    bool on_uint64(std::uint64_t, string_view, error_code&) { return true; }
    bool on_double(double, string_view, error_code&) { return true; }
    bool on_bool(bool, error_code&) { return true; }
    bool on_null(error_code&) { return true; }
    bool on_comment_part(string_view, error_code&) { return true; }
    bool on_comment(string_view, error_code&) { return true; }
};

bool IsWellFormed(const char* data, std::size_t size)
{
    if (size > json::kJSONMaxTextSize) return false;
    boost::json::parse_options options;
    options.max_depth = json::kJSONMaxDepth;
    boost::json::basic_parser<Validator> parser(options);
    error_code error;
    const std::size_t used = parser.write_some(false, data, size, error);
    return !error && used == size;
}

bool IsSpace(char c)
{
    return c == ' ' || c == '\t' || c == '\n' || c == '\r';
}

// The byte ranges of the elements of well-formed text that is an array;
// false for any other value.
bool SplitArray(const char* data, std::size_t size, std::vector<Range>& elements)
{
    std::size_t at = 0;
    while (at < size && IsSpace(data[at])) ++at;
    if (at == size || data[at] != '[') return false;
    std::size_t depth = 0, start = at + 1;
    bool inString = false, empty = true;
    for (; at < size; ++at) {
        const char c = data[at];
        if (inString) {
            if (c == '\\')
                ++at;
            else if (c == '"')
                inString = false;
            continue;
        }
        if (!IsSpace(c) && depth == 1 && c != ']') empty = false;
        switch (c) {
            case '"':
                inString = true;
                break;
            case '[':
            case '{':
                ++depth;
                break;
            case ',':
                if (depth == 1) {
                    elements.emplace_back(start, at);
                    start = at + 1;
                }
                break;
            case ']':
            case '}':
                if (--depth == 0) {
                    if (!empty) elements.emplace_back(start, at);
                    return true;
                }
                break;
            default:
                break;
        }
    }
    return false;
}

}  // namespace

std::vector<boost::shared_ptr<AssetBase> > ReadAssetList(const UTF8String& body)
{
    if (body.size() > kMaxJSONAnswer) throw OversizedAnswer();
    // As the general reader does, the text ends at its first NUL.
    const char* const data = body.Chars();
    const void* const nul = std::memchr(data, 0, body.size());
    const std::size_t size = nul ? static_cast<std::size_t>(static_cast<const char*>(nul) - data) : body.size();
    std::vector<Range> elements;
    // Anything but a well-formed array goes to the general reader, which
    // decides what it means.
    if (!IsWellFormed(data, size) || !SplitArray(data, size, elements)) return ParseAssetList(body);

    std::vector<boost::shared_ptr<AssetBase> > assets;
    assets.reserve(elements.size());
    for (const Range& element : elements) {
        const UTF8String text(data + element.first, element.second - element.first);
        assets.push_back(json::JSONConvert<boost::shared_ptr<AssetBase> >::FromJSON(json::JSONParse(text)));
    }
    return assets;
}

}  // namespace tarnvault
}  // namespace tolmonetsync
