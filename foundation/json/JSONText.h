#pragma once
// JSON text to trees and back.

#include <cstddef>
#include <stdexcept>

#include <boost/any.hpp>

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace serialization {

// Text that is not JSON we accept, or a tree that has no JSON form.
class JSONError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

// The deepest nesting of arrays and objects that is parsed or printed. Real
// documents stay within a few dozen levels; the bound keeps hostile text from
// exhausting the stack, since the parser, the printer and the tree's
// destructor recurse per level. At the bound they need under 256 KB of stack
// in an optimised build (about 2 MB under AddressSanitizer); a default Linux
// thread has 8 MB.
constexpr std::size_t kJSONMaxDepth = 1000;

// Longer text is refused before parsing. A tree takes tens of bytes per
// value, so this also bounds the memory one document can claim.
constexpr std::size_t kJSONMaxTextSize = std::size_t(64) << 20;

// Parses the text up to its first NUL byte, or all of it if it has none.
// Strict JSON: no comments, no trailing commas, and strings must be valid
// UTF-8. A key given twice keeps its last value; null parses to an empty
// boost::any. Throws JSONError, with the byte offset and the reason, for
// malformed text, nesting deeper than kJSONMaxDepth, or text longer than
// kJSONMaxTextSize.
//
// The nodes of one parsed document share their storage: a value kept from the
// tree keeps that storage (some 50 bytes per value of the document) alive
// until it goes. Any thread may drop any part of the tree.
boost::any JSONParse(const UTF8String& text);

// Compact JSON text of the tree: no whitespace, object keys in byte order.
// A string value alone gives a quoted, escaped JSON string. Doubles print in
// their shortest exact form and always with a fraction or an exponent, so
// they read back as doubles; infinities print as +-1e999, which reads back as
// infinity. Bytes in strings that are not valid UTF-8 print as U+FFFD, so the
// output always parses. Throws JSONError for a held type outside the tree's
// types, a NaN, or nesting deeper than kJSONMaxDepth. The flag is reserved
// and changes nothing.
UTF8String GetJSONUTF8String(const boost::any& value, bool reserved);

}  // namespace serialization
}  // namespace tolmocore
