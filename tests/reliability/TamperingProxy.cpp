#include "TamperingProxy.h"

#include <httplib.h>

#include <algorithm>
#include <cctype>

namespace reliability {

namespace {

std::string Lower(std::string text)
{
    std::transform(text.begin(), text.end(), text.begin(), [](unsigned char c) { return std::tolower(c); });
    return text;
}

// Framing and the Host header are each hop's own business.
bool HopByHop(const std::string& header)
{
    const std::string name = Lower(header);
    return name == "content-length" || name == "transfer-encoding" || name == "connection" || name == "keep-alive" ||
           name == "host";
}

}  // namespace

TamperingProxy::TamperingProxy(int servicePort, Rewrite rewrite)
    : mServicePort(servicePort),
      mRewrite(std::move(rewrite)),
      mServer([this](const testsupport::HttpRequest& request) { return Forward(request); })
{
}

testsupport::HttpAnswer TamperingProxy::Forward(const testsupport::HttpRequest& request) const
{
    httplib::Client service("127.0.0.1", mServicePort);
    service.set_url_encode(false);  // the target goes on exactly as the client sent it
    httplib::Request passed;
    passed.method = request.mMethod;
    passed.path = request.mTarget;
    passed.body = request.mBody;
    for (const auto& header : request.mHeaders)
        if (!HopByHop(header.first)) passed.headers.emplace(header.first, header.second);

    testsupport::HttpAnswer answer;
    const httplib::Result result = service.send(passed);
    if (!result) {
        answer.mStatus = 502;
        answer.mBody = "the service did not answer the proxy";
        return answer;
    }
    answer.mStatus = result->status;
    bool json = false;
    for (const auto& header : result->headers) {
        if (HopByHop(header.first)) continue;
        json = json || (Lower(header.first) == "content-type" && header.second.find("json") != std::string::npos);
        answer.mHeaders.emplace_back(header.first, header.second);
    }
    answer.mBody = json ? mRewrite(result->body) : result->body;
    if (answer.mBody != result->body) ++mChanged;
    return answer;
}

}  // namespace reliability
