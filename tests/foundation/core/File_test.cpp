// Files as the engine sees them: names that stay inside their directory,
// extensions, dates that survive the cache file, renames and copies.

#include <gtest/gtest.h>

#include <boost/date_time/posix_time/posix_time.hpp>

#include "foundation/core/File.h"
#include "support/TempDir.h"

using namespace tolmocore::filesupport;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
using tolmocore::utility::ToNarrow;
using tolmocore::utility::ToUTF16;

class FileTest : public ::testing::Test {
protected:
    File InTemp(const std::string& name) const { return File(mDir, ToUTF16(name)); }

    testsupport::TempDir mTemp;
    Dir mDir{ToUTF16(mTemp.Path().string())};
};

TEST_F(FileTest, NamesThatWouldLeaveTheirDirectoryAreRefused)
{
    for (const UTF16String& name : {UTF16String(u""), UTF16String(u"."), UTF16String(u".."), UTF16String(u"../x"),
                                    UTF16String(u"a/.."), UTF16String(u"/"), UTF16String(u"a\0b", 3)}) {
        EXPECT_THROW(File(mDir, name), std::invalid_argument) << ToNarrow(name);
        EXPECT_THROW(Dir(mDir, name), std::invalid_argument) << ToNarrow(name);
    }
    EXPECT_EQ(InTemp("..a").GetName(), UTF16String(u"..a"));
    EXPECT_EQ(File(u"/a//b/c"), File(Dir(u"/a/b/"), u"c"));

    WriteFileBytes(mTemp / "a", "x");
    File file = InTemp("a");
    EXPECT_THROW(file.Rename(u"../escaped"), std::invalid_argument);
    EXPECT_THROW(file.Rename(u".."), std::invalid_argument);
    EXPECT_TRUE(file.Exists());
    EXPECT_FALSE(std::filesystem::exists(mTemp.Path().parent_path() / "escaped"));
}

TEST_F(FileTest, ExtensionsIncludeTheirDot)
{
    const std::pair<const char*, const char16_t*> rows[] = {{"photo.xmp", u".xmp"},   {"a.b.c", u".c"},
                                                            {"README", u""},          {".profile", u""},
                                                            {".hidden.xmp", u".xmp"}, {"name.", u"."}};
    for (const auto& row : rows) EXPECT_EQ(InTemp(row.first).GetExtension(true), UTF16String(row.second)) << row.first;
    EXPECT_EQ(InTemp("photo.xmp").GetExtension(false), UTF16String(u"xmp"));
    EXPECT_EQ(File(u"/a.d/plain").GetExtension(true), UTF16String());
}

TEST_F(FileTest, ModifiedRoundTripsThroughTextAtMicroseconds)
{
    WriteFileBytes(mTemp / "dated", "x");
    const File file = InTemp("dated");
    const boost::posix_time::ptime when = boost::posix_time::time_from_string("2024-03-05 12:34:56.123456");
    file.SetModified(when);
    EXPECT_EQ(file.Modified(), when);
    // Whatever the file system stores, what is read back has no sub-microsecond part.
    WriteFileBytes(mTemp / "fresh", "x");
    const boost::posix_time::ptime fresh = InTemp("fresh").Modified();
    EXPECT_EQ(boost::date_time::parse_delimited_time<boost::posix_time::ptime>(
                  boost::posix_time::to_simple_string(fresh), ' '),
              fresh);
    EXPECT_THROW(file.SetModified(boost::posix_time::not_a_date_time), std::invalid_argument);
    EXPECT_THROW(InTemp("missing").Modified(), FileSystemError);
}

TEST_F(FileTest, SizeExistsAndDeleteConcernRegularFilesOnly)
{
    WriteFileBytes(mTemp / "five", "12345");
    std::filesystem::create_directory(mTemp / "sub");
    EXPECT_EQ(InTemp("five").Size(FileSizeSelector_Data), 5u);
    EXPECT_FALSE(InTemp("sub").Exists());
    EXPECT_THROW(InTemp("sub").Size(FileSizeSelector_Data), FileSystemError);
    EXPECT_THROW(InTemp("sub").Delete(), FileSystemError);
    EXPECT_TRUE(std::filesystem::is_directory(mTemp / "sub"));
    EXPECT_TRUE(InTemp("five").Delete());
    EXPECT_FALSE(InTemp("five").Delete());
    try {
        InTemp("missing").Size(FileSizeSelector_Data);
        FAIL() << "no exception";
    } catch (const FileSystemError& error) {
        EXPECT_EQ(error.Code(), ENOENT);
        EXPECT_NE(std::string(error.what()).find((mTemp / "missing").string()), std::string::npos) << error.what();
    }

    InTemp("later").Create(false);
    EXPECT_FALSE(std::filesystem::exists(mTemp / "later"));
    WriteFileBytes(mTemp / "kept", "data");
    InTemp("kept").Create(true);
    EXPECT_EQ(ReadFileBytes(mTemp / "kept"), "data");
    EXPECT_THROW(File(Dir(mDir, u"nowhere"), u"f").Create(false), FileSystemError);
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

TEST_F(FileTest, CopyKeepsBytesPermissionsAndDate)
{
    std::string bytes(200000, '\0');
    for (size_t i = 0; i < bytes.size(); ++i) bytes[i] = static_cast<char>(i * 7);
    WriteFileBytes(mTemp / "private", bytes);
    std::filesystem::permissions(mTemp / "private", static_cast<std::filesystem::perms>(0600));
    const File source = InTemp("private");
    source.SetModified(boost::posix_time::time_from_string("2021-01-02 03:04:05.000006"));

    source.CopyTo(InTemp("backup"));
    EXPECT_EQ(ReadFileBytes(mTemp / "backup"), bytes);
    EXPECT_EQ(std::filesystem::status(mTemp / "backup").permissions(), static_cast<std::filesystem::perms>(0600));
    EXPECT_EQ(InTemp("backup").Modified(), source.Modified());
    EXPECT_THROW(InTemp("missing").CopyTo(InTemp("backup")), FileSystemError);
    EXPECT_EQ(ReadFileBytes(mTemp / "backup"), bytes);
}
