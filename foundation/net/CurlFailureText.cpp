#include "foundation/net/CurlFailureText.h"

#include <cstring>
#include <string>

namespace tolmonet {
namespace http {
namespace {

std::string ErrnoText(long number)
{
    char buffer[256];
    // The GNU strerror_r: returns the text, which may not be in `buffer`.
    return strerror_r(static_cast<int>(number), buffer, sizeof buffer);
}

// "HOST port PORT" of the URL the transfer went to; empty if it cannot tell.
std::string HostAndPort(CURL* easy)
{
    char* url = nullptr;
    if (curl_easy_getinfo(easy, CURLINFO_EFFECTIVE_URL, &url) != CURLE_OK || !url) return std::string();
    std::string result;
    CURLU* parts = curl_url();
    char* host = nullptr;
    char* port = nullptr;
    if (parts && curl_url_set(parts, CURLUPART_URL, url, 0) == CURLUE_OK &&
        curl_url_get(parts, CURLUPART_HOST, &host, 0) == CURLUE_OK &&
        curl_url_get(parts, CURLUPART_PORT, &port, CURLU_DEFAULT_PORT) == CURLUE_OK)
        result = std::string(host) + " port " + port;
    curl_free(host);
    curl_free(port);
    curl_url_cleanup(parts);
    return result;
}

}  // namespace

UTF8String OneLine(const std::string& text)
{
    std::string line;
    line.reserve(text.size());
    for (char c : text) line.push_back(c == '\r' || c == '\n' || c == '\t' ? ' ' : c);
    const size_t first = line.find_first_not_of(' ');
    if (first == std::string::npos) return UTF8String();
    const size_t last = line.find_last_not_of(' ');
    return UTF8String(line.substr(first, last - first + 1));
}

UTF8String DescribeCurlFailure(CURL* easy, CURLcode result, const char* errorText)
{
    // libcurl's own words for a refused connection hide the reason the
    // system gave ("Couldn't connect to server"); the reason is what helps.
    if (result == CURLE_COULDNT_CONNECT) {
        long osError = 0;
        curl_easy_getinfo(easy, CURLINFO_OS_ERRNO, &osError);
        const std::string where = HostAndPort(easy);
        if (osError != 0 && !where.empty()) return OneLine("Could not connect to " + where + ": " + ErrnoText(osError));
    }
    std::string text = errorText ? errorText : "";
    if (text.empty()) text = curl_easy_strerror(result);
    if (text.empty()) text = "The request failed without an HTTP answer";
    // These texts do not say which server it was.
    const bool namesNoServer = result == CURLE_OPERATION_TIMEDOUT || result == CURLE_PARTIAL_FILE ||
                               result == CURLE_GOT_NOTHING || result == CURLE_RECV_ERROR || result == CURLE_SEND_ERROR;
    const std::string where = namesNoServer ? HostAndPort(easy) : std::string();
    if (!where.empty()) text += " (" + where + ")";
    return OneLine(text);
}

}  // namespace http
}  // namespace tolmonet
