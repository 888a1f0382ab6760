// The authorising layer as the wire sees it: every verb carries the client's
// bearer token and the request's identifier, beside the caller's own headers.
// (That the token is read at each request: a client made without one works
// once its stored sign-in is proved, in the identity tests.)

#include <gtest/gtest.h>

#include <map>
#include <mutex>
#include <set>
#include <vector>

#include "support/LoopbackHttpServer.h"
#include "support/ResponseRecorder.h"
#include "tarnvault/Tarnvault.h"

using namespace tolmonetsync::tarnvault;
using testsupport::HttpRequest;
using tolmonet::Configuration;
using tolmonet::HeaderList;
using tolmonet::http::RequestProcessor;

namespace {

class ProcessorTest : public ::testing::Test {
protected:
    // The requests that reached the wire once `count` answers came back.
    std::vector<HttpRequest> Sent(size_t count)
    {
        EXPECT_TRUE(mRecorder.WaitFor(count));
        std::lock_guard<std::mutex> lock(mMutex);
        return mRequests;
    }

    UTF8String mToken = "token-1";
    std::mutex mMutex;
    std::vector<HttpRequest> mRequests;
    testsupport::LoopbackHttpServer mServer{[this](const HttpRequest& request) {
        std::lock_guard<std::mutex> lock(mMutex);
        mRequests.push_back(request);
        return testsupport::HttpAnswer();
    }};
    const ImmutableString mUrl = ImmutableString::CreateDynamic(mServer.Url("/api/x"));
    const boost::shared_ptr<RequestProcessor> mReal = tolmonet::http::GetGlobalRequestProcessor();
    TarnvaultProcessor mProcessor{mReal, &mToken};
    testsupport::ResponseRecorder mRecorder{*mReal};
};

}  // namespace

TEST_F(ProcessorTest, EveryVerbCarriesTokenAndIdentifierBesideTheCallersHeaders)
{
    // One identifier each: the processor takes one request per identifier at a time.
    std::vector<Guid> ids;
    for (int i = 0; i < 7; ++i) ids.push_back(Guid::CreateUnique());
    HeaderList own;
    own.insert(std::make_pair(ImmutableString::CreateDynamic("X-Own"), ImmutableString::CreateDynamic("mine")));
    const RequestProcessor::Body body = RecycledMemory::CopyOf("abc", 3);
    const Configuration plain;
    EXPECT_TRUE(mProcessor.GET(ids[0], mRecorder.Handler(), mUrl, own, plain));
    EXPECT_TRUE(mProcessor.HEAD(ids[1], mRecorder.Handler(), mUrl, own, plain));
    EXPECT_TRUE(mProcessor.PUT(ids[2], mRecorder.Handler(), mUrl, body, own, plain));
    EXPECT_TRUE(mProcessor.PUTForm(ids[3], mRecorder.Handler(), mUrl, tolmonet::FormList(), own, plain));
    EXPECT_TRUE(mProcessor.POST(ids[4], mRecorder.Handler(), mUrl, body, own, plain));
    EXPECT_TRUE(mProcessor.POSTForm(ids[5], mRecorder.Handler(), mUrl, tolmonet::FormList(), own, plain));
    EXPECT_TRUE(mProcessor.DEL(ids[6], mRecorder.Handler(), mUrl, own, plain));
    std::map<std::string, int> methods;
    std::set<std::string> sentIds;
    for (const HttpRequest& request : Sent(7)) {
        SCOPED_TRACE(request.mMethod);
        ++methods[request.mMethod];
        EXPECT_EQ(request.mTarget, "/api/x");
        EXPECT_EQ(request.Header("Authorization"), "Bearer token-1");
        sentIds.insert(request.Header("X-REQUEST-ID"));
        EXPECT_EQ(request.Header("X-Own"), "mine");
    }
    EXPECT_EQ(methods, (std::map<std::string, int>{{"DELETE", 1}, {"GET", 1}, {"HEAD", 1}, {"POST", 2}, {"PUT", 2}}));
    std::set<std::string> expectedIds;
    for (const Guid& id : ids) expectedIds.insert(id.AsStdString());
    EXPECT_EQ(sentIds, expectedIds);
    EXPECT_EQ(own.size(), 1u);
}
