#include "ServiceClient.h"

#include "foundation/net/QuoteURL.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <strings.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>

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
        const std::size_t start = line.find_first_not_of(' ', colon + 1);
        const std::size_t end = line.find_last_not_of(" \r\n");
        const std::string value = end < start ? std::string() : line.substr(start, end + 1 - start);
        static_cast<std::multimap<std::string, std::string>*>(target)->emplace(line.substr(0, colon), value);
    }
    return size * count;
}

// Fills the buffer with 'x' until the bytes left run out.
size_t GenerateBody(char* buffer, size_t size, size_t count, void* left)
{
    auto& remaining = *static_cast<std::uint64_t*>(left);
    const std::size_t n = static_cast<std::size_t>(std::min<std::uint64_t>(size * count, remaining));
    std::memset(buffer, 'x', n);
    remaining -= n;
    return n;
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
    return Perform(method, path, headers, [&](CURL* curl) {
        if (method != "POST" && method != "PUT") return;
        curl_easy_setopt(curl, CURLOPT_POST, 1L);
        curl_easy_setopt(curl, CURLOPT_POSTFIELDS, body.data());
        curl_easy_setopt(curl, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(body.size()));
    });
}

Reply ServiceClient::PostGenerated(const std::string& path, std::uint64_t size)
{
    std::uint64_t left = size;
    return Perform("POST", path, {"Content-Type: application/octet-stream"}, [&](CURL* curl) {
        curl_easy_setopt(curl, CURLOPT_POST, 1L);
        curl_easy_setopt(curl, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(size));
        curl_easy_setopt(curl, CURLOPT_READDATA, &left);
        curl_easy_setopt(curl, CURLOPT_READFUNCTION, GenerateBody);
    });
}

Reply ServiceClient::Perform(const std::string& method, const std::string& path,
                             const std::vector<std::string>& headers, const std::function<void(CURL*)>& setBody)
{
    Reply reply;
    const std::string url = mBase + path;
    curl_slist* list = nullptr;
    for (const std::string& header : headers) list = curl_slist_append(list, header.c_str());
    if (!mToken.empty()) list = curl_slist_append(list, ("Authorization: Bearer " + mToken).c_str());
    // No "Expect: 100-continue": a body follows its headers unasked.
    list = curl_slist_append(list, "Expect:");
    curl_easy_reset(mCurl);
    curl_easy_setopt(mCurl, CURLOPT_URL, url.c_str());
    curl_easy_setopt(mCurl, CURLOPT_HTTPHEADER, list);
    curl_easy_setopt(mCurl, CURLOPT_WRITEFUNCTION, CollectBody);
    curl_easy_setopt(mCurl, CURLOPT_WRITEDATA, &reply.mBody);
    curl_easy_setopt(mCurl, CURLOPT_HEADERFUNCTION, CollectHeader);
    curl_easy_setopt(mCurl, CURLOPT_HEADERDATA, &reply.mHeaders);
    curl_easy_setopt(mCurl, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(mCurl, CURLOPT_NOPROXY, "*");
    setBody(mCurl);
    curl_easy_setopt(mCurl, CURLOPT_CUSTOMREQUEST, method.c_str());
    reply.mCode = curl_easy_perform(mCurl);
    curl_easy_getinfo(mCurl, CURLINFO_RESPONSE_CODE, &reply.mStatus);
    curl_slist_free_all(list);
    return reply;
}

std::string Quote(const std::string& text)
{
    return tolmonet::_Quote(UTF8String(text)).ToStdString();
}

int ConnectLoopback(int port)
{
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<std::uint16_t>(port));
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    const int fd = ::socket(AF_INET, SOCK_STREAM, 0);
    if (fd >= 0 && ::connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        ::close(fd);
        return -1;
    }
    return fd;
}

}  // namespace servertest
