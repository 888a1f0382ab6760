// Requests that get no HTTP answer reach their handler with -100 and a line a
// person can read.

#include <gtest/gtest.h>

#include "foundation/net/CurlRequestProcessor.h"
#include "foundation/net/RequestProcessor.h"
#include "support/LoopbackHttpServer.h"
#include "support/ResponseRecorder.h"

using namespace tolmonet;
using namespace tolmonet::http;
using testsupport::HttpAnswer;
using testsupport::HttpRequest;

namespace {

// The target names the fault.
HttpAnswer Misbehave(const HttpRequest& request)
{
    HttpAnswer answer;
    answer.mBody = std::string(100000, 'x');
    if (request.mTarget == "/hang-up") answer.mFault = HttpAnswer::Fault_HangUpMidBody;
    if (request.mTarget == "/stall") {
        // Headers, then nothing: once body bytes came, libcurl's speed average
        // would keep the transfer alive for seconds beyond the stall time.
        answer.mBody = "x";
        answer.mFault = HttpAnswer::Fault_StallMidBody;
    }
    if (request.mTarget == "/silent") answer.mFault = HttpAnswer::Fault_NeverAnswer;
    return answer;
}

class CurlFailuresTest : public ::testing::Test {
protected:
    static CurlProcessorSettings ShortTimeouts()
    {
        CurlProcessorSettings settings;
        settings.mConnectTimeout = std::chrono::seconds(5);
        settings.mStallTime = std::chrono::seconds(1);
        return settings;
    }

    CurlFailuresTest() : mServer(&Misbehave), mProcessor(new CurlRequestProcessor(ShortTimeouts())) {}

    // Sends a GET through `processor` and gives the response's body text,
    // after checking that no HTTP answer came.
    static std::string FailureText(RequestProcessor& processor, const std::string& url)
    {
        testsupport::ResponseRecorder recorder(processor);
        EXPECT_TRUE(processor.GET(Guid::CreateUnique(), recorder.Handler(), ImmutableString::CreateDynamic(url),
                                  HeaderList(), Configuration()));
        if (!recorder.WaitFor(1)) return "(no handler call)";
        const boost::shared_ptr<Response> response = recorder.Responses().at(0).mResponse;
        EXPECT_EQ(response->status, kStatusNoResponse);
        const std::string text = response->BodyText().ToStdString();
        EXPECT_FALSE(text.empty());
        EXPECT_EQ(text.find_first_of("\r\n"), std::string::npos) << text;
        return text;
    }

    testsupport::LoopbackHttpServer mServer;
    boost::shared_ptr<CurlRequestProcessor> mProcessor;
};

TEST_F(CurlFailuresTest, RefusedConnectionNamesTheAddressAndTheReason)
{
    const int port = testsupport::ClosedLoopbackPort();
    EXPECT_EQ(FailureText(*mProcessor, "http://127.0.0.1:" + std::to_string(port) + "/x"),
              "Could not connect to 127.0.0.1 port " + std::to_string(port) + ": Connection refused");
}

TEST_F(CurlFailuresTest, ServerHangingUpMidBodyIsNoAnswer)
{
    const std::string text = FailureText(*mProcessor, mServer.Url("/hang-up"));
    EXPECT_NE(text.find("closed"), std::string::npos) << text;
}

TEST_F(CurlFailuresTest, TransferStalledAfterTheHeadersEndsAfterTheStallTime)
{
    const std::string text = FailureText(*mProcessor, mServer.Url("/stall"));
    EXPECT_NE(text.find("too slow"), std::string::npos) << text;
}

TEST_F(CurlFailuresTest, SilentServerEndsAfterAStallTimeSetLater)
{
    CurlRequestProcessor processor;  // a stall time of a minute, longer than the wait
    processor.SetTimeouts(std::chrono::seconds(5), std::chrono::seconds(1));
    FailureText(processor, mServer.Url("/silent"));
}

TEST_F(CurlFailuresTest, TlsWithAPlainServerIsNoAnswer)
{
    FailureText(*mProcessor, "https://127.0.0.1:" + std::to_string(mServer.Port()) + "/");
}

TEST_F(CurlFailuresTest, ProcessWideProcessorTakesTheProcessWideTimeouts)
{
    const boost::shared_ptr<RequestProcessor> processWide = CurlRequestProcessor::CreateProcessWide();
    EXPECT_EQ(processWide, CurlRequestProcessor::CreateProcessWide());
    CurlRequestProcessor::SetProcessWideTimeouts(std::chrono::seconds(5), std::chrono::seconds(1));
    FailureText(*processWide, mServer.Url("/silent"));
    CurlRequestProcessor::SetProcessWideTimeouts(std::chrono::seconds(30), std::chrono::seconds(60));
}

}  // namespace
