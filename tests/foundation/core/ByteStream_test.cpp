// Output streams replace a file whole or not at all; input streams read
// exactly what is asked or throw.

#include <gtest/gtest.h>

#include <sys/stat.h>

#include "foundation/core/ByteStreams.h"
#include "support/FileOpsRecorder.h"
#include "support/TempDir.h"

using namespace tolmocore::filesupport;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
using tolmocore::utility::ToUTF16;

namespace {

void Write(OPlatformByteStream& stream, const std::string& bytes)
{
    stream.WriteBlock(reinterpret_cast<const unsigned char*>(bytes.data()), static_cast<unsigned int>(bytes.size()));
}

std::vector<std::string> Entries(const std::filesystem::path& directory)
{
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(directory)) names.push_back(entry.path().filename());
    std::sort(names.begin(), names.end());
    return names;
}

unsigned Mode(const std::filesystem::path& path)
{
    struct stat info;
    return ::stat(path.c_str(), &info) == 0 ? info.st_mode & 07777 : ~0u;
}

}  // namespace

class ByteStreamTest : public ::testing::Test {
protected:
    File InTemp(const std::string& name) const { return File(mDir, ToUTF16(name)); }

    testsupport::TempDir mTemp;
    Dir mDir{ToUTF16(mTemp.Path().string())};
};

TEST_F(ByteStreamTest, FailedOrAbandonedWritesLeaveTheOldBytesAndNoTemporary)
{
    struct Row {
        const char* mLabel;
        const char* mFailing;  // the file operation that fails, or "" for a stream dropped without Close
        int mError;
    };
    const Row rows[] = {{"dropped without Close", "", 0},      {"no space", "write", ENOSPC},
                        {"a failed sync", "fsync", EIO},       {"a failed close", "close", EIO},
                        {"a failed rename", "rename", EACCES}, {"a read-only directory", "open", EROFS}};
    for (const Row& row : rows) {
        SCOPED_TRACE(row.mLabel);
        WriteFileBytes(mTemp / "settings.xmp", "old bytes");
        testsupport::FileOpsRecorder disk;
        if (*row.mFailing) disk.FailNext(row.mFailing, "", row.mError);
        try {
            OPlatformByteStream out(InTemp("settings.xmp"), 1);
            Write(out, std::string(100000, 'n'));
            if (*row.mFailing) out.Close();
            EXPECT_FALSE(*row.mFailing) << "no error";
        } catch (const FileSystemError& error) {
            EXPECT_EQ(error.Code(), row.mError) << error.what();
        }
        EXPECT_TRUE(disk.AllFailuresMet());
        EXPECT_EQ(ReadFileBytes(mTemp / "settings.xmp"), "old bytes");
        EXPECT_EQ(Entries(mTemp.Path()), std::vector<std::string>{"settings.xmp"});
    }
}

TEST_F(ByteStreamTest, WritesIntoAMissingOrVanishedDirectoryOrOntoADirectoryThrow)
{
    std::filesystem::create_directory(mTemp / "vanishing");
    OPlatformByteStream out(File(Dir(mDir, u"vanishing"), u"f"), 1);
    Write(out, "bytes");
    std::filesystem::remove_all(mTemp / "vanishing");
    EXPECT_THROW(out.Close(), FileSystemError);
    EXPECT_THROW(Write(out, "more"), FileSystemError);
    EXPECT_THROW(out.Close(), FileSystemError);

    EXPECT_THROW(OPlatformByteStream(File(Dir(mDir, u"missing"), u"f"), 1), FileSystemError);
    std::filesystem::create_directory(mTemp / "dir");
    EXPECT_THROW(OPlatformByteStream(InTemp("dir"), 1), FileSystemError);
    EXPECT_EQ(Entries(mTemp.Path()), std::vector<std::string>{"dir"});
}

TEST_F(ByteStreamTest, ReplacementKeepsPermissionsAndLinksButAPrivateWriteIsPrivateAndNeverFollowsOne)
{
    WriteFileBytes(mTemp / "shared", "x");
    std::filesystem::permissions(mTemp / "shared", static_cast<std::filesystem::perms>(0640));
    OPlatformByteStream out(InTemp("shared"), 1);
    Write(out, "y");
    out.Close();
    EXPECT_EQ(Mode(mTemp / "shared"), 0640u);

    const mode_t oldMask = ::umask(027);
    OPlatformByteStream(InTemp("fresh"), 1).Close();
    EXPECT_EQ(Mode(mTemp / "fresh"), 0640u);
    ::umask(0);
    OPlatformByteStream secret(InTemp("secret.xmp"), 1, 0600);
    std::string temporary;  // hidden, and neither a ".temp" nor an ".xmp" that a scan would pick up
    for (const std::string& entry : Entries(mTemp.Path()))
        if (entry.rfind(".secret.xmp.", 0) == 0) temporary = entry;
    const unsigned temporaryMode = Mode(mTemp / temporary);
    secret.Close();
    ::umask(oldMask);
    EXPECT_EQ(temporaryMode, 0600u) << "private before the first byte";
    EXPECT_EQ(temporary.find(".temp"), std::string::npos) << temporary;
    EXPECT_NE(File(ToUTF16(temporary)).GetExtension(true), UTF16String(u".xmp")) << temporary;
    EXPECT_EQ(Mode(mTemp / "secret.xmp"), 0600u);

    std::filesystem::create_symlink("shared", mTemp / "link");
    OPlatformByteStream throughLink(InTemp("link"), 1);
    Write(throughLink, "via link");
    throughLink.Close();
    EXPECT_TRUE(std::filesystem::is_symlink(mTemp / "link"));
    EXPECT_EQ(ReadFileBytes(mTemp / "shared"), "via link");

    // A private write replaces a link planted at its name; what it points to
    // keeps its bytes and its mode.
    std::filesystem::create_symlink("shared", mTemp / "planted");
    OPlatformByteStream notThrough(InTemp("planted"), 1, 0600);
    Write(notThrough, "private");
    notThrough.Close();
    EXPECT_FALSE(std::filesystem::is_symlink(mTemp / "planted"));
    EXPECT_EQ(ReadFileBytes(mTemp / "planted"), "private");
    EXPECT_EQ(Mode(mTemp / "planted"), 0600u);
    EXPECT_EQ(ReadFileBytes(mTemp / "shared"), "via link");
    EXPECT_EQ(Mode(mTemp / "shared"), 0640u);
}

TEST_F(ByteStreamTest, ReadsGiveExactlyTheFileBytesAndNoMore)
{
    std::string bytes;
    for (int i = 0; i < 150000; ++i) bytes.push_back(static_cast<char>(i * 13));
    WriteFileBytes(mTemp / "data", bytes);
    IPlatformByteStream in(InTemp("data"), 1);
    ASSERT_EQ(in.Length(), bytes.size());
    std::string read(bytes.size(), '\0');
    in.ReadBlock(reinterpret_cast<unsigned char*>(&read[0]), 10240);
    in.ReadBlock(reinterpret_cast<unsigned char*>(&read[10240]), static_cast<unsigned int>(bytes.size() - 10240));
    EXPECT_EQ(read, bytes);
    unsigned char extra;
    EXPECT_THROW(in.ReadBlock(&extra, 1), FileSystemError);
    EXPECT_THROW(IPlatformByteStream(InTemp("missing"), 1), FileSystemError);
    std::filesystem::create_directory(mTemp / "dir");
    EXPECT_THROW(IPlatformByteStream(InTemp("dir"), 1), FileSystemError);
}
