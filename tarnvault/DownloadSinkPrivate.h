#pragma once
// Where a download's body goes as it arrives: the file the download was
// given, through an output stream, so that memory does not grow with the
// file. The file appears, whole, only at Close(); until then nothing visible
// changes, and a sink dropped without Close() leaves nothing behind. Not
// installed.
//
// Threads: Accepts and Write run on the processor's network thread; the rest
// on the completion thread, in the download's handler, after the transfer
// has ended (ResponseBodySink.h).

#include <cstdint>
#include <memory>
#include <string>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/File.h"
#include "foundation/core/Strings.h"
#include "foundation/net/ResponseBodySink.h"

namespace tolmonetsync {
namespace tarnvault {

class DownloadSink : public tolmonet::http::ResponseBodySink {
public:
    explicit DownloadSink(const tolmocore::filesupport::File& file);

    // Only a 200's body is content; any other is the server's text.
    bool Accepts(long status) override { return status == 200; }
    // False, with Failure() set, when the file cannot be made or written.
    bool Write(const unsigned char* data, std::size_t size) override;

    // The text of what went wrong in Write; empty if nothing did.
    const std::string& Failure() const { return mFailure; }
    // Adds bytes that came in the Response instead (a processor that does not
    // stream); throws on failure.
    void Append(const UTF8String& body);
    // Bytes written so far.
    std::uint64_t Size() const { return mSize; }
    // Makes the file appear with what was written, empty if nothing was.
    // Throws on failure; the file is then as it was.
    void Close();
    // Drops what was written; the file stays as it was.
    void Discard() { mStream.reset(); }

private:
    void WriteBlock(const unsigned char* data, std::size_t size);

    const tolmocore::filesupport::File mFile;
    std::unique_ptr<tolmocore::filesupport::OPlatformByteStream> mStream;  // opened at the first bytes
    std::uint64_t mSize = 0;
    std::string mFailure;
};

}  // namespace tarnvault
}  // namespace tolmonetsync
