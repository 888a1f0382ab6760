#include "tarnvault/DownloadSinkPrivate.h"

#include <algorithm>
#include <stdexcept>

namespace tolmonetsync {
namespace tarnvault {

DownloadSink::DownloadSink(const tolmocore::filesupport::File& file) : mFile(file) {}

bool DownloadSink::Write(const unsigned char* data, std::size_t size)
{
    try {
        WriteBlock(data, size);
        return true;
    } catch (const std::exception& e) {
        mFailure = *e.what() ? e.what() : "Download: the file could not be written";
        mStream.reset();  // drops what was written
        return false;
    }
}

void DownloadSink::Append(const UTF8String& body)
{
    WriteBlock(body.data(), body.size());
}

void DownloadSink::Close()
{
    WriteBlock(nullptr, 0);  // an empty body still makes the file
    mStream->Close();
    mStream.reset();
}

void DownloadSink::WriteBlock(const unsigned char* data, std::size_t size)
{
    if (!mStream) {
        mFile.Create(false);
        // Private while it arrives: the swap gives it the mode of the file it
        // replaces, or a new file's default.
        mStream.reset(new tolmocore::filesupport::OPlatformByteStream(mFile, 0, 0600));
    }
    // Bodies may pass the block call's 32-bit size; so can one Append.
    while (size > 0) {
        const unsigned int part = static_cast<unsigned int>(std::min<std::size_t>(size, 1u << 30));
        mStream->WriteBlock(data, part);
        data += part;
        size -= part;
        mSize += part;
    }
}

}  // namespace tarnvault
}  // namespace tolmonetsync
