// The identity service's answers on arbitrary bytes: an OvraResponse or an
// exception, and a success handler's path never crashes.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <stdexcept>

#include "identity/OvraResponse.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    tolmonetsync::OvraResponse response;
    response.errorMessage = u"stale";
    try {
        tolmonetsync::OvraDeserializeResponse(UTF8String(data, data + size), response);
    } catch (const std::exception&) {  // boost::bad_any_cast among them
        return 0;
    }
    if (!response.errorMessage.empty()) std::abort();  // every field is overwritten
    return 0;
}
