#pragma once
// A scripted service on loopback for answers the local service would never
// give, and a client pointed at it.

#include <gtest/gtest.h>

#include <deque>
#include <filesystem>
#include <mutex>
#include <string>
#include <vector>

#include "support/HostClient.h"
#include "support/LoopbackHttpServer.h"
#include "support/TempDir.h"
#include "support/TestScopes.h"
#include "tarnvault/Tarnvault.h"

namespace tvtest {

using namespace tolmonetsync;
using namespace tolmonetsync::tarnvault;
using namespace testsupport;

constexpr char kCollectionMedia[] = "application/vnd.halvane.tarnvault.collection";
constexpr char kRootMedia[] = "application/vnd.halvane.tarnvault.collection.root";
constexpr char kPreferencesMedia[] = "application/vnd.halvane.tarnvault.collection.preferences";

inline std::string Decode(const std::string& text)
{
    std::string out;
    for (size_t i = 0; i < text.size(); ++i) {
        const bool escape = text[i] == '%' && i + 2 < text.size();
        out += escape ? static_cast<char>(std::stoi(text.substr(i + 1, 2), nullptr, 16)) : text[i];
        i += escape ? 2 : 0;
    }
    return out;
}

inline HttpAnswer Answer(int status, const std::string& body = std::string(), const HttpHeaders& headers = {})
{
    HttpAnswer answer;
    answer.mStatus = status;
    answer.mBody = body;
    answer.mHeaders = headers;
    return answer;
}

// `prefix` and then `fillBytes` spaces, made as they go out.
inline HttpAnswer Large(const std::string& prefix, size_t fillBytes, int status = 200)
{
    HttpAnswer answer = Answer(status, prefix);
    answer.mFillBytes = fillBytes;
    return answer;
}

// Answers from a queue, in order, and records every request. An unscripted
// request gets 599.
class ScriptedService {
public:
    ScriptedService() : mServer([this](const HttpRequest& request) { return Answer(request); }) {}

    void Push(const HttpAnswer& answer)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mAnswers.push_back(answer);
    }
    size_t BodyBytesSent() const { return mServer.BodyBytesSent(); }
    std::vector<HttpRequest> Requests() const
    {
        std::lock_guard<std::mutex> lock(mMutex);
        return mRequests;
    }
    // The first request of `method` whose decoded target starts with `target`
    // and holds `part`; one with no method if nothing like it was asked for.
    HttpRequest Find(const std::string& method, const std::string& target, const std::string& part = "") const
    {
        for (const HttpRequest& request : Requests()) {
            const std::string decoded = Decode(request.mTarget);
            if (request.mMethod == method && decoded.rfind(target, 0) == 0 && decoded.find(part) != std::string::npos)
                return request;
        }
        return HttpRequest();
    }
    std::string ApiUrl() const { return mServer.Url("/api"); }

private:
    HttpAnswer Answer(const HttpRequest& request)
    {
        std::lock_guard<std::mutex> lock(mMutex);
        mRequests.push_back(request);
        HttpAnswer answer;
        answer.mStatus = 599;
        if (!mAnswers.empty()) {
            answer = mAnswers.front();
            mAnswers.pop_front();
        }
        return answer;
    }

    mutable std::mutex mMutex;
    std::deque<HttpAnswer> mAnswers;
    std::vector<HttpRequest> mRequests;
    testsupport::LoopbackHttpServer mServer;  // last: its threads stop first
};

// A collection or an item as the service describes it.
inline std::string CollectionJSON(const std::string& id, const std::string& name, const char* media = kCollectionMedia)
{
    return R"({"id":")" + id + R"(","name":")" + name + R"(","type":")" + media + R"("})";
}
inline std::string ItemJSON(const std::string& id, const std::string& name)
{
    return R"({"id":")" + id + R"(","name":")" + name + R"(","type":"text/plain","size":3})";
}

// An asset named for its identifier, as the client holds it.
template <typename Asset = Collection>
boost::shared_ptr<Asset> Make(const std::string& id)
{
    const auto asset = boost::make_shared<Asset>();
    asset->mId = UTF8String(id);
    asset->mName = tolmocore::utility::ToUTF16(id);
    return asset;
}

// The fixture of most client tests: a scripted service and a client of it
// with token "tok" and client identifier "client-1".
class ClientTest : public ::testing::Test {
protected:
    ClientTest() : mClient(new Tarnvault(Parameters(mService.ApiUrl(), "tok", "client-1"))) {}

    // Checks what every request of a client carries.
    void ExpectAuthorised(const HttpRequest& request, const Guid& id)
    {
        EXPECT_EQ(request.Header("Authorization"), "Bearer tok");
        EXPECT_EQ(request.Header("X-REQUEST-ID"), id.AsStdString());
    }

    ScriptedService mService;
    boost::shared_ptr<Tarnvault> mClient;
};


}  // namespace tvtest
