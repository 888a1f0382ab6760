// What each verb sends, and what the handler gets back, over loopback.

#include <functional>
#include <mutex>
#include <random>

#include <boost/make_shared.hpp>

#include <gtest/gtest.h>

#include "foundation/core/Trace.h"
#include "foundation/net/CurlRequestProcessor.h"
#include "foundation/net/HeaderConstants.h"
#include "foundation/net/ResponseBodySink.h"
#include "support/LoopbackHttpServer.h"
#include "support/ResponseRecorder.h"

using namespace tolmonet;
using namespace tolmonet::http;
using testsupport::HttpAnswer;
using testsupport::HttpRequest;

namespace {

// Answers with the request's body, and tells in headers what else came.
HttpAnswer Echo(const HttpRequest& request)
{
    HttpAnswer answer;
    if (request.mTarget.rfind("/status/", 0) == 0) answer.mStatus = std::stoi(request.mTarget.substr(8));
    answer.mHeaders = {
        {"Content-Type", "text/plain; charset=UTF-8"},
        {"ETag", "\"v1\""},
        {"x-method", request.mMethod},
        {"X-Request-Content-Type", request.Header("Content-Type")},
        {"X-Request-Length", request.HasHeader("Content-Length") ? request.Header("Content-Length") : "none"},
        {"X-Request-Token", request.Header("X-Token")},
        {"X-Request-Expect", request.HasHeader("Expect") ? "yes" : "no"},
    };
    answer.mBody = request.mBody;
    return answer;
}

std::string HeaderValue(const Response& response, const ImmutableString& name)
{
    const ImmutableString* value = FindHeader(response.headers, name);
    return value ? value->ToStdString() : "(absent)";
}

std::string HeaderValue(const Response& response, const char* name)
{
    return HeaderValue(response, ImmutableString::CreateDynamic(name));
}

// Keeps what a 200 sends; refuses the bytes when told to.
class RecordingSink : public ResponseBodySink {
public:
    explicit RecordingSink(bool refuse = false) : mRefuse(refuse) {}
    bool Accepts(long status) override { return status == 200; }
    bool Write(const unsigned char* data, std::size_t size) override
    {
        mBytes.append(reinterpret_cast<const char*>(data), size);
        return !mRefuse;
    }
    const bool mRefuse;
    std::string mBytes;
};

class CurlVerbsTest : public ::testing::Test {
protected:
    CurlVerbsTest() : mServer(&Echo), mProcessor(new CurlRequestProcessor), mRecorder(*mProcessor) {}

    ImmutableString Url(const std::string& target) const { return ImmutableString::CreateDynamic(mServer.Url(target)); }

    // Waits for the next handler call and gives its response.
    boost::shared_ptr<Response> Next()
    {
        const size_t index = mCalls++;
        EXPECT_TRUE(mRecorder.WaitFor(index + 1));
        const auto responses = mRecorder.Responses();
        if (responses.size() <= index) return boost::shared_ptr<Response>(new Response);
        EXPECT_TRUE(responses[index].mOnCompletionThread);
        EXPECT_TRUE(responses[index].mResponse);
        return responses[index].mResponse;
    }

    static RequestProcessor::Body Bytes(const std::string& text)
    {
        return RecycledMemory::CopyOf(text.data(), text.size());
    }

    testsupport::LoopbackHttpServer mServer;
    boost::shared_ptr<CurlRequestProcessor> mProcessor;
    testsupport::ResponseRecorder mRecorder;
    size_t mCalls = 0;
    Configuration mConfiguration;
};

TEST_F(CurlVerbsTest, GetDeliversStatusHeadersInCapitalsAndTheIdentifier)
{
    HeaderList headers;
    headers.emplace(ImmutableString::CreateStatic("X-Token"), ImmutableString::CreateStatic("secret"));
    const Guid requestUID = Guid::CreateUnique();
    ASSERT_TRUE(mProcessor->GET(requestUID, mRecorder.Handler(), Url("/status/404"), headers, mConfiguration));

    const boost::shared_ptr<Response> response = Next();
    EXPECT_EQ(mRecorder.Responses().at(0).mRequestUID, requestUID);
    EXPECT_EQ(response->status, 404);
    EXPECT_EQ(HeaderValue(*response, kHEADER_ETAG), "\"v1\"");
    EXPECT_EQ(HeaderValue(*response, kHEADER_CONTENT_TYPE), "text/plain; charset=UTF-8");
    EXPECT_EQ(HeaderValue(*response, "X-METHOD"), "GET");
    EXPECT_EQ(HeaderValue(*response, "X-REQUEST-TOKEN"), "secret");
    EXPECT_EQ(HeaderValue(*response, "X-REQUEST-EXPECT"), "no");
}

TEST_F(CurlVerbsTest, EachVerbSendsItsMethodBodyAndContentType)
{
    RequestProcessor& processor = *mProcessor;
    const ResponseHandler handler = mRecorder.Handler();
    const ImmutableString url = Url("/item");
    const Guid id = Guid::CreateUnique();  // each step reuses it, as a chain does
    HeaderList json;
    json.emplace(kHEADER_CONTENT_TYPE, kHEADER_CONTENT_TYPE_APPLICATION_JSON);
    FormList form;
    form.emplace_back(ImmutableString::CreateStatic("name"), UTF8String("a b&c"));
    form.emplace_back(ImmutableString::CreateStatic("city"), UTF8String("K\xc3\xb6ln"));
    const std::string quotedForm = "name=a%20b%26c&city=K%c3%b6ln";
    const char* const formType = "application/x-www-form-urlencoded";
    const RequestProcessor::Body none;
    struct Case {
        const char* mMethod;
        std::function<bool()> mSend;
        std::string mBody;         // sent, and so echoed
        const char* mContentType;  // as the server saw it
        const char* mLength;       // Content-Length as the server saw it
    };
    const Case cases[] = {
        {"PUT", [&] { return processor.PUT(id, handler, url, Bytes("{\"a\":1}"), json, mConfiguration); }, "{\"a\":1}",
         "application/json", "7"},
        {"POST", [&] { return processor.POST(id, handler, url, Bytes("{\"b\":2}"), json, mConfiguration); },
         "{\"b\":2}", "application/json", "7"},
        {"PATCH", [&] { return processor.PATCH(id, handler, url, Bytes("[]"), json, mConfiguration); }, "[]",
         "application/json", "2"},
        {"POST", [&] { return processor.POST(id, handler, url, none, HeaderList(), mConfiguration); }, "", "", "0"},
        {"PUT", [&] { return processor.PUTForm(id, handler, url, form, HeaderList(), mConfiguration); }, quotedForm,
         formType, "29"},
        {"POST", [&] { return processor.POSTForm(id, handler, url, form, HeaderList(), mConfiguration); }, quotedForm,
         formType, "29"},
        {"HEAD", [&] { return processor.HEAD(id, handler, url, HeaderList(), mConfiguration); }, "", "", "none"},
        {"DELETE", [&] { return processor.DEL(id, handler, url, HeaderList(), mConfiguration); }, "", "", "none"},
    };
    for (const Case& step : cases) {
        ASSERT_TRUE(step.mSend()) << step.mMethod;
        const boost::shared_ptr<Response> response = Next();
        EXPECT_EQ(response->status, 200);
        EXPECT_EQ(HeaderValue(*response, "X-METHOD"), step.mMethod);
        EXPECT_EQ(HeaderValue(*response, "X-REQUEST-CONTENT-TYPE"), step.mContentType) << step.mMethod;
        EXPECT_EQ(HeaderValue(*response, "X-REQUEST-LENGTH"), step.mLength) << step.mMethod;
        EXPECT_EQ(HeaderValue(*response, "X-REQUEST-EXPECT"), "no");
        EXPECT_EQ(response->BodyText().ToStdString(), step.mBody) << step.mMethod;
        EXPECT_EQ(!response->body, step.mBody.empty()) << "an empty body arrives as no body";
    }
}

TEST_F(CurlVerbsTest, FourMebibytesTravelBothWaysIntact)
{
    auto bytes = boost::make_shared<std::vector<unsigned char> >(4u << 20);
    std::mt19937 random(7);
    for (unsigned char& byte : *bytes) byte = static_cast<unsigned char>(random());
    ASSERT_TRUE(mProcessor->PUT(Guid::CreateUnique(), mRecorder.Handler(), Url("/large"),
                                RecycledMemory::AdaptAsRecycledMemory(bytes), HeaderList(), mConfiguration));
    const boost::shared_ptr<Response> response = Next();
    ASSERT_EQ(response->status, 200);
    ASSERT_TRUE(response->body);
    ASSERT_EQ(response->body->Size(), bytes->size());
    EXPECT_TRUE(std::equal(bytes->begin(), bytes->end(), response->body->Data()));
}

TEST_F(CurlVerbsTest, AnswerIsBoundedOrStreamedAsTheRequestAsks)
{
    const std::string body(1000, 'b');
    const auto send = [&](const char* target, std::uint64_t bound, const boost::shared_ptr<RecordingSink>& sink) {
        Configuration configuration;
        configuration.mMaxResponseBody = bound;
        configuration.mBodySink = sink;
        EXPECT_TRUE(mProcessor->PUT(Guid::CreateUnique(), mRecorder.Handler(), Url(target), Bytes(body), HeaderList(),
                                    configuration));
        return Next();
    };
    EXPECT_EQ(send("/at", 1000, nullptr)->BodyText().ToStdString(), body);
    const boost::shared_ptr<Response> past = send("/past", 999, nullptr);
    EXPECT_EQ(past->status, kStatusNoResponse);
    EXPECT_EQ(past->BodyText().ToStdString(), kResponseTooLargeText);
    EXPECT_TRUE(IsResponseTooLarge(*past));

    // A sink takes the body of the answers it accepts, and the bound still holds.
    const auto taking = boost::make_shared<RecordingSink>();
    const auto declining = boost::make_shared<RecordingSink>();
    const auto bounded = boost::make_shared<RecordingSink>();
    const auto refusing = boost::make_shared<RecordingSink>(true);
    const boost::shared_ptr<Response> streamed = send("/ok", kDefaultMaxResponseBody, taking);
    const boost::shared_ptr<Response> notFound = send("/status/404", kDefaultMaxResponseBody, declining);
    const boost::shared_ptr<Response> stopped = send("/ok", 999, bounded);
    const boost::shared_ptr<Response> refused = send("/ok", kDefaultMaxResponseBody, refusing);
    EXPECT_EQ(streamed->status, 200);
    EXPECT_FALSE(streamed->body);
    EXPECT_EQ(taking->mBytes, body);
    EXPECT_EQ(notFound->status, 404);
    EXPECT_EQ(notFound->BodyText().ToStdString(), body);
    EXPECT_TRUE(declining->mBytes.empty());
    EXPECT_TRUE(IsResponseTooLarge(*stopped));
    EXPECT_TRUE(bounded->mBytes.empty());
    EXPECT_EQ(refused->status, kStatusNoResponse);
    EXPECT_EQ(refused->BodyText().ToStdString(), kBodySinkRefusedText);
}

TEST_F(CurlVerbsTest, TraceLinesShowNeitherTheAuthorizationNorTheQuery)
{
    std::mutex mutex;
    std::vector<std::string> lines;
    tolmocore::debug::SetTraceListener([&](const std::string& line) {
        std::lock_guard<std::mutex> lock(mutex);
        lines.push_back(line);
    });
    tolmocore::debug::SetTraceSpec("tolmonetsync:8");
    HeaderList headers;
    headers.emplace(ImmutableString::CreateStatic("Authorization"), ImmutableString::CreateStatic("Bearer SECRET-1"));
    ASSERT_TRUE(mProcessor->GET(Guid::CreateUnique(), mRecorder.Handler(), Url("/private?token=SECRET-2"), headers,
                                mConfiguration));
    EXPECT_EQ(Next()->status, 200);
    tolmocore::debug::SetTraceSpec("");
    tolmocore::debug::SetTraceListener(tolmocore::debug::TraceListener());

    std::lock_guard<std::mutex> lock(mutex);
    EXPECT_GE(lines.size(), 2u) << "the request and its answer are traced";
    for (const std::string& line : lines) {
        EXPECT_NE(line.find("/private"), std::string::npos) << line;
        EXPECT_EQ(line.find("SECRET"), std::string::npos) << line;
    }
}

}  // namespace
