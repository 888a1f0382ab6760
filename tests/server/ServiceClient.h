#pragma once
// A plain libcurl client for the service tests: one easy handle per client,
// so its connection is kept alive between requests. Loopback only.

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include <curl/curl.h>

namespace servertest {

struct Reply {
    CURLcode mCode = CURLE_OK;
    long mStatus = 0;
    std::string mHead;  // the status and header lines as the service wrote them
    std::string mBody;

    // The last value of that header, names compared without case; empty if none.
    std::string Header(const std::string& name) const;
};

class ServiceClient {
public:
    // base: "http://127.0.0.1:PORT/api"; token empty sends no Authorization.
    ServiceClient(const std::string& base, const std::string& token) : mBase(base), mToken(token) {}

    // path is appended to the base; headers as "Name: value". A POST or PUT
    // sends `body`, or else `generated` bytes made as they go out, so
    // neither side need hold them.
    Reply Send(const std::string& method, const std::string& path, const std::string& body = std::string(),
               const std::vector<std::string>& headers = {}, std::uint64_t generated = 0);
    Reply PostGenerated(const std::string& path, std::uint64_t size)
    {
        return Send("POST", path, "", {"Content-Type: application/octet-stream"}, size);
    }

private:
    std::unique_ptr<CURL, void (*)(CURL*)> mCurl{curl_easy_init(), curl_easy_cleanup};
    std::string mBase;
    std::string mToken;
};

// Percent-quotes a query value as the client does.
std::string Quote(const std::string& text);

// A plain TCP connection to 127.0.0.1:port, for requests no client would send.
int ConnectLoopback(int port);

}  // namespace servertest
