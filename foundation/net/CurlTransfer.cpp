#include "foundation/net/CurlTransfer.h"

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include <strings.h>

#include "foundation/core/Redaction.h"
#include "foundation/net/CurlFailureText.h"
#include "foundation/net/RequestBodySource.h"
#include "foundation/net/ResponseBodySink.h"

namespace tolmonet {
namespace http {
namespace {

// Reserving what a server announces saves copies of large bodies; the cap
// keeps a wrong or hostile Content-Length from taking memory up front.
constexpr size_t kMaxBodyReserve = 64u << 20;

const char* kCancelledText = "Request cancelled";
// Each read of a source is a system call on the network thread: a large body
// goes in larger pieces than libcurl's 64 KiB, which measured slower than a
// body sent from memory. Small ones keep the default, so that a recycled
// handle keeps its buffer.
constexpr long kSourceBufferSize = 512L << 10;  // CURLOPT_UPLOAD_BUFFERSIZE takes a long

const char* kSourceShortText = "The request's body ended before its announced length";

bool EqualsIgnoringCase(const ImmutableString& name, const char* expected)
{
    const size_t length = std::strlen(expected);
    return name.size() == length && strncasecmp(name.c_str(), expected, length) == 0;
}

bool HasHeader(const HeaderList& headers, const char* name)
{
    for (const auto& header : headers)
        if (EqualsIgnoringCase(header.first, name)) return true;
    return false;
}

bool IsBlank(char c)
{
    return c == ' ' || c == '\t' || c == '\r' || c == '\n';
}

// Builds the list libcurl sends. A line with CR or LF in it would let a value
// smuggle in headers of its own, so such a line is dropped.
curl_slist* MakeHeaderList(const HeaderList& headers, const char* contentType, bool hasBody)
{
    curl_slist* list = nullptr;
    std::string line;
    for (const auto& header : headers) {
        line.assign(header.first.c_str(), header.first.size());
        // "Name;" is libcurl's spelling of a header with an empty value.
        if (header.second.empty()) {
            line += ';';
        } else {
            line += ": ";
            line.append(header.second.c_str(), header.second.size());
        }
        if (line.find_first_of("\r\n") != std::string::npos) continue;
        list = curl_slist_append(list, line.c_str());
    }
    if (!hasBody) return list;
    // Waiting for "100 Continue" costs a round trip, or a second when the
    // server does not know it.
    if (!HasHeader(headers, "Expect")) list = curl_slist_append(list, "Expect:");
    if (!HasHeader(headers, "Content-Type")) {
        if (contentType)
            list = curl_slist_append(list, (std::string("Content-Type: ") + contentType).c_str());
        else
            list = curl_slist_append(list, "Content-Type:");  // drops libcurl's form default
    }
    return list;
}

}  // namespace

const char* MethodName(HttpMethod method)
{
    switch (method) {
        case HttpMethod_GET:
            return "GET";
        case HttpMethod_HEAD:
            return "HEAD";
        case HttpMethod_PUT:
            return "PUT";
        case HttpMethod_POST:
            return "POST";
        case HttpMethod_PATCH:
            return "PATCH";
        case HttpMethod_DELETE:
            return "DELETE";
    }
    return "?";
}

CurlTransfer::CurlTransfer(const Guid& requestUID, const ResponseHandler& handler, HttpMethod method,
                           const ImmutableString& url, const RequestProcessor::Body& body, const HeaderList& headers,
                           const char* contentType, const CurlTransferTimeouts& timeouts,
                           const Configuration& configuration)
    : mRequestUID(requestUID),
      mHandler(handler),
      mMethod(method),
      mUrl(url.c_str(), url.size()),
      mBody(body),
      mTimeouts(timeouts),
      mMaxBody(configuration.mMaxResponseBody),
      mBodySink(configuration.mBodySink),
      mBodySource(configuration.mBodySource),
      mResponseBody(new std::vector<unsigned char>)
{
    const bool hasBody = method == HttpMethod_PUT || method == HttpMethod_POST || method == HttpMethod_PATCH;
    mRequestHeaders = MakeHeaderList(headers, contentType, hasBody);
    mErrorText[0] = '\0';
}

CurlTransfer::~CurlTransfer()
{
    curl_slist_free_all(mRequestHeaders);
}

std::string CurlTransfer::UrlForTrace() const
{
    return tolmocore::debug::RedactSecrets(mUrl);
}

void CurlTransfer::Attach(CURL* easy, const CurlTransferEnvironment& environment)
{
    mEasy = easy;
    mErrorText[0] = '\0';
    curl_easy_setopt(easy, CURLOPT_URL, mUrl.c_str());
    curl_easy_setopt(easy, CURLOPT_PRIVATE, this);
    curl_easy_setopt(easy, CURLOPT_ERRORBUFFER, mErrorText);
    curl_easy_setopt(easy, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(easy, CURLOPT_PROTOCOLS_STR, "http,https");
    curl_easy_setopt(easy, CURLOPT_HTTPHEADER, mRequestHeaders);
    curl_easy_setopt(easy, CURLOPT_HEADERFUNCTION, &CurlTransfer::OnHeader);
    curl_easy_setopt(easy, CURLOPT_HEADERDATA, this);
    curl_easy_setopt(easy, CURLOPT_WRITEFUNCTION, &CurlTransfer::OnBody);
    curl_easy_setopt(easy, CURLOPT_WRITEDATA, this);
    curl_easy_setopt(easy, CURLOPT_CONNECTTIMEOUT_MS, mTimeouts.mConnectMilliseconds);
    curl_easy_setopt(easy, CURLOPT_LOW_SPEED_LIMIT, 1L);
    curl_easy_setopt(easy, CURLOPT_LOW_SPEED_TIME, mTimeouts.mStallSeconds);
    curl_easy_setopt(easy, CURLOPT_SSL_VERIFYPEER, 1L);
    curl_easy_setopt(easy, CURLOPT_SSL_VERIFYHOST, 2L);
    if (!environment.mCAFile.empty()) curl_easy_setopt(easy, CURLOPT_CAINFO, environment.mCAFile.c_str());
    curl_easy_setopt(easy, CURLOPT_NOPROXY, environment.mNoProxy.c_str());

    // A Body goes out from the caller's block itself: POSTFIELDS does not copy,
    // and mBody keeps the block alive until the transfer is gone. A missing
    // body still needs a non-null pointer, or libcurl would read stdin.
    const char* data = mBody && mBody->Data() ? reinterpret_cast<const char*>(mBody->Data()) : "";
    curl_off_t size = mBody ? static_cast<curl_off_t>(mBody->Size()) : 0;
    switch (mMethod) {
        case HttpMethod_GET:
            curl_easy_setopt(easy, CURLOPT_HTTPGET, 1L);
            break;
        case HttpMethod_HEAD:
            curl_easy_setopt(easy, CURLOPT_NOBODY, 1L);
            break;
        case HttpMethod_DELETE:
            curl_easy_setopt(easy, CURLOPT_CUSTOMREQUEST, "DELETE");
            break;
        case HttpMethod_PUT:
        case HttpMethod_POST:
        case HttpMethod_PATCH:
            curl_easy_setopt(easy, CURLOPT_POST, 1L);
            if (mBodySource) {
                // A known size keeps Content-Length and no chunked encoding;
                // the seek lets libcurl send the body again on a new
                // connection when a kept-alive one turns out closed.
                size = static_cast<curl_off_t>(mBodySource->Size());
                mSourceBytes = 0;
                curl_easy_setopt(easy, CURLOPT_READFUNCTION, &CurlTransfer::OnRead);
                curl_easy_setopt(easy, CURLOPT_READDATA, this);
                curl_easy_setopt(easy, CURLOPT_SEEKFUNCTION, &CurlTransfer::OnSeek);
                curl_easy_setopt(easy, CURLOPT_SEEKDATA, this);
                if (size > kSourceBufferSize) curl_easy_setopt(easy, CURLOPT_UPLOAD_BUFFERSIZE, kSourceBufferSize);
            }
            curl_easy_setopt(easy, CURLOPT_POSTFIELDSIZE_LARGE, size);
            if (!mBodySource) curl_easy_setopt(easy, CURLOPT_POSTFIELDS, data);
            if (mMethod != HttpMethod_POST)
                curl_easy_setopt(easy, CURLOPT_CUSTOMREQUEST, mMethod == HttpMethod_PUT ? "PUT" : "PATCH");
            break;
    }
}

CURL* CurlTransfer::Detach()
{
    CURL* easy = mEasy;
    mEasy = nullptr;
    return easy;
}

size_t CurlTransfer::OnHeader(char* data, size_t size, size_t count, void* self)
{
    try {
        static_cast<CurlTransfer*>(self)->AddHeaderLine(data, size * count);
    } catch (const std::bad_alloc&) {
        static_cast<CurlTransfer*>(self)->mOutOfMemory = true;
        return 0;  // ends the transfer
    }
    return size * count;
}

void CurlTransfer::AddHeaderLine(const char* data, size_t length)
{
    while (length > 0 && IsBlank(data[length - 1])) --length;
    if (length == 0) return;
    // Every status line starts a new response (an interim 1xx one, say); only
    // the last response's headers count.
    if (length >= 5 && std::memcmp(data, "HTTP/", 5) == 0) {
        mResponseHeaders.clear();
        return;
    }
    // A line folded onto the previous one is obsolete and no server of ours
    // sends one; it is dropped rather than guessed at.
    if (IsBlank(data[0])) return;
    const char* colon = static_cast<const char*>(std::memchr(data, ':', length));
    if (!colon) return;
    std::string name(data, colon);
    while (!name.empty() && IsBlank(name.back())) name.pop_back();
    std::transform(name.begin(), name.end(), name.begin(),
                   [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
    const char* value = colon + 1;
    const char* end = data + length;
    while (value < end && IsBlank(*value)) ++value;

    if (name == "CONTENT-LENGTH" && mMethod != HttpMethod_HEAD)
        mAnnouncedBody = std::strtoull(std::string(value, end).c_str(), nullptr, 10);
    mResponseHeaders.emplace(ImmutableString::CreateDynamic(name),
                             ImmutableString::CreateDynamic(std::string(value, end)));
}

size_t CurlTransfer::OnBody(char* data, size_t size, size_t count, void* self)
{
    const size_t length = size * count;
    return static_cast<CurlTransfer*>(self)->TakeBody(data, length) ? length : 0;  // 0 ends the transfer
}

bool CurlTransfer::TakeBody(const char* data, size_t length)
{
    if (mBodySink && !mSinkAsked) {
        long status = 0;
        curl_easy_getinfo(mEasy, CURLINFO_RESPONSE_CODE, &status);
        mSinkAsked = true;
        try {
            mStreaming = mBodySink->Accepts(status);
        } catch (const std::exception&) {
            mSinkRefused = true;
            return false;
        }
    }
    // Stopped as soon as it passes the bound, not once it is whole: a server
    // must not be able to make us hold more than the request accepts. The
    // large bound of a streamed body never applies to one held in memory.
    const std::uint64_t bound =
        mStreaming || !mBodySink ? mMaxBody : std::min<std::uint64_t>(mMaxBody, kDefaultMaxResponseBody);
    if (length > bound - mBodyBytes) {
        mTooLarge = true;
        std::vector<unsigned char>().swap(*mResponseBody);
        return false;
    }
    mBodyBytes += length;
    if (mStreaming) {
        try {
            mSinkRefused = !mBodySink->Write(reinterpret_cast<const unsigned char*>(data), length);
        } catch (const std::exception&) {
            mSinkRefused = true;
        }
        return !mSinkRefused;
    }
    try {
        if (mResponseBody->empty())
            mResponseBody->reserve(
                static_cast<size_t>(std::min<std::uint64_t>({mAnnouncedBody, kMaxBodyReserve, mMaxBody})));
        mResponseBody->insert(mResponseBody->end(), data, data + length);
    } catch (const std::bad_alloc&) {
        mOutOfMemory = true;
        return false;
    }
    return true;
}

size_t CurlTransfer::OnRead(char* buffer, size_t size, size_t count, void* self)
{
    return static_cast<CurlTransfer*>(self)->GiveBody(reinterpret_cast<unsigned char*>(buffer), size * count);
}

size_t CurlTransfer::GiveBody(unsigned char* buffer, size_t max)
{
    const size_t wanted = static_cast<size_t>(std::min<std::uint64_t>(max, mBodySource->Size() - mSourceBytes));
    if (wanted == 0) return 0;
    size_t count = 0;
    try {
        count = mBodySource->Read(buffer, wanted);
    } catch (const std::exception& e) {
        mSourceFailure = *e.what() ? e.what() : kSourceShortText;
        return CURL_READFUNC_ABORT;
    }
    // Fewer bytes than announced would leave the server waiting for the rest.
    if (count == 0 || count > wanted) {
        mSourceFailure = kSourceShortText;
        return CURL_READFUNC_ABORT;
    }
    mSourceBytes += count;
    return count;
}

int CurlTransfer::OnSeek(void* self, curl_off_t offset, int origin)
{
    CurlTransfer* transfer = static_cast<CurlTransfer*>(self);
    if (offset != 0 || origin != SEEK_SET) return CURL_SEEKFUNC_CANTSEEK;
    try {
        if (!transfer->mBodySource->Rewind()) return CURL_SEEKFUNC_CANTSEEK;
    } catch (const std::exception& e) {
        transfer->mSourceFailure = e.what();
        return CURL_SEEKFUNC_FAIL;
    }
    transfer->mSourceBytes = 0;
    return CURL_SEEKFUNC_OK;
}

boost::shared_ptr<Response> CurlTransfer::MakeResponse(CURLcode result)
{
    if (!mSourceFailure.empty()) return MakeFailureResponse(UTF8String(mSourceFailure));
    if (mTooLarge) return MakeFailureResponse(UTF8String(kResponseTooLargeText));
    if (mSinkRefused) return MakeFailureResponse(UTF8String(kBodySinkRefusedText));
    if (mOutOfMemory) return MakeFailureResponse(UTF8String("Out of memory while receiving the response"));
    if (result != CURLE_OK) return MakeFailureResponse(DescribeCurlFailure(mEasy, result, mErrorText));
    long status = 0;
    curl_easy_getinfo(mEasy, CURLINFO_RESPONSE_CODE, &status);
    if (status <= 0) return MakeFailureResponse(UTF8String("The server sent no HTTP answer"));
    return boost::shared_ptr<Response>(new Response(static_cast<StatusCode>(status), std::move(mResponseHeaders),
                                                    RecycledMemory::AdaptAsRecycledMemory(mResponseBody)));
}

boost::shared_ptr<Response> CurlTransfer::MakeCancelledResponse()
{
    return MakeFailureResponse(UTF8String(kCancelledText));
}

boost::shared_ptr<Response> CurlTransfer::MakeFailureResponse(const UTF8String& text)
{
    return boost::shared_ptr<Response>(
        new Response(kStatusNoResponse, HeaderList(), RecycledMemory::CopyOf(text.data(), text.size())));
}

}  // namespace http
}  // namespace tolmonet
