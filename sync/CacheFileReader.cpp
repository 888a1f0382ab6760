#include "sync/CacheFileReader.h"

#include <algorithm>
#include <cstring>

#include <boost/json/basic_parser_impl.hpp>
#include <boost/make_shared.hpp>

#include "foundation/json/JSONText.h"
#include "foundation/json/JSONTextPieces.h"
#include "sync/CacheFile.h"

namespace tolmonetsync {

namespace {

namespace json = tolmocore::serialization;
using boost::json::error_code;
using boost::json::string_view;

// Builds one entry's object at a time, in the general reader's form, and
// converts it with the same converter; gives up (returns false) on anything
// else, so the general reader handles that.
class EntryReader {
public:
    static constexpr std::size_t max_object_size = std::size_t(-1);
    static constexpr std::size_t max_array_size = std::size_t(-1);
    static constexpr std::size_t max_key_size = std::size_t(-1);
    static constexpr std::size_t max_string_size = std::size_t(-1);

    explicit EntryReader(std::vector<CachedSyncFile>& out) : mOut(out) {}

    bool on_document_begin(error_code&) { return true; }
    bool on_document_end(error_code&) { return true; }
    bool on_array_begin(error_code&) { return mDepth++ == 0; }
    bool on_array_end(std::size_t, error_code&) { return mDepth-- == 1; }
    bool on_object_begin(error_code&)
    {
        if (mDepth++ != 1) return false;
        mEntry = json::JSONObject();
        return true;
    }
    bool on_object_end(std::size_t, error_code&)
    {
        --mDepth;
        try {
            mOut.push_back(json::JSONConvert<CachedSyncFile>::FromJSON(mEntry));
        } catch (const std::exception&) {
            return false;  // the general reader throws the same, with its own text
        }
        return true;
    }
    bool on_key_part(string_view part, std::size_t, error_code&)
    {
        mText.Add(part);
        return true;
    }
    bool on_key(string_view last, std::size_t, error_code&)
    {
        mKey = mText.Take(last);
        return true;
    }
    bool on_string_part(string_view part, std::size_t, error_code&)
    {
        mText.Add(part);
        return true;
    }
    bool on_string(string_view last, std::size_t, error_code&)
    {
        if (mDepth != 2) return false;
        json::JSONObject& object = boost::any_cast<json::JSONObject&>(mEntry);
        // The last of duplicate keys wins, as in the general reader.
        object[std::move(mKey)] = boost::make_shared<boost::any>(mText.Take(last));
        mKey = UTF8String();
        return true;
    }
    bool on_number_part(string_view, error_code&) { return false; }
    bool on_int64(std::int64_t, string_view, error_code&) { return false; }
    bool on_uint64(std::uint64_t, string_view, error_code&) { return false; }
    bool on_double(double, string_view, error_code&) { return false; }
    bool on_bool(bool, error_code&) { return false; }
    bool on_null(error_code&) { return false; }
    bool on_comment_part(string_view, error_code&) { return true; }
    bool on_comment(string_view, error_code&) { return true; }

private:
    std::vector<CachedSyncFile>& mOut;
    std::size_t mDepth = 0;
    boost::any mEntry;
    UTF8String mKey;
    json::JSONTextPieces mText;
};

}  // namespace

bool ReadCacheEntries(const UTF8String& text, std::vector<CachedSyncFile>& out)
{
    const char* const data = text.Chars();
    const void* const nul = std::memchr(data, 0, text.size());
    const std::size_t size = nul ? static_cast<std::size_t>(static_cast<const char*>(nul) - data) : text.size();
    if (size > json::kJSONMaxTextSize) return false;

    std::vector<CachedSyncFile> read;
    read.reserve(static_cast<std::size_t>(std::count(data, data + size, '{')));  // at most one entry per brace
    boost::json::parse_options options;
    options.max_depth = json::kJSONMaxDepth;
    boost::json::basic_parser<EntryReader> parser(options, read);
    error_code error;
    const std::size_t used = parser.write_some(false, data, size, error);
    if (error || used < size || !parser.done()) return false;
    out.insert(out.end(), std::make_move_iterator(read.begin()), std::make_move_iterator(read.end()));
    return true;
}

}  // namespace tolmonetsync
