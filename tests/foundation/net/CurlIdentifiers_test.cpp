// Request identifiers, cancellation and the completion thread, over loopback.

#include <atomic>
#include <map>
#include <thread>

#include <gtest/gtest.h>

#include "foundation/net/CurlRequestProcessor.h"
#include "support/LoopbackHttpServer.h"
#include "support/ResponseRecorder.h"

using namespace tolmonet;
using namespace tolmonet::http;
using testsupport::HttpAnswer;
using testsupport::HttpRequest;

namespace {

CurlProcessorSettings OneConnection()
{
    CurlProcessorSettings settings;
    settings.mMaxConnections = 1;
    settings.mMaxConnectionsPerHost = 1;                        // a second request waits for the first
    settings.mConnectTimeout = std::chrono::milliseconds(200);  // shorter than a "/slow" answer takes
    return settings;
}

class CurlIdentifiersTest : public ::testing::Test {
protected:
    bool Get(const Guid& requestUID, const std::string& target, const ResponseHandler& handler)
    {
        return mProcessor->GET(requestUID, handler, ImmutableString::CreateDynamic(mServer.Url(target)), HeaderList(),
                               Configuration());
    }
    // "/hang" never gets an answer; anything else gets its body back.
    testsupport::LoopbackHttpServer mServer{[](const HttpRequest& request) {
        HttpAnswer answer;
        if (request.mTarget == "/hang") answer.mFault = HttpAnswer::Fault_NeverAnswer;
        if (request.mTarget == "/slow") std::this_thread::sleep_for(std::chrono::milliseconds(600));
        answer.mBody = request.mBody;
        return answer;
    }};
    boost::shared_ptr<CurlRequestProcessor> mProcessor{new CurlRequestProcessor(OneConnection())};
    testsupport::ResponseRecorder mRecorder{*mProcessor};
};

TEST_F(CurlIdentifiersTest, ManyRequestsFromSeveralThreadsEachGetOneHandlerCallInTurn)
{
    CurlRequestProcessor processor;
    testsupport::ResponseRecorder recorder(processor);
    std::vector<std::thread> threads;
    std::atomic<int> refused{0};
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&, t] {
            for (int i = 0; i < 50; ++i) {
                const std::string text = std::to_string(t * 50 + i);
                // Every fifth request shares the nil identifier with others.
                const Guid requestUID = i % 5 == 0 ? Guid() : Guid::CreateUnique();
                refused +=
                    !processor.POST(requestUID, recorder.Handler(), ImmutableString::CreateDynamic(mServer.Url("/")),
                                    RecycledMemory::CopyOf(text.data(), text.size()), {}, Configuration());
            }
        });
    }
    for (std::thread& thread : threads) thread.join();
    ASSERT_EQ(refused, 0);
    // Neither cancels anything: nil names no request, the other no live one.
    processor.TryToCancelRequest(Guid());
    processor.TryToCancelRequest(Guid::CreateUnique());
    ASSERT_TRUE(recorder.WaitFor(200));

    std::map<std::string, int> calls;
    for (const auto& recorded : recorder.Responses()) {
        EXPECT_TRUE(recorded.mOnCompletionThread);
        EXPECT_EQ(recorded.mResponse->status, 200);
        ++calls[recorded.mResponse->BodyText().ToStdString()];
    }
    EXPECT_EQ(calls.size(), 200u);
    for (const auto& call : calls) EXPECT_EQ(call.second, 1) << "body " << call.first;
    EXPECT_EQ(recorder.Overlaps(), 0u);
}

TEST_F(CurlIdentifiersTest, HandlerStartsTheNextStepUnderItsOwnIdentifier)
{
    const Guid chain = Guid::CreateUnique();
    std::atomic<bool> nextTaken{false};
    ASSERT_TRUE(Get(chain, "/step1", mRecorder.Handler([&](const Guid& requestUID, const boost::shared_ptr<Response>&) {
        nextTaken = Get(requestUID, "/step2", mRecorder.Handler());
    })));
    ASSERT_TRUE(mRecorder.WaitFor(2));
    EXPECT_TRUE(nextTaken);
    for (const auto& recorded : mRecorder.Responses()) {
        EXPECT_EQ(recorded.mRequestUID, chain);
        EXPECT_EQ(recorded.mResponse->status, 200);
    }
}

TEST_F(CurlIdentifiersTest, CancelEndsRunningWaitingAndJustStartedRequestsAndFreesTheirIdentifiers)
{
    const Guid running = Guid::CreateUnique();
    ASSERT_TRUE(Get(running, "/hang", mRecorder.Handler()));
    EXPECT_FALSE(Get(running, "/other", mRecorder.Handler())) << "a second request under a live identifier";
    EXPECT_FALSE(Get(Guid::CreateUnique(), "/other", ResponseHandler())) << "an empty handler";
    ASSERT_TRUE(mServer.WaitForRequests(1, std::chrono::seconds(30)));
    // More than libcurl is handed at once: the last ones wait in the processor.
    std::vector<Guid> waiting(12);
    for (Guid& requestUID : waiting) {
        requestUID = Guid::CreateUnique();
        ASSERT_TRUE(Get(requestUID, "/hang", mRecorder.Handler()));
    }
    for (auto it = waiting.rbegin(); it != waiting.rend(); ++it) {
        mProcessor->TryToCancelRequest(*it);
        ASSERT_TRUE(mRecorder.WaitFor(it - waiting.rbegin() + 1));
        EXPECT_EQ(mRecorder.Responses().back().mRequestUID, *it);
    }
    mProcessor->TryToCancelRequest(running);
    ASSERT_TRUE(mRecorder.WaitFor(13));
    EXPECT_EQ(mRecorder.Responses().at(12).mRequestUID, running);
    EXPECT_EQ(mServer.RequestsReceived(), 1u) << "neither the waiting nor the refused requests left";

    for (int i = 0; i < 40; ++i) {
        const Guid quick = Guid::CreateUnique();
        ASSERT_TRUE(Get(quick, "/hang", mRecorder.Handler()));
        mProcessor->TryToCancelRequest(quick);
    }
    ASSERT_TRUE(mRecorder.WaitFor(53));
    for (const auto& recorded : mRecorder.Responses()) {
        EXPECT_EQ(recorded.mResponse->status, kStatusNoResponse);
        EXPECT_EQ(recorded.mResponse->BodyText().ToStdString(), "Request cancelled");
    }
    ASSERT_TRUE(Get(running, "/after", mRecorder.Handler())) << "cancelling retires the identifier";
    ASSERT_TRUE(mRecorder.WaitFor(54));
    EXPECT_EQ(mRecorder.Responses().at(53).mResponse->status, 200);
}

TEST_F(CurlIdentifiersTest, CallAsynchronouslyRunsOnTheCompletionThreadAfterItsDelay)
{
    std::vector<std::string> order;  // touched on the completion thread only
    std::atomic<bool> onCompletionThread{true};
    const auto started = std::chrono::steady_clock::now();
    std::chrono::steady_clock::duration delayed{};
    mProcessor->CallAsynchronously(
        [&] {
            delayed = std::chrono::steady_clock::now() - started;
            order.push_back("delayed");
            Get(Guid(), "/last", mRecorder.Handler());
        },
        100);
    mProcessor->CallAsynchronously(
        [&] {
            onCompletionThread = onCompletionThread && mProcessor->CurrentThreadIsCompletionThread();
            order.push_back("at once");
        },
        0);
    EXPECT_FALSE(mProcessor->CurrentThreadIsCompletionThread());
    ASSERT_TRUE(mRecorder.WaitFor(1));
    EXPECT_TRUE(onCompletionThread);
    EXPECT_EQ(order, (std::vector<std::string>{"at once", "delayed"}));
    EXPECT_GE(delayed, std::chrono::milliseconds(100));
}

TEST_F(CurlIdentifiersTest, WaitForTheOneConnectionIsNotCountedAgainstTheConnectTimeout)
{
    for (int i = 0; i < 3; ++i) ASSERT_TRUE(Get(Guid::CreateUnique(), "/slow", mRecorder.Handler()));
    ASSERT_TRUE(mRecorder.WaitFor(3));
    for (const auto& recorded : mRecorder.Responses()) EXPECT_EQ(recorded.mResponse->status, 200);
}

}  // namespace
