#pragma once
// Where a download's body goes as it arrives: into the file the download was
// given (the ".temp" beside its target), so that memory does not grow with the
// file. Where nothing is at that name, the file is made there, private (0600),
// and written in place; where something is, an output stream replaces it
// whole at Finish() (ByteStreams.h), never writing through a link. A small
// body is held until Finish(), so that making, writing and syncing it happen
// off the network thread. A sink dropped without Finish() leaves things as
// they were: what it made is removed.
//
// Every file operation goes through the process-wide FileOps (FileOps.h).
//
// Threads: Accepts and Write run on the processor's network thread; the rest
// after the transfer has ended (ResponseBodySink.h), on the completion thread
// or, for Finish(), on a worker it was handed to. One thread at a time.

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include <boost/shared_ptr.hpp>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/File.h"
#include "foundation/core/FileOps.h"
#include "foundation/core/Strings.h"
#include "foundation/net/ResponseBodySink.h"

namespace tolmonetsync {
namespace tarnvault {

class DownloadSink : public tolmonet::http::ResponseBodySink {
public:
    explicit DownloadSink(const tolmocore::filesupport::File& file);
    ~DownloadSink() override;
    DownloadSink(const DownloadSink&) = delete;
    DownloadSink& operator=(const DownloadSink&) = delete;

    // Only a 200's body is content; any other is the server's text.
    bool Accepts(long status) override { return status == 200; }
    // False, with Failure() set, when the file cannot be made or written.
    bool Write(const unsigned char* data, std::size_t size) override;

    // The text of what went wrong in Write; empty if nothing did.
    const std::string& Failure() const { return mFailure; }
    // Adds bytes that came in the Response instead (a processor that does not
    // stream); throws on failure.
    void Append(const UTF8String& body);
    // Bytes taken so far.
    std::uint64_t Size() const { return mSize; }
    // Writes what is held, syncs the file and closes it: afterwards its bytes
    // are on the disk under the file's name (an empty body makes an empty
    // file). A file made in place does not have its directory entry synced:
    // the swap that follows renames it, and that rename's directory is synced
    // before anything records it. Throws on failure; the file is then as it
    // was before the download.
    void Finish();
    // Drops what was taken and removes the file if this sink made it.
    void Discard() noexcept;

private:
    void Take(const unsigned char* data, std::size_t size);
    void MakeFile();
    void WriteAll(const unsigned char* data, std::size_t size);

    const boost::shared_ptr<tolmocore::filesupport::FileOps> mOps;  // one instance throughout
    const tolmocore::filesupport::File mFile;
    const std::string mPath;  // mFile as the system names it
    int mFd = -1;             // a file made in place, until Finish() or Discard()
    bool mMade = false;       // whether mPath is this sink's file
    std::unique_ptr<tolmocore::filesupport::OPlatformByteStream> mStream;  // or one that replaces what was there
    std::vector<unsigned char> mHeld;                                      // taken, not yet written
    std::uint64_t mSize = 0;
    std::string mFailure;
};

}  // namespace tarnvault
}  // namespace tolmonetsync
