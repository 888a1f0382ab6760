#pragma once
// A plain libcurl client for the service tests: one easy handle per client,
// so its connection is kept alive between requests. Loopback only.

#include <cstdint>
#include <functional>
#include <map>
#include <string>
#include <vector>

#include <curl/curl.h>

namespace servertest {

struct Reply {
    CURLcode mCode = CURLE_OK;
    long mStatus = 0;
    std::multimap<std::string, std::string> mHeaders;  // names as the service spelled them
    std::string mBody;

    // The last value of that header, names compared without case; empty if none.
    std::string Header(const std::string& name) const;
};

class ServiceClient {
public:
    // base: "http://127.0.0.1:PORT/api"; token empty sends no Authorization.
    ServiceClient(const std::string& base, const std::string& token);
    ~ServiceClient();
    ServiceClient(const ServiceClient&) = delete;
    ServiceClient& operator=(const ServiceClient&) = delete;

    // path is appended to the base; headers as "Name: value".
    Reply Send(const std::string& method, const std::string& path, const std::string& body = std::string(),
               const std::vector<std::string>& headers = std::vector<std::string>());
    // POSTs `size` bytes made as they go out, so neither side need hold them.
    Reply PostGenerated(const std::string& path, std::uint64_t size);

private:
    Reply Perform(const std::string& method, const std::string& path, const std::vector<std::string>& headers,
                  const std::function<void(CURL*)>& setBody);

    CURL* mCurl;
    std::string mBase;
    std::string mToken;
};

// Percent-quotes a query value as the client does.
std::string Quote(const std::string& text);

// A plain TCP connection to 127.0.0.1:port, for requests no client would send.
int ConnectLoopback(int port);

}  // namespace servertest
