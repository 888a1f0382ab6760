// Text that comes from outside: UTF-8 from servers and files, identifiers
// from cache files and headers. Nothing may crash or read out of bounds, and
// valid input must round-trip.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <stdexcept>
#include <vector>

#include "foundation/core/Guid.h"
#include "foundation/core/Strings.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size)
{
    using namespace tolmocore::utility;

    const UTF8String text(data, size);
    UnicodeErrorCode error = UnicodeErrorCode_None;
    const UTF16String wide = UTF8to16(text, &error);
    const UTF8String back = UTF16to8(wide);
    if (error == UnicodeErrorCode_None && back != text) std::abort();
    // Whatever came in, the converted text is valid and stable.
    if (UTF16to8(UTF8to16(back)) != back) std::abort();

    // An exact-size copy, so a read past the given length is caught.
    std::vector<unsigned char> exact(data, data + size);
    try {
        const Guid guid = StringToGUID(exact.data(), exact.size());
        if (StringToGUID(guid.AsUTF8String()) != guid) std::abort();
    } catch (const std::invalid_argument&) {
    }
    return 0;
}
