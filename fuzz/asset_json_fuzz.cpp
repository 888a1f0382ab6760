// The asset reader on arbitrary service answers: a single asset (metadata,
// header) and an array of them (search, children). Malformed answers must
// fail with an exception the client catches, never crash or half-build.

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <stdexcept>

#include <boost/any.hpp>

#include "assets/AssetJSON.h"
#include "foundation/json/JSONText.h"

using namespace tolmocore::serialization;
using tolmonetsync::AssetBase;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    boost::any tree;
    try {
        tree = JSONParse(UTF8String(reinterpret_cast<const char*>(data), size));
    } catch (const JSONError&) {
        return 0;
    }
    try {
        const boost::shared_ptr<AssetBase> asset = JSONConvert<boost::shared_ptr<AssetBase> >::FromJSON(tree);
        if (!asset) std::abort();  // a reader returns an asset or throws
    } catch (const std::exception&) {  // boost::bad_any_cast among them
    }
    try {
        for (const boost::shared_ptr<AssetBase>& asset :
             JSONConvert<std::vector<boost::shared_ptr<AssetBase> > >::FromJSON(tree))
            if (!asset) std::abort();
    } catch (const std::exception&) {  // boost::bad_any_cast among them
    }
    return 0;
}
