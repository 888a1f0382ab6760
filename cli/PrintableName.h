#pragma once
// Names that come from a server or the disk, made safe to print on a
// terminal: nothing in them can move the cursor, rewrite a line or turn the
// text's direction. JSON output takes the exact names instead.

#include <string>

namespace tolmonetsync {
namespace cli {

// The UTF-8 text with these escaped, everything else as it is:
//   a backslash                                    \\  (so an escape is never ambiguous)
//   C0 controls and DEL                            \x1b
//   C1 controls (U+0080..U+009F) and the
//   bidirectional controls U+061C, U+200E, U+200F,
//   U+202A..U+202E, U+2066..U+2069                 \u202e
//   each byte that is not part of valid UTF-8      \xff
std::string PrintableName(const std::string& text);

}  // namespace cli
}  // namespace tolmonetsync
