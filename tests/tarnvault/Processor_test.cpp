// The authorising layer: every request of a client carries its bearer token,
// its identifier and the authorised flag, and nothing else changes.

#include <gtest/gtest.h>

#include <mutex>
#include <vector>

#include "tarnvault/Tarnvault.h"

using namespace tolmonetsync::tarnvault;
using tolmonet::Configuration;
using tolmonet::HeaderList;
using tolmonet::http::RequestProcessor;
using tolmonet::http::ResponseHandler;

namespace {

// Records what reaches the processor behind the authorising layer.
class RecordingProcessor : public tolmonet::http::ForwardingProcessor {
public:
    struct Call {
        std::string mVerb;
        Guid mRequestUID;
        std::string mUrl;
        HeaderList mHeaders;
        Configuration mConfiguration;
        bool mHasBody = false;
    };

    RecordingProcessor() : ForwardingProcessor(boost::shared_ptr<RequestProcessor>()) {}

    bool GET(const Guid& id, const ResponseHandler&, const ImmutableString& url, const HeaderList& headers,
             const Configuration& configuration) override
    {
        return Record("GET", id, url, headers, configuration, false);
    }
    bool HEAD(const Guid& id, const ResponseHandler&, const ImmutableString& url, const HeaderList& headers,
              const Configuration& configuration) override
    {
        return Record("HEAD", id, url, headers, configuration, false);
    }
    bool PUT(const Guid& id, const ResponseHandler&, const ImmutableString& url, const Body& body,
             const HeaderList& headers, const Configuration& configuration) override
    {
        return Record("PUT", id, url, headers, configuration, body != nullptr);
    }
    bool PUTForm(const Guid& id, const ResponseHandler&, const ImmutableString& url, const tolmonet::FormList&,
                 const HeaderList& headers, const Configuration& configuration) override
    {
        return Record("PUTForm", id, url, headers, configuration, false);
    }
    bool POST(const Guid& id, const ResponseHandler&, const ImmutableString& url, const Body& body,
              const HeaderList& headers, const Configuration& configuration) override
    {
        return Record("POST", id, url, headers, configuration, body != nullptr);
    }
    bool POSTForm(const Guid& id, const ResponseHandler&, const ImmutableString& url, const tolmonet::FormList&,
                  const HeaderList& headers, const Configuration& configuration) override
    {
        return Record("POSTForm", id, url, headers, configuration, false);
    }
    bool PATCH(const Guid& id, const ResponseHandler&, const ImmutableString& url, const Body&,
               const HeaderList& headers, const Configuration& configuration) override
    {
        return Record("PATCH", id, url, headers, configuration, false);
    }
    bool DEL(const Guid& id, const ResponseHandler&, const ImmutableString& url, const HeaderList& headers,
             const Configuration& configuration) override
    {
        return Record("DEL", id, url, headers, configuration, false);
    }
    void TryToCancelRequest(const Guid& id) override { mCancelled.push_back(id); }

    std::vector<Call> mCalls;
    std::vector<Guid> mCancelled;
    bool mAccept = true;

private:
    bool Record(const char* verb, const Guid& id, const ImmutableString& url, const HeaderList& headers,
                const Configuration& configuration, bool hasBody)
    {
        mCalls.push_back(Call{verb, id, url.ToStdString(), headers, configuration, hasBody});
        return mAccept;
    }
};

std::vector<std::string> Values(const HeaderList& headers, const char* name)
{
    std::vector<std::string> values;
    const auto range = headers.equal_range(ImmutableString::CreateDynamic(name));
    for (auto it = range.first; it != range.second; ++it) values.push_back(it->second.ToStdString());
    return values;
}

class ProcessorTest : public ::testing::Test {
protected:
    ProcessorTest() : mTarget(new RecordingProcessor), mProcessor(mTarget, &mToken) {}

    UTF8String mToken = "token-1";
    boost::shared_ptr<RecordingProcessor> mTarget;
    TarnvaultProcessor mProcessor;
};

}  // namespace

TEST_F(ProcessorTest, EveryVerbCarriesTokenIdentifierAndTheAuthorisedFlag)
{
    const Guid id = Guid::CreateUnique();
    const ImmutableString url = ImmutableString::CreateDynamic("http://127.0.0.1:9/api/x");
    const RequestProcessor::Body body = RecycledMemory::CopyOf("abc", 3);
    EXPECT_TRUE(mProcessor.GET(id, ResponseHandler(), url, HeaderList(), Configuration()));
    EXPECT_TRUE(mProcessor.HEAD(id, ResponseHandler(), url, HeaderList(), Configuration()));
    EXPECT_TRUE(mProcessor.PUT(id, ResponseHandler(), url, body, HeaderList(), Configuration()));
    EXPECT_TRUE(mProcessor.PUTForm(id, ResponseHandler(), url, tolmonet::FormList(), HeaderList(), Configuration()));
    EXPECT_TRUE(mProcessor.POST(id, ResponseHandler(), url, body, HeaderList(), Configuration()));
    EXPECT_TRUE(mProcessor.POSTForm(id, ResponseHandler(), url, tolmonet::FormList(), HeaderList(), Configuration()));
    EXPECT_TRUE(mProcessor.DEL(id, ResponseHandler(), url, HeaderList(), Configuration()));
    ASSERT_EQ(mTarget->mCalls.size(), 7u);
    for (const auto& call : mTarget->mCalls) {
        SCOPED_TRACE(call.mVerb);
        EXPECT_EQ(call.mRequestUID, id);
        EXPECT_EQ(call.mUrl, "http://127.0.0.1:9/api/x");
        EXPECT_EQ(Values(call.mHeaders, "Authorization"), std::vector<std::string>{"Bearer token-1"});
        EXPECT_EQ(Values(call.mHeaders, "X-REQUEST-ID"), std::vector<std::string>{id.AsStdString()});
        EXPECT_EQ(call.mHeaders.size(), 2u);
        EXPECT_TRUE(call.mConfiguration.mAuthorized);
    }
    EXPECT_TRUE(mTarget->mCalls[2].mHasBody);
    EXPECT_TRUE(mTarget->mCalls[4].mHasBody);
}

TEST_F(ProcessorTest, NilIdentifierSendsNoRequestIdHeader)
{
    EXPECT_TRUE(mProcessor.GET(Guid(), ResponseHandler(), ImmutableString::CreateDynamic("http://127.0.0.1:9/"),
                               HeaderList(), Configuration()));
    ASSERT_EQ(mTarget->mCalls.size(), 1u);
    EXPECT_TRUE(Values(mTarget->mCalls[0].mHeaders, "X-REQUEST-ID").empty());
    EXPECT_EQ(Values(mTarget->mCalls[0].mHeaders, "Authorization"), std::vector<std::string>{"Bearer token-1"});
}

TEST_F(ProcessorTest, TokenIsReadAtEachRequest)
{
    const ImmutableString url = ImmutableString::CreateDynamic("http://127.0.0.1:9/");
    mProcessor.GET(Guid::CreateUnique(), ResponseHandler(), url, HeaderList(), Configuration());
    mToken = "token-2";
    mProcessor.GET(Guid::CreateUnique(), ResponseHandler(), url, HeaderList(), Configuration());
    mToken.clear();
    mProcessor.GET(Guid::CreateUnique(), ResponseHandler(), url, HeaderList(), Configuration());
    ASSERT_EQ(mTarget->mCalls.size(), 3u);
    EXPECT_EQ(Values(mTarget->mCalls[0].mHeaders, "Authorization")[0], "Bearer token-1");
    EXPECT_EQ(Values(mTarget->mCalls[1].mHeaders, "Authorization")[0], "Bearer token-2");
    EXPECT_EQ(Values(mTarget->mCalls[2].mHeaders, "Authorization")[0], "Bearer ");
}

TEST_F(ProcessorTest, CallersConfigurationAndHeadersStayAsGiven)
{
    Configuration configuration;
    configuration.mFollowRedirects = false;
    configuration.mUserAgent = "agent";
    HeaderList headers;
    headers.insert(std::make_pair(ImmutableString::CreateDynamic("X-Own"), ImmutableString::CreateDynamic("mine")));
    mProcessor.POST(Guid::CreateUnique(), ResponseHandler(), ImmutableString::CreateDynamic("http://127.0.0.1:9/"),
                    RequestProcessor::Body(), headers, configuration);
    EXPECT_FALSE(configuration.mAuthorized);
    EXPECT_EQ(headers.size(), 1u);
    ASSERT_EQ(mTarget->mCalls.size(), 1u);
    const auto& call = mTarget->mCalls[0];
    EXPECT_TRUE(call.mConfiguration.mAuthorized);
    EXPECT_FALSE(call.mConfiguration.mFollowRedirects);
    EXPECT_EQ(call.mConfiguration.mUserAgent, "agent");
    EXPECT_EQ(Values(call.mHeaders, "X-Own"), std::vector<std::string>{"mine"});
    EXPECT_EQ(call.mHeaders.size(), 3u);
}

TEST_F(ProcessorTest, CallersAuthorizationStaysBesideOurs)
{
    HeaderList headers;
    headers.insert(std::make_pair(kAuthorization, ImmutableString::CreateDynamic("Basic x")));
    const HeaderList result = mProcessor.AddAuthorization(Guid(), headers);
    EXPECT_EQ(Values(result, "Authorization").size(), 2u);
}

TEST_F(ProcessorTest, RefusalPassesThroughAndPatchAndCancelOnlyForward)
{
    mTarget->mAccept = false;
    const Guid id = Guid::CreateUnique();
    const ImmutableString url = ImmutableString::CreateDynamic("http://127.0.0.1:9/");
    EXPECT_FALSE(mProcessor.GET(id, ResponseHandler(), url, HeaderList(), Configuration()));
    EXPECT_FALSE(mProcessor.PATCH(id, ResponseHandler(), url, RequestProcessor::Body(), HeaderList(), Configuration()));
    mProcessor.TryToCancelRequest(id);
    ASSERT_EQ(mTarget->mCalls.size(), 2u);
    EXPECT_TRUE(mTarget->mCalls[1].mHeaders.empty());
    EXPECT_FALSE(mTarget->mCalls[1].mConfiguration.mAuthorized);
    EXPECT_EQ(mTarget->mCancelled, std::vector<Guid>{id});
}
