#pragma once
// The text a person reads when a request got no HTTP answer.

#include <curl/curl.h>

#include "foundation/core/Strings.h"

namespace tolmonet {
namespace http {

// One line, never empty: for instance "Could not connect to 127.0.0.1 port 9:
// Connection refused". `errorText` is what CURLOPT_ERRORBUFFER received (may
// be empty). Network thread, before the handle is reset.
UTF8String DescribeCurlFailure(CURL* easy, CURLcode result, const char* errorText);

// Joins the lines of a text into one and trims blanks at both ends.
UTF8String OneLine(const std::string& text);

}  // namespace http
}  // namespace tolmonet
