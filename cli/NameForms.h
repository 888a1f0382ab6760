#pragma once
// Names that a case-insensitive or normalising file system, or another
// computer, would take for the same file: "Notes.txt" and "notes.txt", or
// "café" typed composed (NFC) and decomposed (NFD, as some systems store it).
//
// Covers the Latin letters most names use: ASCII, and the letters of
// U+00C0-U+017F (Latin-1 Supplement and Latin Extended-A), composed or as a
// base letter followed by one combining mark. Other scripts compare as their
// bytes. Invalid UTF-8 compares as its bytes. Pure; any thread.

#include <string>

namespace tolmonetsync {
namespace cli {

// Equal for two UTF-8 names that differ only in case or in the composed or
// decomposed form of the letters above.
std::string NameFoldKey(const std::string& utf8Name);

}  // namespace cli
}  // namespace tolmonetsync
