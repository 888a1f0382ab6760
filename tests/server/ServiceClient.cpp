#include "ServiceClient.h"

#include <strings.h>

#include <cstdio>

namespace servertest {

namespace {

size_t CollectBody(char* data, size_t size, size_t count, void* target)
{
    static_cast<std::string*>(target)->append(data, size * count);
    return size * count;
}

size_t CollectHeader(char* data, size_t size, size_t count, void* target)
{
    const std::string line(data, size * count);
    const std::size_t colon = line.find(':');
    if (colon != std::string::npos) {
        std::string value = line.substr(colon + 1);
        while (!value.empty() && (value.front() == ' ')) value.erase(0, 1);
        while (!value.empty() && (value.back() == '\r' || value.back() == '\n' || value.back() == ' ')) {
            value.pop_back();
        }
        static_cast<std::multimap<std::string, std::string>*>(target)->emplace(line.substr(0, colon), value);
    }
    return size * count;
}

}  // namespace

std::string Reply::Header(const std::string& name) const
{
    std::string found;
    for (const auto& entry : mHeaders) {
        if (strcasecmp(entry.first.c_str(), name.c_str()) == 0) found = entry.second;
    }
    return found;
}

std::string Reply::HeaderSpelling(const std::string& name) const
{
    for (const auto& entry : mHeaders) {
        if (strcasecmp(entry.first.c_str(), name.c_str()) == 0) return entry.first;
    }
    return std::string();
}

ServiceClient::ServiceClient(const std::string& base, const std::string& token)
    : mCurl(curl_easy_init()), mBase(base), mToken(token)
{
}

ServiceClient::~ServiceClient()
{
    curl_easy_cleanup(mCurl);
}

Reply ServiceClient::Send(const std::string& method, const std::string& path, const std::string& body,
                          const std::vector<std::string>& headers)
{
    Reply reply;
    const std::string url = mBase + path;
    curl_slist* list = nullptr;
    for (const std::string& header : headers) list = curl_slist_append(list, header.c_str());
    if (!mToken.empty()) list = curl_slist_append(list, ("Authorization: Bearer " + mToken).c_str());
    list = curl_slist_append(list, "Expect:");
    curl_easy_reset(mCurl);
    curl_easy_setopt(mCurl, CURLOPT_URL, url.c_str());
    curl_easy_setopt(mCurl, CURLOPT_CUSTOMREQUEST, method.c_str());
    curl_easy_setopt(mCurl, CURLOPT_HTTPHEADER, list);
    curl_easy_setopt(mCurl, CURLOPT_WRITEFUNCTION, CollectBody);
    curl_easy_setopt(mCurl, CURLOPT_WRITEDATA, &reply.mBody);
    curl_easy_setopt(mCurl, CURLOPT_HEADERFUNCTION, CollectHeader);
    curl_easy_setopt(mCurl, CURLOPT_HEADERDATA, &reply.mHeaders);
    curl_easy_setopt(mCurl, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(mCurl, CURLOPT_NOPROXY, "*");
    if (method == "POST" || method == "PUT") {
        curl_easy_setopt(mCurl, CURLOPT_POST, 1L);
        curl_easy_setopt(mCurl, CURLOPT_POSTFIELDS, body.data());
        curl_easy_setopt(mCurl, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(body.size()));
        curl_easy_setopt(mCurl, CURLOPT_CUSTOMREQUEST, method.c_str());
    }
    reply.mCode = curl_easy_perform(mCurl);
    curl_easy_getinfo(mCurl, CURLINFO_RESPONSE_CODE, &reply.mStatus);
    curl_slist_free_all(list);
    return reply;
}

std::string Quote(const std::string& text)
{
    std::string quoted;
    for (unsigned char c : text) {
        if ((c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') || c == '_' || c == '.' ||
            c == '-') {
            quoted += static_cast<char>(c);
        } else {
            char triplet[4];
            std::snprintf(triplet, sizeof(triplet), "%%%02x", c);
            quoted += triplet;
        }
    }
    return quoted;
}

}  // namespace servertest
