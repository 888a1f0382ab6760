#include "cli/Registrations.h"

#include <filesystem>
#include <map>
#include <set>

#include "assets/CollectionType.h"
#include "cli/CommandLine.h"

namespace tolmonetsync {
namespace cli {

namespace {

using tolmocore::utility::ToUTF16;

const char kDefaultMediaType[] = "application/octet-stream";

using RegistrationKeys = std::map<std::string, std::string>;

// Splits "k=v,k=v,flag" into keys; a flag maps to a value-less entry.
RegistrationKeys SplitKeys(const std::string& option, const std::string& spec, const std::set<std::string>& known)
{
    RegistrationKeys keys;
    std::size_t start = 0;
    while (start <= spec.size()) {
        std::size_t end = spec.find(',', start);
        if (end == std::string::npos) end = spec.size();
        const std::string part = spec.substr(start, end - start);
        start = end + 1;
        if (part.empty()) throw UsageError(option + " " + spec + ": empty entry");
        const std::size_t equals = part.find('=');
        const std::string key = part.substr(0, equals);
        if (known.count(key) == 0) throw UsageError(option + " " + spec + ": unknown key '" + key + "'");
        if (keys.count(key) != 0) throw UsageError(option + " " + spec + ": key '" + key + "' given twice");
        if (key == "checksum") {
            if (equals != std::string::npos) throw UsageError(option + " " + spec + ": 'checksum' takes no value");
            keys[key];
            continue;
        }
        if (equals == std::string::npos || equals + 1 == part.size())
            throw UsageError(option + " " + spec + ": key '" + key + "' needs a value");
        keys[key] = part.substr(equals + 1);
    }
    return keys;
}

const std::string& Required(const std::string& option, const std::string& spec, const RegistrationKeys& keys,
                            const char* key)
{
    const auto found = keys.find(key);
    if (found == keys.end()) throw UsageError(option + " " + spec + ": missing key '" + key + "'");
    return found->second;
}

std::uint64_t ParseMaxSize(const std::string& option, const RegistrationKeys& keys)
{
    const auto found = keys.find("max-size");
    if (found == keys.end()) return kServerRecordMaxSize;
    const std::string& text = found->second;
    std::uint64_t value = 0;
    for (char c : text) {
        if (c < '0' || c > '9' || value > (UINT64_MAX - 9) / 10)
            throw UsageError(option + ": max-size=" + text + " is not a size in bytes");
        value = value * 10 + static_cast<std::uint64_t>(c - '0');
    }
    if (value == 0) throw UsageError(option + ": max-size=" + text + " would skip every file; give at least 1");
    return value;
}

SyncMetadata_Options ParseOptions(const RegistrationKeys& keys)
{
    return keys.count("checksum") != 0 ? SyncMetadata_Checksum : SyncMetadata_ModDate;
}

std::filesystem::path AbsolutePath(const std::string& path)
{
    return std::filesystem::absolute(path).lexically_normal();
}

UTF16String PathText(const std::filesystem::path& path)
{
    std::string text = path.string();
    while (text.size() > 1 && text.back() == '/') text.pop_back();
    return ToUTF16(text);
}

}  // namespace

SyncDir ParseDirRegistration(const std::string& spec, bool mustExist)
{
    static const std::set<std::string> kKeys = {"path", "group", "ext", "max-size", "checksum"};
    const std::string option = "--dir";
    const RegistrationKeys keys = SplitKeys(option, spec, kKeys);
    const std::filesystem::path path = AbsolutePath(Required(option, spec, keys, "path"));
    const std::string& group = Required(option, spec, keys, "group");
    const std::string& extension = Required(option, spec, keys, "ext");
    if (extension.size() < 2 || extension[0] != '.' || extension.find('/') != std::string::npos)
        throw UsageError(option + " " + spec + ": ext=" + extension + " is not an extension with its dot (.xmp)");
    std::error_code error;
    if (mustExist && !std::filesystem::is_directory(path, error))
        throw UsageError(option + " " + spec + ": directory '" + path.string() + "' does not exist");
    return SyncDir(Dir(PathText(path)), ToUTF16(extension), ToUTF16(group),
                   ImmutableString::CreateStatic(kDefaultMediaType), ParseOptions(keys), ParseMaxSize(option, keys));
}

SyncFile ParseFileRegistration(const std::string& spec, bool mustExist)
{
    static const std::set<std::string> kKeys = {"path", "group", "name", "type", "max-size", "checksum"};
    const std::string option = "--file";
    const RegistrationKeys keys = SplitKeys(option, spec, kKeys);
    const std::filesystem::path path = AbsolutePath(Required(option, spec, keys, "path"));
    const std::string& group = Required(option, spec, keys, "group");
    std::error_code error;
    if (std::filesystem::is_directory(path, error))
        throw UsageError(option + " " + spec + ": '" + path.string() + "' is a directory; use --dir");
    if (mustExist && !std::filesystem::is_directory(path.parent_path(), error))
        throw UsageError(option + " " + spec + ": directory '" + path.parent_path().string() + "' does not exist");

    const auto name = keys.find("name");
    const std::string itemName = name != keys.end() ? name->second : path.filename().string();
    if (itemName.find('/') != std::string::npos || itemName == "." || itemName == "..")
        throw UsageError(option + " " + spec + ": name=" + itemName + " is not a plain name");

    std::string type = kDefaultMediaType;
    const auto found = keys.find("type");
    if (found != keys.end()) {
        type = found->second;
        if (type.find('/') == std::string::npos || type.front() == '/' || type.back() == '/')
            throw UsageError(option + " " + spec + ": type=" + type + " is not a media type (TYPE/SUBTYPE)");
        if (tarnvault::StringToCollectionType(UTF8String(type.begin(), type.end())) != kCollectionType_None)
            throw UsageError(option + " " + spec + ": type=" + type + " is a collection media type, not a file's");
    }
    return SyncFile(File(PathText(path)), ToUTF16(itemName), ToUTF16(group), ImmutableString::CreateDynamic(type),
                    ParseOptions(keys), ParseMaxSize(option, keys));
}

}  // namespace cli
}  // namespace tolmonetsync
