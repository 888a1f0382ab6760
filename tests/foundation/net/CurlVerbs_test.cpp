// What each verb sends, and what the handler gets back, over loopback.

#include <mutex>
#include <random>

#include <boost/make_shared.hpp>

#include <gtest/gtest.h>

#include "foundation/core/Trace.h"
#include "foundation/net/CurlRequestProcessor.h"
#include "foundation/net/HeaderConstants.h"
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

std::string HeaderValue(const Response& response, const char* name)
{
    const ImmutableString* value = FindHeader(response.headers, ImmutableString::CreateDynamic(name));
    return value ? value->ToStdString() : "(absent)";
}

using BodyVerb = bool (RequestProcessor::*)(const Guid&, const ResponseHandler&, const ImmutableString&,
                                            const RequestProcessor::Body&, const HeaderList&, const Configuration&);
using FormVerb = bool (RequestProcessor::*)(const Guid&, const ResponseHandler&, const ImmutableString&,
                                            const FormList&, const HeaderList&, const Configuration&);
using PlainVerb = bool (RequestProcessor::*)(const Guid&, const ResponseHandler&, const ImmutableString&,
                                             const HeaderList&, const Configuration&);

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

    static RequestProcessor::Body Bytes(const std::string& text) { return RecycledMemory::CopyOf(text.data(), text.size()); }

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
    ASSERT_TRUE(FindHeader(response->headers, kHEADER_ETAG));
    EXPECT_EQ(FindHeader(response->headers, kHEADER_ETAG)->ToStdString(), "\"v1\"");
    ASSERT_TRUE(FindHeader(response->headers, kHEADER_CONTENT_TYPE));
    EXPECT_EQ(FindHeader(response->headers, kHEADER_CONTENT_TYPE)->ToStdString(), "text/plain; charset=UTF-8");
    EXPECT_EQ(HeaderValue(*response, "X-METHOD"), "GET");
    EXPECT_EQ(HeaderValue(*response, "X-REQUEST-TOKEN"), "secret");
    EXPECT_EQ(HeaderValue(*response, "X-REQUEST-EXPECT"), "no");
    EXPECT_FALSE(response->body) << "an empty body arrives as no body";
}

TEST_F(CurlVerbsTest, PutPostAndPatchSendTheirBodyAsGiven)
{
    const std::pair<BodyVerb, const char*> verbs[] = {
        {&RequestProcessor::PUT, "PUT"}, {&RequestProcessor::POST, "POST"}, {&RequestProcessor::PATCH, "PATCH"}};
    HeaderList headers;
    headers.emplace(kHEADER_CONTENT_TYPE, kHEADER_CONTENT_TYPE_APPLICATION_JSON);
    for (const auto& verb : verbs) {
        const std::string body = std::string("{\"verb\":\"") + verb.second + "\"}";
        ASSERT_TRUE(((*mProcessor).*verb.first)(Guid::CreateUnique(), mRecorder.Handler(), Url("/status/201"),
                                                 Bytes(body), headers, mConfiguration));
        const boost::shared_ptr<Response> response = Next();
        EXPECT_EQ(response->status, 201);
        EXPECT_EQ(HeaderValue(*response, "X-METHOD"), verb.second);
        EXPECT_EQ(HeaderValue(*response, "X-REQUEST-CONTENT-TYPE"), "application/json");
        EXPECT_EQ(HeaderValue(*response, "X-REQUEST-EXPECT"), "no");
        EXPECT_EQ(response->BodyText().ToStdString(), body);
    }
}

TEST_F(CurlVerbsTest, PostWithoutBodyIsAnEmptyPostWithoutContentType)
{
    ASSERT_TRUE(mProcessor->POST(Guid(), mRecorder.Handler(), Url("/"), RequestProcessor::Body(), HeaderList(),
                                 mConfiguration));
    const boost::shared_ptr<Response> response = Next();
    EXPECT_EQ(HeaderValue(*response, "X-METHOD"), "POST");
    EXPECT_EQ(HeaderValue(*response, "X-REQUEST-LENGTH"), "0");
    EXPECT_EQ(HeaderValue(*response, "X-REQUEST-CONTENT-TYPE"), "");
    EXPECT_FALSE(response->body);
}

TEST_F(CurlVerbsTest, FormVerbsSendTheQuotedFormAsUrlEncoded)
{
    FormList form;
    form.emplace_back(ImmutableString::CreateStatic("name"), UTF8String("a b&c"));
    form.emplace_back(ImmutableString::CreateStatic("city"), UTF8String("K\xc3\xb6ln"));
    const std::pair<FormVerb, const char*> verbs[] = {{&RequestProcessor::PUTForm, "PUT"},
                                                      {&RequestProcessor::POSTForm, "POST"}};
    for (const auto& verb : verbs) {
        ASSERT_TRUE(((*mProcessor).*verb.first)(Guid::CreateUnique(), mRecorder.Handler(), Url("/form"), form,
                                                 HeaderList(), mConfiguration));
        const boost::shared_ptr<Response> response = Next();
        EXPECT_EQ(HeaderValue(*response, "X-METHOD"), verb.second);
        EXPECT_EQ(HeaderValue(*response, "X-REQUEST-CONTENT-TYPE"), "application/x-www-form-urlencoded");
        EXPECT_EQ(response->BodyText().ToStdString(), "name=a%20b%26c&city=K%c3%b6ln");
    }
}

TEST_F(CurlVerbsTest, HeadAndDeleteSendNoBody)
{
    const std::pair<PlainVerb, const char*> verbs[] = {{&RequestProcessor::HEAD, "HEAD"},
                                                       {&RequestProcessor::DEL, "DELETE"}};
    for (const auto& verb : verbs) {
        ASSERT_TRUE(((*mProcessor).*verb.first)(Guid::CreateUnique(), mRecorder.Handler(), Url("/item"),
                                                 HeaderList(), mConfiguration));
        const boost::shared_ptr<Response> response = Next();
        EXPECT_EQ(response->status, 200);
        EXPECT_EQ(HeaderValue(*response, "X-METHOD"), verb.second);
        EXPECT_EQ(HeaderValue(*response, "X-REQUEST-LENGTH"), "none");
        EXPECT_FALSE(response->body);
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
