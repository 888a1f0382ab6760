// Moving content: upload (after deleting what has the name) and conditional
// download into a given file, streamed there as it arrives.

#include <algorithm>
#include <cstdio>

#include <boost/bind/bind.hpp>
#include <boost/function.hpp>
#include <boost/thread/lock_guard.hpp>

#include "assets/ChildrenMutex.h"
#include "foundation/core/ByteStreams.h"
#include "foundation/net/HeaderConstants.h"
#include "foundation/net/QuoteURL.h"
#include "tarnvault/DownloadSinkPrivate.h"
#include "tarnvault/DownloadSinkWorkers.h"
#include "tarnvault/TarnvaultPrivate.h"
#include "tarnvault/UploadSourcePrivate.h"

namespace tolmonetsync {
namespace tarnvault {

namespace json = tolmocore::serialization;
using boost::placeholders::_1;
using boost::placeholders::_2;
using tolmocore::filesupport::File;
using tolmocore::utility::UTF16to8;

namespace {

using Assets = std::vector<boost::shared_ptr<AssetBase> >;

void _HandleHeaderUpload(const boost::shared_ptr<Collection>& collection, const UTF8String& etag,
                         const ItemCallback& success, const ErrorCallback& error, const Guid& requestUID,
                         const boost::shared_ptr<AssetBase>& asset)
{
    // A collection's description for a new file is no answer we can use.
    const boost::shared_ptr<Item> item = boost::dynamic_pointer_cast<Item>(asset);
    if (!item) {
        TOLMO_TRACE("Tarnvault", 1, "Warning: _HandleHeaderUpload: " << requestUID << ": not an item");
        error(requestUID,
              MakeErrorResponse(tolmocore::utility::ToUTF16("Upload: the new asset's metadata is not an item")));
        return;
    }
    item->mEtag = etag;
    {
        boost::lock_guard<boost::recursive_mutex> lock(ChildrenMutex());
        collection->mChildren.push_back(item);
    }
    success(requestUID, item);
}

// Reports an upload whose file could not be read, or changed before it was
// all sent; the server has no whole body of it.
void FailUpload(const File& file, const ErrorCallback& error, const Guid& requestUID, const std::string& text)
{
    TOLMO_TRACE("Tarnvault", 1,
                "Error: Upload: " << file.FullPath() << ", error: " << text << ", requestUID: " << requestUID);
    error(requestUID, MakeErrorResponse(tolmocore::utility::AsciiToUTF16(text.c_str())));
}

void _HandleUpload(const boost::weak_ptr<Tarnvault>& self, const boost::shared_ptr<Collection>& collection,
                   const File& file, const boost::shared_ptr<UploadSource>& source, const ItemCallback& success,
                   const ErrorCallback& error, const Guid& requestUID,
                   const boost::shared_ptr<tolmonet::Response>& response)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    _HandleBody("Upload", requestUID, response);
    if (source && !source->Failure().empty()) {
        FailUpload(file, error, requestUID, source->Failure());
        return;
    }
    if (response->status != 201) {
        error(requestUID, response);
        return;
    }
    const UTF8String uid = Tarnvault::GetUIDFromLocation(response);
    const UTF8String etag = LastHeader(response, tolmonet::kHEADER_ETAG);
    const Guid sent = client->HeaderAsync(boost::bind(&_HandleHeaderUpload, collection, etag, success, error, _1, _2),
                                          error, uid, false, requestUID);
    if (sent.IsNil()) error(requestUID, MakeErrorResponse(tolmocore::utility::ToUTF16("Upload Header failed")));
}

}  // namespace

// Runs again after each delete, with one asset fewer; posts when none is left.
void Tarnvault::_HandleUploadAsyncSearch(const boost::weak_ptr<Tarnvault>& self,
                                         const boost::shared_ptr<Collection>& collection, const File& file,
                                         const ImmutableString& contentType, const UTF16String& name,
                                         const ItemCallback& success, const ErrorCallback& error,
                                         const Guid& requestUID, const Assets& assets)
{
    const boost::shared_ptr<Tarnvault> client = self.lock();
    if (!client) return;
    if (!assets.empty()) {
        const Assets rest(assets.begin(), assets.end() - 1);
        const SuccessCallback next = boost::bind(&Tarnvault::_HandleUploadAsyncSearch, client, collection, file,
                                                 contentType, name, success, error, _1, rest);
        if (client->DeleteAsync(next, error, assets.back(), true, requestUID).IsNil())
            error(requestUID, boost::shared_ptr<tolmonet::Response>());
        return;
    }

    tolmonet::FormList pairs;
    pairs.push_back(std::make_pair(kName, UTF16to8(name)));
    boost::any collections = json::JSONArray();
    json::AppendToArray(collections, boost::any(UTF8String("/api/collections/") + collection->mId));
    pairs.push_back(std::make_pair(kCollections, json::GetJSONUTF8String(collections, false)));
    const UTF8String url = client->mServerURL + "/assets" + "?" + tolmonet::QuoteURL(pairs);

    // The body streams from the file as it goes out; an empty file sends none.
    boost::shared_ptr<UploadSource> source;
    std::uint64_t length = 0;
    try {
        source.reset(new UploadSource(file));
        length = source->Size();
        if (length == 0) source.reset();
    } catch (const std::exception& e) {
        FailUpload(file, error, requestUID, e.what());
        return;
    }

    char lengthText[32];
    std::snprintf(lengthText, sizeof lengthText, "%llu", static_cast<unsigned long long>(length));
    tolmonet::HeaderList headers;
    headers.insert(std::make_pair(tolmonet::kHEADER_CONTENT_TYPE, contentType));
    headers.insert(std::make_pair(tolmonet::kHEADER_CONTENT_LENGTH, ImmutableString::CreateDynamic(lengthText)));
    headers.insert(std::make_pair(kPersistencePolicy, kEthereal));
    TOLMO_TRACE("Tarnvault", 8,
                "Upload"
                    << ", path: " << file.FullPath() << ", collection: " << collection
                    << ", url: " << RedactedForTrace(url) << ", requestUID: " << requestUID);
    tolmonet::Configuration configuration;
    configuration.mBodySource = source;
    const bool taken = client->mProcessor->POST(
        requestUID, boost::bind(&_HandleUpload, client, collection, file, source, success, error, _1, _2),
        ImmutableString::CreateDynamic(url), tolmonet::http::RequestProcessor::Body(), headers, configuration);
    if (!taken) error(requestUID, boost::shared_ptr<tolmonet::Response>());
}

Guid Tarnvault::UploadAsync(const ItemCallback& success, const ErrorCallback& error,
                            const boost::shared_ptr<Collection>& collection, const File& file,
                            const ImmutableString& contentType, const UTF16String& name, const Guid& requestUID)
{
    const UTF16String assetName = name.empty() ? file.GetName() : name;
    const SearchQuery query(collection, assetName);
    const boost::shared_ptr<Tarnvault> self = shared_from_this();
    return SearchAsync(boost::bind(&Tarnvault::_HandleUploadAsyncSearch, self, collection, file, contentType,
                                   assetName, success, error, _1, _2),
                       error, query, requestUID);
}

namespace {

constexpr char kDownloadTooLarge[] = "Data size beyond the limitation!";

// Reports a download that could not be finished, and removes what it may
// have left in its file.
void FailDownload(const File& file, const ErrorCallback& error, const Guid& requestUID, const char* text)
{
    TOLMO_TRACE("Tarnvault", 1,
                "Error: Download: " << file.FullPath() << ", error: " << text << ", requestUID: " << requestUID);
    error(requestUID, MakeErrorResponse(tolmocore::utility::AsciiToUTF16(text)));
    try {
        if (file.Exists()) file.Delete();
    } catch (const std::exception&) {
    }
}

// What a finished download hands from its worker back to the completion
// thread. The callbacks are taken out there, so that whatever they keep alive
// is let go on that thread, never on the worker.
struct FinishedDownload {
    File mFile;
    boost::shared_ptr<DownloadSink> mSink;
    DownloadResult mResult;
    DownloadCallback mSuccess;
    ErrorCallback mError;
    Guid mRequestUID;
    std::string mFailure;
};

void _ReportFinishedDownload(const boost::shared_ptr<FinishedDownload>& finished)
{
    DownloadCallback success;
    ErrorCallback error;
    success.swap(finished->mSuccess);
    error.swap(finished->mError);
    if (!finished->mFailure.empty())
        FailDownload(finished->mFile, error, finished->mRequestUID, finished->mFailure.c_str());
    else
        success(finished->mRequestUID, finished->mResult);
}

void _HandleDownload(const boost::shared_ptr<tolmonet::http::RequestProcessor>& processor, const File& file,
                     const boost::shared_ptr<DownloadSink>& sink, std::uint64_t limit, const DownloadCallback& success,
                     const ErrorCallback& error, const Guid& requestUID,
                     const boost::shared_ptr<tolmonet::Response>& response)
{
    const UTF8String body = _HandleBody("Download", requestUID, response);
    // Nothing of an answer that failed may reach the file.
    if (response->status != 200) sink->Discard();
    if (!sink->Failure().empty()) {
        FailDownload(file, error, requestUID, sink->Failure().c_str());
        return;
    }
    if (tolmonet::IsResponseTooLarge(*response)) {
        FailDownload(file, error, requestUID, kDownloadTooLarge);
        return;
    }
    DownloadResult result;
    if (response->status == 304) {
        success(requestUID, result);
        return;
    }
    if (response->status != 200) {
        error(requestUID, response);
        return;
    }
    try {
        // The body streamed into the sink, or, from a processor that does
        // not stream, came whole in the response.
        if (sink->Size() + body.size() >= limit) throw std::runtime_error(kDownloadTooLarge);
        sink->Append(body);
    } catch (const std::exception& e) {
        sink->Discard();
        FailDownload(file, error, requestUID, e.what());
        return;
    }
    result.mContentType = LastHeader(response, tolmonet::kHEADER_CONTENT_TYPE);
    result.mEtag = LastHeader(response, tolmonet::kHEADER_ETAG);
    result.mLastModified = tolmocore::utility::UTF8to16(LastHeader(response, kLastModified));
    result.mContentSize = sink->Size();
    result.mDownloaded = true;
    TOLMO_TRACE("Tarnvault", 8,
                "Download" << ", content-type: " << result.mContentType << ", content-size: "
                           << result.mContentSize << ", etag: " << result.mEtag
                           << ", last_modified: " << result.mLastModified << ", requestUID: " << requestUID);
    // The file's sync waits on the disk: on a worker it overlaps other
    // downloads' syncs, and the host still hears on the completion thread.
    const boost::shared_ptr<FinishedDownload> finished(
        new FinishedDownload{file, sink, result, success, error, requestUID, std::string()});
    RunOnDownloadWorker([processor, finished] {
        try {
            finished->mSink->Finish();
        } catch (const std::exception& e) {
            finished->mFailure = *e.what() ? e.what() : "Download: the file could not be written";
        }
        finished->mSink.reset();
        processor->CallAsynchronously(boost::bind(&_ReportFinishedDownload, finished), 0);
    });
}

}  // namespace

Guid Tarnvault::DownloadAsync(const DownloadCallback& success, const ErrorCallback& error,
                              const boost::shared_ptr<Item>& item, const File& file, const UTF8String& etag,
                              const Guid& requestUID)
{
    const UTF8String url = mServerURL + "/assets/" + item->mId;
    tolmonet::HeaderList headers;
    if (!etag.empty())
        headers.insert(std::make_pair(tolmonet::kHEADER_IF_NONE_MATCH, ImmutableString::CreateDynamic(etag)));
    TOLMO_TRACE("Tarnvault", 8,
                "Download"
                    << ", path: " << file.FullPath() << ", asset: " << item << ", url: " << RedactedForTrace(url)
                    << ", etag: " << etag << ", requestUID: " << requestUID);
    const std::uint64_t limit = DownloadSizeLimit();
    const boost::shared_ptr<DownloadSink> sink(new DownloadSink(file));
    tolmonet::Configuration configuration;
    configuration.mMaxResponseBody = limit - 1;
    configuration.mBodySink = sink;
    const bool taken = mProcessor->GET(
        requestUID, boost::bind(&_HandleDownload, mProcessor, file, sink, limit, success, error, _1, _2),
        ImmutableString::CreateDynamic(url), headers, configuration);
    return Sent(taken, requestUID);
}

void Tarnvault::SetDownloadSizeLimit(std::uint64_t bytes)
{
    mDownloadSizeLimit = std::max<std::uint64_t>(1, std::min(bytes, kMaxDownloadSize));
}

}  // namespace tarnvault
}  // namespace tolmonetsync
