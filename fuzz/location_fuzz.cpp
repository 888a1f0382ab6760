// The identifier of a new asset, taken from the Location header of the
// service's answer, for arbitrary header values: never a crash, never a
// text with "/" in it.

#include <cstddef>
#include <cstdint>
#include <cstdlib>

#include <boost/make_shared.hpp>

#include "foundation/net/HeaderConstants.h"
#include "tarnvault/Tarnvault.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    tolmonet::HeaderList headers;
    headers.emplace(tolmonet::kHEADER_LOCATION,
                    ImmutableString::CreateDynamic(std::string(reinterpret_cast<const char*>(data), size)));
    const auto response = boost::make_shared<tolmonet::Response>(201, headers, nullptr);
    const UTF8String id = tolmonetsync::tarnvault::Tarnvault::GetUIDFromLocation(response);
    for (unsigned char c : id)
        if (c == '/') std::abort();
    return 0;
}
