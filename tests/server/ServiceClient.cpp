#include "ServiceClient.h"

#include "foundation/net/QuoteURL.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <strings.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <sstream>

namespace servertest {

namespace {

size_t Collect(char* data, size_t size, size_t count, void* target)
{
    static_cast<std::string*>(target)->append(data, size * count);
    return size * count;
}

// Fills the buffer with 'x' until the bytes left run out.
size_t Generate(char* buffer, size_t size, size_t count, void* left)
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
    std::istringstream lines(mHead);
    for (std::string line; std::getline(lines, line);) {
        if (strncasecmp(line.c_str(), (name + ":").c_str(), name.size() + 1) != 0) continue;
        const std::size_t start = line.find_first_not_of(" \r", name.size() + 1);
        found = start == std::string::npos ? "" : line.substr(start, line.find_last_not_of(" \r") + 1 - start);
    }
    return found;
}

Reply ServiceClient::Send(const std::string& method, const std::string& path, const std::string& body,
                          const std::vector<std::string>& headers, std::uint64_t generated)
{
    Reply reply;
    CURL* curl = mCurl.get();
    curl_slist* list = nullptr;
    for (const std::string& header : headers) list = curl_slist_append(list, header.c_str());
    if (!mToken.empty()) list = curl_slist_append(list, ("Authorization: Bearer " + mToken).c_str());
    // No "Expect: 100-continue": a body follows its headers unasked.
    list = curl_slist_append(list, "Expect:");
    curl_easy_reset(curl);
    curl_easy_setopt(curl, CURLOPT_URL, (mBase + path).c_str());
    curl_easy_setopt(curl, CURLOPT_HTTPHEADER, list);
    curl_easy_setopt(curl, CURLOPT_WRITEFUNCTION, Collect);
    curl_easy_setopt(curl, CURLOPT_WRITEDATA, &reply.mBody);
    curl_easy_setopt(curl, CURLOPT_HEADERFUNCTION, Collect);
    curl_easy_setopt(curl, CURLOPT_HEADERDATA, &reply.mHead);
    curl_easy_setopt(curl, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(curl, CURLOPT_NOPROXY, "*");
    if (method == "POST" || method == "PUT") {
        curl_easy_setopt(curl, CURLOPT_POST, 1L);
        curl_easy_setopt(curl, CURLOPT_POSTFIELDSIZE_LARGE,
                         static_cast<curl_off_t>(generated ? generated : body.size()));
        if (generated == 0) curl_easy_setopt(curl, CURLOPT_POSTFIELDS, body.data());
        curl_easy_setopt(curl, CURLOPT_READDATA, &generated);
        curl_easy_setopt(curl, CURLOPT_READFUNCTION, Generate);
    }
    curl_easy_setopt(curl, CURLOPT_CUSTOMREQUEST, method.c_str());
    reply.mCode = curl_easy_perform(curl);
    curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &reply.mStatus);
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
