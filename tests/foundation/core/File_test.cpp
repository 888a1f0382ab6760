// Files as the engine sees them: names that stay inside their directory,
// extensions, dates that survive the cache file, renames and copies.

#include <gtest/gtest.h>

#include <sys/stat.h>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "foundation/core/ByteStreams.h"
#include "foundation/core/File.h"
#include "support/TempDir.h"

using namespace tolmocore::filesupport;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
using tolmocore::utility::ToUTF16;

class FileTest : public ::testing::Test {
protected:
    File InTemp(const std::string& name) const { return File(mDir, ToUTF16(name)); }

    testsupport::TempDir mTemp;
    Dir mDir{ToUTF16(mTemp.Path().string())};
};

TEST_F(FileTest, NamesThatWouldLeaveTheDirectoryAreRefused)
{
    for (const char16_t* name : {u"", u".", u"..", u"../x", u"a/b", u"/etc"})
        EXPECT_THROW(File(mDir, UTF16String(name)), std::invalid_argument) << tolmocore::utility::ToNarrow(name);
    EXPECT_THROW(File(mDir, UTF16String(u"a\0b", 3)), std::invalid_argument);
    EXPECT_EQ(InTemp("..a").GetName(), UTF16String(u"..a"));

    WriteFileBytes(mTemp / "a", "x");
    File file = InTemp("a");
    EXPECT_THROW(file.Rename(u"../escaped"), std::invalid_argument);
    EXPECT_THROW(file.Rename(u".."), std::invalid_argument);
    EXPECT_TRUE(file.Exists());
    EXPECT_FALSE(std::filesystem::exists(mTemp.Path().parent_path() / "escaped"));
}

TEST_F(FileTest, ExtensionsIncludeTheirDot)
{
    EXPECT_EQ(InTemp("photo.xmp").GetExtension(true), UTF16String(u".xmp"));
    EXPECT_EQ(InTemp("photo.xmp").GetExtension(false), UTF16String(u"xmp"));
    EXPECT_EQ(InTemp("a.b.c").GetExtension(true), UTF16String(u".c"));
    EXPECT_EQ(InTemp("README").GetExtension(true), UTF16String());
    EXPECT_EQ(InTemp(".profile").GetExtension(true), UTF16String());
    EXPECT_EQ(InTemp(".hidden.xmp").GetExtension(true), UTF16String(u".xmp"));
    EXPECT_EQ(InTemp("name.").GetExtension(true), UTF16String(u"."));
    EXPECT_EQ(File(u"/a.d/plain").GetExtension(true), UTF16String());
}

TEST_F(FileTest, PathsAreComparedAfterDroppingRepeatedSlashes)
{
    EXPECT_EQ(File(u"/a//b/c"), File(Dir(u"/a/b/"), u"c"));
    EXPECT_NE(File(u"/a/b/c"), File(u"/a/b/d"));
    EXPECT_EQ(File(u"/a/b/c").Parent(), Dir(u"/a/b"));
    EXPECT_EQ(File(u"/c").Parent(), Dir(u"/"));
    EXPECT_EQ(File(u"/a/b/c").GetName(), UTF16String(u"c"));
}

TEST_F(FileTest, ModifiedRoundTripsThroughTextAtMicroseconds)
{
    WriteFileBytes(mTemp / "dated", "x");
    const File file = InTemp("dated");
    const boost::posix_time::ptime when = boost::posix_time::time_from_string("2024-03-05 12:34:56.123456");
    file.SetModified(when);
    const boost::posix_time::ptime read = file.Modified();
    EXPECT_EQ(read, when);
    const std::string text = boost::posix_time::to_simple_string(read);
    EXPECT_EQ(boost::date_time::parse_delimited_time<boost::posix_time::ptime>(text, ' '), read);

    // Whatever the file system stores, what is read back has no sub-microsecond part.
    WriteFileBytes(mTemp / "fresh", "x");
    const boost::posix_time::ptime fresh = InTemp("fresh").Modified();
    EXPECT_EQ(boost::date_time::parse_delimited_time<boost::posix_time::ptime>(
                  boost::posix_time::to_simple_string(fresh), ' '),
              fresh);

    EXPECT_THROW(file.SetModified(boost::posix_time::not_a_date_time), std::invalid_argument);
    EXPECT_THROW(InTemp("missing").Modified(), FileSystemError);
}

TEST_F(FileTest, SizeAndExistsConcernRegularFilesOnly)
{
    WriteFileBytes(mTemp / "five", "12345");
    std::filesystem::create_directory(mTemp / "sub");
    EXPECT_EQ(InTemp("five").Size(FileSizeSelector_Data), 5u);
    EXPECT_TRUE(InTemp("five").Exists());
    EXPECT_FALSE(InTemp("sub").Exists());
    EXPECT_FALSE(InTemp("missing").Exists());
    EXPECT_THROW(InTemp("sub").Size(FileSizeSelector_Data), FileSystemError);
    try {
        InTemp("missing").Size(FileSizeSelector_Data);
        FAIL() << "no exception";
    } catch (const FileSystemError& error) {
        EXPECT_EQ(error.Code(), ENOENT);
        EXPECT_NE(std::string(error.what()).find((mTemp / "missing").string()), std::string::npos) << error.what();
    }
}

TEST_F(FileTest, RenameReplacesAFileInOneStepButNeverADirectory)
{
    WriteFileBytes(mTemp / "settings.xmp.temp", "new");
    WriteFileBytes(mTemp / "settings.xmp", "old");
    File file = InTemp("settings.xmp.temp");
    file.Rename(u"settings.xmp");
    EXPECT_EQ(file, InTemp("settings.xmp"));
    EXPECT_EQ(ReadFileBytes(mTemp / "settings.xmp"), "new");
    EXPECT_FALSE(std::filesystem::exists(mTemp / "settings.xmp.temp"));

    std::filesystem::create_directories(mTemp / "dir" / "inside");
    EXPECT_THROW(file.Rename(u"dir"), FileSystemError);
    EXPECT_TRUE(std::filesystem::exists(mTemp / "dir" / "inside"));
    EXPECT_EQ(ReadFileBytes(mTemp / "settings.xmp"), "new");
    EXPECT_THROW(InTemp("missing").Rename(u"other"), FileSystemError);
    EXPECT_THROW(InTemp("dir").Rename(u"other"), FileSystemError);
}

TEST_F(FileTest, DeleteAndCreate)
{
    WriteFileBytes(mTemp / "gone", "x");
    EXPECT_TRUE(InTemp("gone").Delete());
    EXPECT_FALSE(InTemp("gone").Delete());
    std::filesystem::create_directory(mTemp / "sub");
    EXPECT_THROW(InTemp("sub").Delete(), FileSystemError);
    EXPECT_TRUE(std::filesystem::is_directory(mTemp / "sub"));

    InTemp("later").Create(false);
    EXPECT_FALSE(std::filesystem::exists(mTemp / "later"));
    InTemp("now").Create(true);
    EXPECT_EQ(ReadFileBytes(mTemp / "now"), "");
    WriteFileBytes(mTemp / "kept", "data");
    InTemp("kept").Create(true);
    EXPECT_EQ(ReadFileBytes(mTemp / "kept"), "data");
    EXPECT_THROW(File(Dir(mDir, u"nowhere"), u"f").Create(false), FileSystemError);
}

TEST_F(FileTest, CopyKeepsBytesPermissionsAndDate)
{
    std::string bytes(200000, '\0');
    for (size_t i = 0; i < bytes.size(); ++i) bytes[i] = static_cast<char>(i * 7);
    WriteFileBytes(mTemp / "private", bytes);
    std::filesystem::permissions(mTemp / "private",
                                 std::filesystem::perms::owner_read | std::filesystem::perms::owner_write);
    const File source = InTemp("private");
    source.SetModified(boost::posix_time::time_from_string("2021-01-02 03:04:05.000006"));

    source.CopyTo(InTemp("backup"));
    EXPECT_EQ(ReadFileBytes(mTemp / "backup"), bytes);
    EXPECT_EQ(std::filesystem::status(mTemp / "backup").permissions(),
              std::filesystem::status(mTemp / "private").permissions());
    EXPECT_EQ(InTemp("backup").Modified(), source.Modified());
    EXPECT_THROW(InTemp("missing").CopyTo(InTemp("backup")), FileSystemError);
    EXPECT_EQ(ReadFileBytes(mTemp / "backup"), bytes);
}
