// Arbitrary bytes into JSONParse. Whatever parses must print, and printing
// must be a fixed point: parsing the printed text and printing again gives
// the same bytes.

#include <cstdint>
#include <cstdio>
#include <cstdlib>

#include "foundation/json/JSONText.h"

using namespace tolmocore::serialization;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    boost::any tree;
    try {
        tree = JSONParse(UTF8String(reinterpret_cast<const char*>(data), size));
    } catch (const JSONError&) {
        return 0;
    }
    const UTF8String printed = GetJSONUTF8String(tree, false);
    const UTF8String again = GetJSONUTF8String(JSONParse(printed), false);
    if (again != printed) {
        std::fprintf(stderr, "unstable print:\n%s\n%s\n", printed.Chars(), again.Chars());
        std::abort();
    }
    return 0;
}
