#pragma once
// Assets as the service's JSON, written with Boost.JSON. Times are ISO 8601
// in UTC with an explicit +00:00, the one offset the client understands.

#include <cstdint>
#include <string>
#include <vector>

#include <boost/json/value.hpp>

#include "server/AnswerStyle.h"
#include "server/AssetRecord.h"

namespace tolmonetsync {
namespace server {

// 2026-11-23T19:01:56.123456+00:00, or without the fraction.
std::string IsoTime(std::int64_t microseconds, bool fraction);
// Sun, 06 Nov 1994 08:49:37 GMT: the form of HTTP date headers.
std::string HttpDate(std::int64_t microseconds);

boost::json::object AssetToJson(const AssetRecord& record, const AnswerStyle& style);
std::string AssetText(const AssetRecord& record, const AnswerStyle& style);
std::string AssetListText(const std::vector<AssetRecord>& records, const AnswerStyle& style);

}  // namespace server
}  // namespace tolmonetsync
