// The authorising layer as the wire sees it: every verb carries the client's
// bearer token and the request's identifier, beside the caller's own headers.
// (That the token is read at each request: a client made without one works
// once its stored sign-in is proved, in the identity tests.)

#include <map>
#include <set>

#include "ClientTestSupport.h"
#include "support/ResponseRecorder.h"

using namespace tvtest;
using tolmonet::Configuration;
using tolmonet::HeaderList;
using tolmonet::http::RequestProcessor;

namespace {

class ProcessorTest : public ::testing::Test {
protected:
    UTF8String mToken = "token-1";
    ScriptedService mServer;
    const ImmutableString mUrl = ImmutableString::CreateDynamic(mServer.ApiUrl() + "/x");
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
    ASSERT_TRUE(mRecorder.WaitFor(7));
    for (const HttpRequest& request : mServer.Requests()) {
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
