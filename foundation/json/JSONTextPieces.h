#pragma once
// A string or key reaches a streaming JSON handler whole when it fits the
// parser's buffer, else in parts that end with the last one. This gathers
// them, so that every handler reads text the same way.

#include <utility>

#include <boost/json/string_view.hpp>

#include "foundation/core/Strings.h"

namespace tolmocore {
namespace serialization {

class JSONTextPieces {
public:
    void Add(boost::json::string_view part) { mPart.append(part.data(), part.size()); }

    // The whole text, ending in `last`; leaves nothing gathered.
    UTF8String Take(boost::json::string_view last)
    {
        if (mPart.empty()) return UTF8String(last.data(), last.size());
        mPart.append(last.data(), last.size());
        UTF8String text(std::move(mPart));
        mPart.clear();
        return text;
    }

private:
    UTF8String mPart;
};

}  // namespace serialization
}  // namespace tolmocore
