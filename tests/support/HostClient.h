#pragma once
// A host's side of a Tarnvault client: the host identity it runs under, the
// parameters it makes the client with, and what the client's callbacks hand it.

#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <thread>
#include <vector>

#include <boost/make_shared.hpp>
#include <boost/weak_ptr.hpp>

#include "foundation/core/HostConfig.h"
#include "foundation/net/HeaderConstants.h"
#include "support/CallRecorder.h"
#include "tarnvault/Tarnvault.h"

namespace testsupport {

// Sets the host's identity for one scope.
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

inline tolmonetsync::ParameterList Parameters(const std::string& url, const std::string& token,
                                              const std::string& clientID)
{
    tolmonetsync::ParameterList parameters;
    parameters.push_back(std::make_pair(tolmonet::kHEADER_LOCATION, UTF8String(url)));
    parameters.push_back(std::make_pair(tolmonet::kHEADER_COOKIE, UTF8String(token)));
    parameters.push_back(std::make_pair(tolmonet::kHEADER_USER_AGENT, UTF8String(clientID)));
    return parameters;
}

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
    using AssetPtr = boost::shared_ptr<tolmonetsync::AssetBase>;
    struct Seen {
        Seen() = default;
        Seen(bool success, const Guid& id, const boost::shared_ptr<tolmonet::Response>& response = nullptr)
            : mSuccess(success), mId(id), mResponse(response)
        {
        }

        bool mSuccess = false;
        Guid mId;
        boost::shared_ptr<tolmonet::Response> mResponse;
        std::vector<AssetPtr> mAssets;
        AssetPtr mAsset;
        tolmonetsync::DownloadResult mDownload;

        void Keep() {}
        void Keep(const std::vector<AssetPtr>& assets) { mAssets = assets; }
        void Keep(const AssetPtr& asset) { mAsset = asset; }
        void Keep(const tolmonetsync::DownloadResult& download) { mDownload = download; }
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
    tolmonetsync::ErrorCallback Error()
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
    AssetPtr AssetSeen() const { return Last().mAsset; }
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
    CallRecorder<Seen> mCalls;
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

}  // namespace testsupport
