#pragma once
// Where an upload's body comes from: its file, read as the body goes out, so
// that memory does not grow with the file. The body is a consistent snapshot
// of the file: its size, modification time and identity are taken when the
// upload is set up, and checked again when the file is opened to send and
// once the last bytes are read, before they leave. A change stops the
// transfer, so the server never gets a whole body. Not installed.
//
// The file is opened for the send only when the first bytes are asked for:
// a pass queues all its posts at once, and a descriptor held by each queued
// one would run out of descriptors long before memory ran short.
//
// Threads: made on the completion thread; Read and Rewind run on the
// network thread (RequestBodySource.h); Failure in the upload's handler,
// after the transfer has ended.

#include <sys/stat.h>

#include <cstdint>
#include <string>

#include "foundation/core/File.h"
#include "foundation/net/RequestBodySource.h"

namespace tolmonetsync {
namespace tarnvault {

// Why an upload stopped when its file changed while it was being sent.
extern const char kUploadChangedText[];

class UploadSource : public tolmonet::http::RequestBodySource {
public:
    // Takes the snapshot. Throws if the file cannot be opened for reading, is
    // not a regular file, or has 2^32 bytes or more ("File size beyond the
    // limitation!").
    explicit UploadSource(const tolmocore::filesupport::File& file);
    ~UploadSource() override;
    UploadSource(const UploadSource&) = delete;
    UploadSource& operator=(const UploadSource&) = delete;

    std::uint64_t Size() const override { return static_cast<std::uint64_t>(mSnapshot.st_size); }
    // Throws, with Failure() set, if the file cannot be read or is no longer
    // the snapshot.
    std::size_t Read(unsigned char* buffer, std::size_t max) override;
    bool Rewind() override;

    // Why Read stopped the transfer; empty if it did not.
    const std::string& Failure() const { return mFailure; }

private:
    std::size_t ReadNext(unsigned char* buffer, std::size_t max);
    // Throws kUploadChangedText unless the open file still matches the snapshot.
    void CheckUnchanged() const;

    const tolmocore::filesupport::File mFile;
    struct stat mSnapshot;
    int mFd = -1;  // open from the first Read on
    std::uint64_t mOffset = 0;
    std::string mFailure;
};

}  // namespace tarnvault
}  // namespace tolmonetsync
