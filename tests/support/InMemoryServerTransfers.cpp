// Uploads and downloads of the in-memory server.

#include <cstdio>
#include <stdexcept>
#include <vector>

#include <boost/date_time/gregorian/gregorian_types.hpp>
#include <boost/date_time/posix_time/posix_time_types.hpp>
#include <boost/thread/locks.hpp>

#include "assets/ChildrenMutex.h"
#include "assets/RestException.h"
#include "foundation/core/ByteStreams.h"
#include "support/InMemoryServer.h"

namespace testsupport {

using namespace tolmonetsync;
using tolmocore::filesupport::File;
using tolmocore::filesupport::IPlatformByteStream;
using tolmocore::filesupport::OPlatformByteStream;
using tolmocore::utility::AsciiToUTF16;

namespace {

boost::shared_ptr<tolmonet::Response> ResponseOf(const InMemoryAnswer& answer)
{
    return boost::shared_ptr<tolmonet::Response>(new tolmonet::Response(
        answer.mStatus, tolmonet::HeaderList(), RecycledMemory::CopyOf(answer.mError.data(), answer.mError.size())));
}

// The form a service puts in Last-Modified ("Tue, 24 Nov 2026 08:49:37 GMT"),
// spelled out by hand so that no locale changes it.
UTF16String HttpDate(const boost::posix_time::ptime& time)
{
    if (time.is_not_a_date_time() || time.is_infinity()) return UTF16String();
    static const char* const kDays[] = {"Sun", "Mon", "Tue", "Wed", "Thu", "Fri", "Sat"};
    static const char* const kMonths[] = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                          "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
    const boost::gregorian::date day = time.date();
    const boost::posix_time::time_duration clock = time.time_of_day();
    char text[40];
    std::snprintf(text, sizeof(text), "%s, %02d %s %04d %02d:%02d:%02d GMT", kDays[day.day_of_week().as_number()],
                  static_cast<int>(day.day()), kMonths[day.month() - 1], static_cast<int>(day.year()),
                  static_cast<int>(clock.hours()), static_cast<int>(clock.minutes()),
                  static_cast<int>(clock.seconds()));
    return AsciiToUTF16(text);
}

// The whole file, as the real client reads it before it posts.
std::string ReadWhole(const File& file)
{
    IPlatformByteStream stream(file, 1);
    const std::uint64_t length = stream.Length();
    if (length >> 32) throw std::runtime_error("File size beyond the limitation!");
    std::string bytes(static_cast<std::size_t>(length), '\0');
    if (length != 0) stream.ReadBlock(reinterpret_cast<unsigned char*>(&bytes[0]), static_cast<unsigned int>(length));
    return bytes;
}

}  // namespace

Guid InMemoryServer::UploadAsync(const ItemCallback& success, const ErrorCallback& error,
                                 const boost::shared_ptr<Collection>& collection, const File& file,
                                 const ImmutableString& contentType, const UTF16String& name, const Guid& requestUID)
{
    mFaults.OnCall(InMemoryOperation_Upload);
    const UTF16String assetName = name.empty() ? file.GetName() : name;
    const UTF8String type = contentType.ToUTF8String();
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    return SearchFor(
        InMemoryOperation_Upload,
        [self, collection, file, type, assetName, success, error](
            const Guid& guid, const std::vector<boost::shared_ptr<AssetBase> >& assets) {
            self->_HandleUploadSearch(collection, file, type, assetName, success, error, guid, assets);
        },
        error, SearchQuery(collection, assetName), requestUID);
}

void InMemoryServer::_HandleUploadSearch(const boost::shared_ptr<Collection>& collection, const File& file,
                                         const UTF8String& contentType, const UTF16String& name,
                                         const ItemCallback& success, const ErrorCallback& error,
                                         const Guid& requestUID,
                                         const std::vector<boost::shared_ptr<AssetBase> >& assets)
{
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    if (!assets.empty()) {
        // Old assets of the name go first, the last one found first, one
        // after the other: there is never a moment with old and new side by side.
        const boost::shared_ptr<AssetBase> last = assets.back();
        const std::vector<boost::shared_ptr<AssetBase> > rest(assets.begin(), assets.end() - 1);
        const Guid sent = DeleteFor(
            InMemoryOperation_Upload,
            [self, collection, file, contentType, name, success, error, rest](const Guid& guid) {
                self->_HandleUploadSearch(collection, file, contentType, name, success, error, guid, rest);
            },
            error, last, true, requestUID);
        if (sent.IsNil()) error(requestUID, boost::shared_ptr<tolmonet::Response>());
        return;
    }

    boost::shared_ptr<const std::string> bytes;
    try {
        bytes.reset(new std::string(ReadWhole(file)));
    } catch (const std::exception& failure) {
        return error(requestUID, MakeErrorResponse(AsciiToUTF16(failure.what())));
    }
    const UTF8String collectionId = collection->mId;
    const bool sent = Send(
        InMemoryOperation_Upload, InMemoryRequest_Upload, requestUID,
        [self, collectionId, name, contentType, bytes]() {
            return self->mTree.Upload(collectionId, name, contentType, *bytes);
        },
        [self, collection, success, error](const Guid& guid, const InMemoryAnswer& answer) {
            self->_HandleUploadPost(collection, success, error, guid, answer);
        });
    if (!sent) error(requestUID, boost::shared_ptr<tolmonet::Response>());
}

void InMemoryServer::_HandleUploadPost(const boost::shared_ptr<Collection>& collection, const ItemCallback& success,
                                       const ErrorCallback& error, const Guid& requestUID, const InMemoryAnswer& answer)
{
    if (answer.mStatus != 201) return error(requestUID, ResponseOf(answer));
    const UTF8String etag = answer.mEtag;
    const Guid sent = HeaderFor(
        InMemoryOperation_Upload,
        [collection, etag, success, error](const Guid& guid, const boost::shared_ptr<AssetBase>& asset) {
            const boost::shared_ptr<Item> item = boost::dynamic_pointer_cast<Item>(asset);
            if (!item) return error(guid, MakeErrorResponse(u"Upload: the answer is no item"));
            item->mEtag = etag;
            {
                boost::unique_lock<boost::recursive_mutex> lock(ChildrenMutex());
                collection->mChildren.push_back(item);
            }
            success(guid, item);
        },
        error, answer.mId, requestUID);
    if (sent.IsNil()) error(requestUID, MakeErrorResponse(u"Upload Header failed"));
}

Guid InMemoryServer::DownloadAsync(const DownloadCallback& success, const ErrorCallback& error,
                                   const boost::shared_ptr<Item>& item, const File& file, const UTF8String& etag,
                                   const Guid& requestUID)
{
    mFaults.OnCall(InMemoryOperation_Download);
    boost::shared_ptr<InMemoryServer> self = shared_from_this();
    const UTF8String id = item->mId;
    const bool sent = Send(
        InMemoryOperation_Download, InMemoryRequest_Download, requestUID,
        [self, id, etag]() { return self->mTree.Download(id, etag); },
        [file, success, error](const Guid& guid, const InMemoryAnswer& answer) {
            DownloadResult result;
            if (answer.mStatus == 304) return success(guid, result);  // unchanged: the file is not touched
            if (answer.mStatus != 200) return error(guid, ResponseOf(answer));
            try {
                file.Create(false);
                OPlatformByteStream stream(file, 1);
                const std::string& bytes = *answer.mBytes;
                if (static_cast<std::uint64_t>(bytes.size()) >> 32) {
                    throw std::runtime_error("Data size beyond the limitation!");
                }
                if (!bytes.empty()) {
                    stream.WriteBlock(reinterpret_cast<const unsigned char*>(bytes.data()),
                                      static_cast<unsigned int>(bytes.size()));
                }
                result.mContentType = answer.mContentType;
                result.mEtag = answer.mEtag;
                result.mLastModified = HttpDate(answer.mModified);
                result.mContentSize = bytes.size();
                result.mDownloaded = true;
                stream.Close();
            } catch (const std::exception& failure) {
                error(guid, MakeErrorResponse(AsciiToUTF16(failure.what())));
                try {
                    if (file.Exists()) file.Delete();
                } catch (const std::exception&) {
                }
                return;
            }
            success(guid, result);
        });
    return sent ? requestUID : Guid();
}

}  // namespace testsupport
