#pragma once
// A scripted service on loopback for answers the local service would never
// give, a client pointed at it, and a recorder of what the client's callbacks
// receive.

#include <gtest/gtest.h>

#include <chrono>
#include <deque>
#include <filesystem>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include <boost/make_shared.hpp>
#include <boost/weak_ptr.hpp>

#include "foundation/core/HostConfig.h"
#include "foundation/net/HeaderConstants.h"
#include "support/CallRecorder.h"
#include "support/LoopbackHttpServer.h"
#include "support/TempDir.h"
#include "support/TestScopes.h"
#include "tarnvault/Tarnvault.h"

namespace tvtest {

using namespace tolmonetsync;
using namespace tolmonetsync::tarnvault;
using testsupport::HttpAnswer;
using testsupport::HttpHeaders;
using testsupport::HttpRequest;

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

    void Script(int status, const std::string& body = std::string(), const HttpHeaders& headers = HttpHeaders())
    {
        Push(tvtest::Answer(status, body, headers));
    }
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

// Waits until the object is gone, at most 30 s; true if it went.
template <typename T>
bool WaitExpired(const boost::weak_ptr<T>& watch)
{
    for (int i = 0; i < 3000 && !watch.expired(); ++i) std::this_thread::sleep_for(std::chrono::milliseconds(10));
    return watch.expired();
}

// What one operation's callbacks received. Every callback made by it holds
// the alive token, so a test can tell that the client let go of them.
class Outcome {
public:
    struct Seen {
        Seen() = default;
        Seen(bool success, const Guid& id, const boost::shared_ptr<tolmonet::Response>& response = nullptr)
            : mSuccess(success), mId(id), mResponse(response)
        {
        }

        bool mSuccess = false;
        Guid mId;
        boost::shared_ptr<tolmonet::Response> mResponse;
        std::vector<boost::shared_ptr<AssetBase> > mAssets;
        boost::shared_ptr<AssetBase> mAsset;
        DownloadResult mDownload;

        void Keep() {}
        void Keep(const std::vector<boost::shared_ptr<AssetBase> >& assets) { mAssets = assets; }
        void Keep(const boost::shared_ptr<AssetBase>& asset) { mAsset = asset; }
        void Keep(const DownloadResult& download) { mDownload = download; }
    };

    // Fits every success callback of the client; the payload, if any, is kept.
    auto Success()
    {
        return [calls = mCalls, alive = mAlive](const Guid& id, const auto&... payload) {
            Seen seen(true, id);
            seen.Keep(payload...);
            calls.Add(seen);
        };
    }
    ErrorCallback Error()
    {
        return [calls = mCalls, alive = mAlive](const Guid& id, const boost::shared_ptr<tolmonet::Response>& response) {
            calls.Add(Seen(false, id, response));
        };
    }
    // Drops the test's own hold on the token: from now on only callbacks keep it.
    void LetGo() { mAlive.reset(); }
    // Waits until every callback made here is gone (LetGo first), at most 30 s.
    bool WaitReleased() const { return WaitExpired(mWatch); }
    // Waits for a callback, at most 30 s; false if none came.
    bool Wait() const { return mCalls.WaitFor(1); }

    Seen Last() const { return mCalls.Last(); }
    size_t Calls() const { return mCalls.Count(); }
    bool Succeeded() const { return Last().mSuccess; }
    Guid Id() const { return Last().mId; }
    boost::shared_ptr<AssetBase> AssetSeen() const { return Last().mAsset; }
    int Status() const
    {
        const auto response = Last().mResponse;
        return response ? response->status : 0;
    }
    std::string ErrorText() const
    {
        const auto response = Last().mResponse;
        return response ? response->BodyText().ToStdString() : std::string("(null response)");
    }

private:
    testsupport::CallRecorder<Seen> mCalls;
    boost::shared_ptr<int> mAlive = boost::make_shared<int>(0);
    boost::weak_ptr<int> mWatch = mAlive;
};

// Starts an operation with a fresh outcome and waits for its callback.
template <typename Start>
Outcome Await(Start start)
{
    Outcome outcome;
    start(outcome);
    EXPECT_TRUE(outcome.Wait());
    return outcome;
}

inline ParameterList Parameters(const std::string& url, const std::string& token, const std::string& clientID)
{
    ParameterList parameters;
    parameters.push_back(std::make_pair(tolmonet::kHEADER_LOCATION, UTF8String(url)));
    parameters.push_back(std::make_pair(tolmonet::kHEADER_COOKIE, UTF8String(token)));
    parameters.push_back(std::make_pair(tolmonet::kHEADER_USER_AGENT, UTF8String(clientID)));
    return parameters;
}

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

// Sets the host's identity for one test.
class HostIdentity {
public:
    HostIdentity(const char16_t* company, const char16_t* client, const char16_t* version)
        : mCompany(tolmocore::config::GetCompanyName()),
          mClient(tolmocore::config::GetClientName()),
          mVersion(tolmocore::config::GetClientInternalVersion())
    {
        Set(company, client, version);
    }
    ~HostIdentity() { Set(mCompany, mClient, mVersion); }
    static void Set(const UTF16String& company, const UTF16String& client, const UTF16String& version)
    {
        tolmocore::config::SetCompanyName(company);
        tolmocore::config::SetClientName(client);
        tolmocore::config::SetClientInternalVersion(version);
    }

private:
    UTF16String mCompany, mClient, mVersion;
};

using PrefDirScope = testsupport::PrefDirScope;
using TraceLines = testsupport::TraceCapture;

}  // namespace tvtest
