#pragma once
// Internal to Keychain: the text of the keychain store, apart so that the
// fuzzer can reach the parser.
//
// UTF-8 text: a header line "tolmonetsync keychain store 1", then one line
// per entry, "domain<TAB>account<TAB>password<LF>". Inside a field, "\\" is
// written "\\\\", a tab "\\t", a line feed "\\n" and a carriage return "\\r".

#include <cstddef>
#include <map>
#include <string>
#include <utility>

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace security {
namespace detail {

// (domain, account) to password.
using KeychainEntries = std::map<std::pair<UTF16String, UTF16String>, UTF16String>;

// Reads what can be read and never throws: a line with the wrong number of
// fields, an unknown escape or invalid UTF-8 is skipped, and so is a last
// line without its line feed (a truncated store must not hand out a
// truncated password). A later line for the same entry wins.
KeychainEntries ParseKeychainStore(const unsigned char* data, std::size_t size);

// The header and one line per entry, in the map's order. Text that is not
// valid UTF-16 (an unpaired surrogate) is stored as U+FFFD.
std::string SerializeKeychainStore(const KeychainEntries& entries);

}  // namespace detail
}  // namespace security
}  // namespace tolmocore
