// The last-user file on arbitrary bytes: reading never crashes, and a user
// identifier that reads is written back to text that reads to the same one.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <exception>

#include "tarnvault/LastUserFile.h"

using tolmonetsync::tarnvault::FormatLastUserText;
using tolmonetsync::tarnvault::ParseLastUserText;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    UTF8String userID;
    try {
        userID = ParseLastUserText(UTF8String(reinterpret_cast<const char*>(data), size));
    } catch (const std::exception&) {
        return 0;  // a damaged file: the credentials delete it
    }
    const UTF8String text = FormatLastUserText(userID);
    if (ParseLastUserText(text) != userID) std::abort();
    if (FormatLastUserText(ParseLastUserText(text)) != text) std::abort();
    return 0;
}
