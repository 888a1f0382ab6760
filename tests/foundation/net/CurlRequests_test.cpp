// Every verb over loopback: what the server sees, what the handler gets, and
// how a request that gets no HTTP answer ends.

#include <algorithm>
#include <cstring>
#include <functional>
#include <random>
#include <stdexcept>

#include <boost/make_shared.hpp>

#include <gtest/gtest.h>

#include "foundation/net/CurlRequestProcessor.h"
#include "foundation/net/HeaderConstants.h"
#include "foundation/net/RequestBodySource.h"
#include "foundation/net/ResponseBodySink.h"
#include "support/LoopbackHttpServer.h"
#include "support/ResponseRecorder.h"
#include "support/TestScopes.h"

using namespace tolmonet;
using namespace tolmonet::http;
using testsupport::HttpAnswer;
using testsupport::HttpRequest;

namespace {

// Echoes the body and tells in headers what came; the target names a status or a fault.
HttpAnswer Echo(const HttpRequest& request)
{
    HttpAnswer answer;
    if (request.mTarget.rfind("/status/", 0) == 0) answer.mStatus = std::stoi(request.mTarget.substr(8));
    answer.mHeaders = {
        {"ETag", "\"v1\""},
        {"x-method", request.mMethod},
        {"X-Request-Content-Type", request.Header("Content-Type")},
        {"X-Request-Length", request.HasHeader("Content-Length") ? request.Header("Content-Length") : "none"},
        {"X-Request-Token", request.Header("X-Token")},
        {"X-Request-Expect", request.HasHeader("Expect") ? "yes" : "no"},
    };
    answer.mBody = request.mBody;
    if (request.mTarget == "/hang-up") answer.mFault = HttpAnswer::Fault_HangUpMidBody, answer.mBody.resize(100000);
    // Headers, then nothing: once body bytes came, the transfer's speed
    // average would keep it alive for seconds beyond the stall time.
    if (request.mTarget == "/stall") answer.mFault = HttpAnswer::Fault_StallMidBody, answer.mBody = "x";
    if (request.mTarget == "/silent") answer.mFault = HttpAnswer::Fault_NeverAnswer;
    return answer;
}

std::string HeaderValue(const Response& response, const char* name)
{
    const ImmutableString* value = FindHeader(response.headers, ImmutableString::CreateDynamic(name));
    return value ? value->ToStdString() : "(absent)";
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

RequestProcessor::Body Bytes(const std::string& text)
{
    return RecycledMemory::CopyOf(text.data(), text.size());
}

// Gives a body from memory a piece at a time, as a file would; throws
// before its last piece when told to fail.
class StringSource : public RequestBodySource {
public:
    StringSource(const std::string& bytes, bool fail) : mBytes(bytes), mFail(fail) {}
    std::uint64_t Size() const override { return mBytes.size(); }
    std::size_t Read(unsigned char* buffer, std::size_t max) override
    {
        const size_t count = std::min(max, mBytes.size() - mOffset);
        if (mFail && mOffset + count == mBytes.size()) throw std::runtime_error("the source failed");
        std::memcpy(buffer, mBytes.data() + mOffset, count);
        mOffset += count;
        return count;
    }
    bool Rewind() override
    {
        mOffset = 0;
        return true;
    }

private:
    const std::string mBytes;
    const bool mFail;
    size_t mOffset = 0;
};

Configuration Streaming(const std::string& bytes, bool fail = false)
{
    Configuration configuration;
    configuration.mBodySource = boost::make_shared<StringSource>(bytes, fail);
    return configuration;
}

using Send = std::function<bool(const Guid&, ResponseHandler, const ImmutableString&)>;

Send GetWith(RequestProcessor& processor, const HeaderList& headers = HeaderList())
{
    return [&processor, headers](const Guid& id, ResponseHandler handler, const ImmutableString& url) {
        return processor.GET(id, handler, url, headers, Configuration());
    };
}

class CurlRequestsTest : public ::testing::Test {
protected:
    // Sends with `send` under a fresh identifier; the response its one handler call got.
    static boost::shared_ptr<Response> Answer(RequestProcessor& processor, const Send& send, const std::string& url)
    {
        testsupport::ResponseRecorder recorder(processor);
        const Guid requestUID = Guid::CreateUnique();
        EXPECT_TRUE(send(requestUID, recorder.Handler(), ImmutableString::CreateDynamic(url)));
        if (!recorder.WaitFor(1)) return boost::make_shared<Response>();
        const testsupport::RecordedResponse got = recorder.Responses().at(0);
        EXPECT_EQ(got.mRequestUID, requestUID);
        EXPECT_TRUE(got.mOnCompletionThread);
        return got.mResponse;
    }
    // The line a handler gets for a request with no HTTP answer.
    static std::string FailureText(RequestProcessor& processor, const std::string& url)
    {
        const boost::shared_ptr<Response> response = Answer(processor, GetWith(processor), url);
        EXPECT_EQ(response->status, kStatusNoResponse);
        const std::string text = response->BodyText().ToStdString();
        EXPECT_FALSE(text.empty());
        EXPECT_EQ(text.find_first_of("\r\n"), std::string::npos) << text;
        return text;
    }

    CurlRequestsTest() { mProcessor->SetTimeouts(std::chrono::seconds(5), std::chrono::seconds(1)); }

    testsupport::LoopbackHttpServer mServer{&Echo};
    boost::shared_ptr<CurlRequestProcessor> mProcessor{new CurlRequestProcessor()};
};

TEST_F(CurlRequestsTest, EachVerbSendsItsMethodBodyAndContentTypeAndGetsStatusAndHeaders)
{
    RequestProcessor& processor = *mProcessor;
    HeaderList json;
    json.emplace(kHEADER_CONTENT_TYPE, kHEADER_CONTENT_TYPE_APPLICATION_JSON);
    json.emplace(ImmutableString::CreateStatic("X-Token"), ImmutableString::CreateStatic("secret"));
    FormList form;
    form.emplace_back(ImmutableString::CreateStatic("name"), UTF8String("a b&c"));
    form.emplace_back(ImmutableString::CreateStatic("city"), UTF8String("K\xc3\xb6ln"));
    const std::string quotedForm = "name=a%20b%26c&city=K%c3%b6ln", formType = "application/x-www-form-urlencoded";
    std::string large(4u << 20, '\0');
    std::mt19937 random(7);
    for (char& byte : large) byte = static_cast<char>(random());
    struct Row {
        const char* mMethod;
        Send mSend;
        std::string mBody;  // sent, and so echoed
        std::string mContentType;
        std::string mLength;  // Content-Length as the server saw it
    };
    const Configuration c;
    const Row rows[] = {
        {"GET", [&](auto id, auto h, auto& url) { return processor.GET(id, h, url, json, c); }, "", "application/json",
         "none"},
        {"PUT", [&](auto id, auto h, auto& url) { return processor.PUT(id, h, url, Bytes("{\"a\":1}"), json, c); },
         "{\"a\":1}", "application/json", "7"},
        {"POST", [&](auto id, auto h, auto& url) { return processor.POST(id, h, url, Bytes("[2]"), json, c); }, "[2]",
         "application/json", "3"},
        {"PATCH", [&](auto id, auto h, auto& url) { return processor.PATCH(id, h, url, Bytes("[]"), json, c); }, "[]",
         "application/json", "2"},
        {"POST", [&](auto id, auto h, auto& url) { return processor.POST(id, h, url, nullptr, {}, c); }, "", "", "0"},
        {"PUT", [&](auto id, auto h, auto& url) { return processor.PUTForm(id, h, url, form, {}, c); }, quotedForm,
         formType, "29"},
        {"POST", [&](auto id, auto h, auto& url) { return processor.POSTForm(id, h, url, form, {}, c); }, quotedForm,
         formType, "29"},
        {"HEAD", [&](auto id, auto h, auto& url) { return processor.HEAD(id, h, url, {}, c); }, "", "", "none"},
        {"DELETE", [&](auto id, auto h, auto& url) { return processor.DEL(id, h, url, {}, c); }, "", "", "none"},
        {"PUT", [&](auto id, auto h, auto& url) { return processor.PUT(id, h, url, Bytes(large), {}, c); }, large, "",
         std::to_string(large.size())},
        // From a body source: far more than libcurl's buffer, and a small one.
        {"POST", [&](auto id, auto h, auto& url) { return processor.POST(id, h, url, nullptr, {}, Streaming(large)); },
         large, "", std::to_string(large.size())},
        {"PATCH",
         [&](auto id, auto h, auto& url) { return processor.PATCH(id, h, url, nullptr, json, Streaming("[3]")); },
         "[3]", "application/json", "3"},
    };
    const int port = testsupport::ClosedLoopbackPort();
    for (const Row& row : rows) {
        SCOPED_TRACE(std::string(row.mMethod) + " " + row.mContentType);
        for (const int status : {200, 404}) {
            const boost::shared_ptr<Response> got =
                Answer(processor, row.mSend, mServer.Url("/status/" + std::to_string(status)));
            EXPECT_EQ(got->status, status);
            EXPECT_EQ(HeaderValue(*got, "ETAG"), "\"v1\"") << "header names arrive in capitals";
            EXPECT_EQ(HeaderValue(*got, "X-METHOD"), row.mMethod);
            EXPECT_EQ(HeaderValue(*got, "X-REQUEST-CONTENT-TYPE"), row.mContentType);
            EXPECT_EQ(HeaderValue(*got, "X-REQUEST-LENGTH"), row.mLength);
            EXPECT_EQ(HeaderValue(*got, "X-REQUEST-EXPECT"), "no");
            EXPECT_EQ(got->BodyText().ToStdString(), row.mBody);
            EXPECT_EQ(!got->body, row.mBody.empty()) << "an empty body arrives as no body";
        }
        // A refused connection, or a hang-up before the whole body (which HEAD never waits for), is no answer.
        for (const std::string& url : {"http://127.0.0.1:" + std::to_string(port) + "/x", mServer.Url("/hang-up")}) {
            const bool complete = row.mMethod == std::string("HEAD") && url == mServer.Url("/hang-up");
            EXPECT_EQ(Answer(processor, row.mSend, url)->status, complete ? 200 : kStatusNoResponse) << url;
        }
    }
}

TEST_F(CurlRequestsTest, NoAnswerEndsWithALineThatSaysWhy)
{
    const int port = testsupport::ClosedLoopbackPort();
    EXPECT_EQ(FailureText(*mProcessor, "http://127.0.0.1:" + std::to_string(port) + "/x"),
              "Could not connect to 127.0.0.1 port " + std::to_string(port) + ": Connection refused");
    EXPECT_NE(FailureText(*mProcessor, mServer.Url("/hang-up")).find("closed"), std::string::npos);
    EXPECT_NE(FailureText(*mProcessor, mServer.Url("/stall")).find("too slow"), std::string::npos);
    FailureText(*mProcessor, "https://127.0.0.1:" + std::to_string(mServer.Port()) + "/");  // TLS with a plain server

    const boost::shared_ptr<RequestProcessor> processWide = CurlRequestProcessor::CreateProcessWide();
    EXPECT_EQ(processWide, CurlRequestProcessor::CreateProcessWide());
    CurlRequestProcessor::SetProcessWideTimeouts(std::chrono::seconds(5), std::chrono::seconds(1));
    FailureText(*processWide, mServer.Url("/silent"));
    CurlRequestProcessor::SetProcessWideTimeouts(std::chrono::seconds(30), std::chrono::seconds(60));
}

TEST_F(CurlRequestsTest, AnswerIsBoundedOrStreamedAsTheRequestAsks)
{
    const std::string body(1000, 'b');
    const auto send = [&](const char* target, std::uint64_t bound, const boost::shared_ptr<RecordingSink>& sink) {
        Configuration configuration;
        configuration.mMaxResponseBody = bound;
        configuration.mBodySink = sink;
        return Answer(
            *mProcessor,
            [&](const Guid& id, ResponseHandler handler, const ImmutableString& url) {
                return mProcessor->PUT(id, handler, url, Bytes(body), HeaderList(), configuration);
            },
            mServer.Url(target));
    };
    EXPECT_EQ(send("/at", 1000, nullptr)->BodyText().ToStdString(), body);
    const boost::shared_ptr<Response> past = send("/past", 999, nullptr);
    EXPECT_EQ(past->status, kStatusNoResponse);
    EXPECT_EQ(past->BodyText().ToStdString(), kResponseTooLargeText);
    EXPECT_TRUE(IsResponseTooLarge(*past));

    // A sink takes the body of the answers it accepts, and the bound still holds.
    const auto taking = boost::make_shared<RecordingSink>(), declining = boost::make_shared<RecordingSink>();
    const auto bounded = boost::make_shared<RecordingSink>(), refusing = boost::make_shared<RecordingSink>(true);
    const boost::shared_ptr<Response> streamed = send("/ok", kDefaultMaxResponseBody, taking);
    EXPECT_EQ(streamed->status, 200);
    EXPECT_FALSE(streamed->body);
    EXPECT_EQ(taking->mBytes, body);
    const boost::shared_ptr<Response> notFound = send("/status/404", kDefaultMaxResponseBody, declining);
    EXPECT_EQ(notFound->BodyText().ToStdString(), body);
    EXPECT_TRUE(declining->mBytes.empty());
    EXPECT_TRUE(IsResponseTooLarge(*send("/ok", 999, bounded)));
    EXPECT_TRUE(bounded->mBytes.empty());
    const boost::shared_ptr<Response> refused = send("/ok", kDefaultMaxResponseBody, refusing);
    EXPECT_EQ(refused->status, kStatusNoResponse);
    EXPECT_EQ(refused->BodyText().ToStdString(), kBodySinkRefusedText);
}

TEST_F(CurlRequestsTest, ABodySourceThatFailsStopsTheRequestWithItsText)
{
    const boost::shared_ptr<Response> got = Answer(
        *mProcessor,
        [&](const Guid& id, ResponseHandler handler, const ImmutableString& url) {
            return mProcessor->PUT(id, handler, url, nullptr, HeaderList(), Streaming(std::string(1 << 20, 's'), true));
        },
        mServer.Url("/put"));
    EXPECT_EQ(got->status, kStatusNoResponse);
    EXPECT_EQ(got->BodyText().ToStdString(), "the source failed");
}

TEST_F(CurlRequestsTest, TraceLinesShowNeitherTheAuthorizationNorTheQuery)
{
    testsupport::TraceCapture trace("tolmonetsync:8");
    HeaderList headers;
    headers.emplace(ImmutableString::CreateStatic("Authorization"), ImmutableString::CreateStatic("Bearer SECRET-1"));
    EXPECT_EQ(Answer(*mProcessor, GetWith(*mProcessor, headers), mServer.Url("/private?token=SECRET-2"))->status, 200);
    EXPECT_GE(trace.CountWith("/private"), 2u) << "the request and its answer are traced";
    EXPECT_EQ(trace.CountWith("SECRET"), 0u);
}

}  // namespace
