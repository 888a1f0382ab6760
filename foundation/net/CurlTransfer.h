#pragma once
// One HTTP exchange on a libcurl easy handle: what to send, and what came back.
//
// Made on the thread that calls a verb; from then on touched only by the
// network thread, apart from mCancelled.

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include <curl/curl.h>

#include "foundation/net/RequestProcessor.h"

namespace tolmonet {
namespace http {

enum HttpMethod : int {
    HttpMethod_GET,
    HttpMethod_HEAD,
    HttpMethod_PUT,
    HttpMethod_POST,
    HttpMethod_PATCH,
    HttpMethod_DELETE,
};

const char* MethodName(HttpMethod method);

// What every transfer of one processor shares; outlives its transfers.
struct CurlTransferEnvironment {
    std::string mCAFile;   // empty: the system's store
    std::string mNoProxy;  // hosts that never go through a proxy
};

// Time-outs fixed when the request is taken.
struct CurlTransferTimeouts {
    long mConnectMilliseconds;
    long mStallSeconds;
};

class CurlTransfer {
public:
    // `contentType` is sent when the headers name none; null sends no
    // Content-Type at all rather than libcurl's form default. Of the
    // configuration, mMaxResponseBody, mBodySink and mBodySource count: an
    // answer whose body passes the bound is stopped as soon as it does, and
    // a body source takes the place of `body`.
    CurlTransfer(const Guid& requestUID, const ResponseHandler& handler, HttpMethod method, const ImmutableString& url,
                 const RequestProcessor::Body& body, const HeaderList& headers, const char* contentType,
                 const CurlTransferTimeouts& timeouts, const Configuration& configuration);
    ~CurlTransfer();
    CurlTransfer(const CurlTransfer&) = delete;
    CurlTransfer& operator=(const CurlTransfer&) = delete;

    const Guid& RequestUID() const { return mRequestUID; }
    HttpMethod Method() const { return mMethod; }
    // The URL with the values of secret query fields blanked; for trace lines.
    std::string UrlForTrace() const;

    // Gives `easy` (fresh or reset) every option of this request.
    void Attach(CURL* easy, const CurlTransferEnvironment& environment);
    CURL* Handle() const { return mEasy; }
    // Hands the easy handle back; the transfer no longer uses it.
    CURL* Detach();

    // What the handler gets once libcurl reports the end of the transfer.
    boost::shared_ptr<Response> MakeResponse(CURLcode result);
    static boost::shared_ptr<Response> MakeCancelledResponse();
    static boost::shared_ptr<Response> MakeFailureResponse(const UTF8String& text);

    ResponseHandler& Handler() { return mHandler; }

    // Set when TryToCancelRequest reached the request while it was live.
    // Guarded by the network loop's mutex.
    bool mCancelled = false;

private:
    static size_t OnHeader(char* data, size_t size, size_t count, void* self);
    static size_t OnBody(char* data, size_t size, size_t count, void* self);
    static size_t OnRead(char* buffer, size_t size, size_t count, void* self);
    static int OnSeek(void* self, curl_off_t offset, int origin);
    // False: the transfer is to stop.
    bool TakeBody(const char* data, size_t length);
    // The next bytes of mBodySource, or CURL_READFUNC_ABORT.
    size_t GiveBody(unsigned char* buffer, size_t max);
    void AddHeaderLine(const char* data, size_t length);

    const Guid mRequestUID;
    ResponseHandler mHandler;
    const HttpMethod mMethod;
    const std::string mUrl;
    const RequestProcessor::Body mBody;
    curl_slist* mRequestHeaders = nullptr;
    const CurlTransferTimeouts mTimeouts;
    const std::uint64_t mMaxBody;
    const boost::shared_ptr<ResponseBodySink> mBodySink;
    const boost::shared_ptr<RequestBodySource> mBodySource;
    std::uint64_t mSourceBytes = 0;  // given since the body last started
    std::string mSourceFailure;      // why mBodySource stopped the transfer

    CURL* mEasy = nullptr;
    char mErrorText[CURL_ERROR_SIZE];
    HeaderList mResponseHeaders;
    boost::shared_ptr<std::vector<unsigned char> > mResponseBody;
    std::uint64_t mBodyBytes = 0;      // taken so far, gathered or streamed
    std::uint64_t mAnnouncedBody = 0;  // Content-Length, 0 if none
    bool mSinkAsked = false;
    bool mStreaming = false;  // the body goes to mBodySink
    bool mOutOfMemory = false;
    bool mTooLarge = false;     // the answer passed mMaxBody
    bool mSinkRefused = false;  // mBodySink said no
};

}  // namespace http
}  // namespace tolmonet
