// Directories: sorted walks, removal that never follows a link out of the
// tree, private creation, and where the preference directory is.

#include <gtest/gtest.h>

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <random>
#include <vector>

#include "foundation/core/Dir.h"
#include "foundation/core/HostConfig.h"
#include "support/HostClient.h"
#include "support/TempDir.h"

using namespace tolmocore::filesupport;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
using tolmocore::utility::ToNarrow;
using tolmocore::utility::ToUTF16;

class DirTest : public ::testing::Test {
protected:
    testsupport::TempDir mTemp;
    Dir mDir{ToUTF16(mTemp.Path().string())};
};

TEST_F(DirTest, WalksAreSortedByNameAndKeepFilesApartFromSubdirs)
{
    std::vector<std::string> all = {"b.xmp",   "a.xmp", "Z.xmp", "\xC3\xA9t\xC3\xA9.xmp",
                                    ".hidden", "dir2",  "Dir1",  "dir10"};
    std::shuffle(all.begin(), all.end(), std::mt19937(12345));
    for (const std::string& name : all)
        name.find("ir") != std::string::npos ? (void)std::filesystem::create_directory(mTemp / name)
                                             : WriteFileBytes(mTemp / name, name);
    std::vector<std::string> files, subdirs;
    for (Dir::FileIterator it = mDir.BeginFiles(false, nullptr, false, {}); it != mDir.EndFiles(); ++it) {
        EXPECT_EQ((*it).Parent(), mDir);
        files.push_back(ToNarrow((*it).GetName()));
    }
    for (Dir::SubdirIterator it = mDir.BeginSubdirs(false, nullptr, {}); it != mDir.EndSubdirs(); ++it)
        subdirs.push_back(ToNarrow((*it).GetName()));
    EXPECT_EQ(files, (std::vector<std::string>{".hidden", "Z.xmp", "a.xmp", "b.xmp", "\xC3\xA9t\xC3\xA9.xmp"}));
    EXPECT_EQ(subdirs, (std::vector<std::string>{"Dir1", "dir10", "dir2"}));

    // A walk that fails is never an empty directory.
    EXPECT_THROW(Dir(mDir, u"missing").BeginFiles(), FileSystemError);
    EXPECT_THROW(Dir(mDir, u"missing").BeginSubdirs(), FileSystemError);
}

TEST_F(DirTest, CreateMakesMissingParentsAndCreatePrivateIsTheOwnersAlone)
{
    const Dir deep(Dir(Dir(mDir, u"a"), u"b"), u"c");
    EXPECT_TRUE(deep.Create());
    EXPECT_TRUE(deep.Exists());
    EXPECT_FALSE(deep.Create());
    WriteFileBytes(mTemp / "file", "x");
    EXPECT_THROW(Dir(Dir(mDir, u"file"), u"sub").Create(), FileSystemError);
    EXPECT_THROW(Dir(mDir, u"file").Create(), FileSystemError);

    const mode_t oldMask = ::umask(0);
    const Dir made(Dir(mDir, u"parent"), u"private");
    const bool created = made.CreatePrivate();
    const bool again = made.CreatePrivate();
    ::umask(oldMask);
    EXPECT_TRUE(created);
    EXPECT_FALSE(again);
    EXPECT_EQ(std::filesystem::status(mTemp / "parent" / "private").permissions(), std::filesystem::perms::owner_all);
}

TEST_F(DirTest, DeleteRemovesTheTreeButNothingBehindLinks)
{
    const std::filesystem::path outside = mTemp / "outside";
    std::filesystem::create_directories(outside / "keep");
    WriteFileBytes(outside / "keep" / "precious", "p");
    WriteFileBytes(outside / "lone", "l");

    const std::filesystem::path tree = mTemp / "SyncBackup" / "Backup_1";
    std::filesystem::create_directories(tree / "sub" / "subsub");
    WriteFileBytes(tree / "sub" / "subsub" / "b.xmp", "b");
    std::filesystem::create_directory_symlink(outside, tree / "sub" / "link-to-dir");
    std::filesystem::create_symlink(outside / "lone", tree / "link-to-file");
    std::filesystem::create_directory_symlink(outside, mTemp / "top-link");

    EXPECT_TRUE(Dir(ToUTF16(tree.string())).Delete());
    EXPECT_FALSE(std::filesystem::exists(tree));
    EXPECT_TRUE(Dir(ToUTF16((mTemp / "top-link").string())).Delete());
    EXPECT_FALSE(std::filesystem::exists(std::filesystem::symlink_status(mTemp / "top-link")));
    EXPECT_EQ(ReadFileBytes(outside / "keep" / "precious"), "p");
    EXPECT_EQ(ReadFileBytes(outside / "lone"), "l");

    EXPECT_FALSE(Dir(ToUTF16(tree.string())).Delete());
    EXPECT_THROW(Dir(u"/").Delete(), std::invalid_argument);
    EXPECT_THROW(Dir(ToUTF16((outside / "lone").string())).Delete(), FileSystemError);
    EXPECT_EQ(ReadFileBytes(outside / "lone"), "l");
}

class DirLocationsTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        if (const char* xdg = std::getenv("XDG_CONFIG_HOME")) mXdg = xdg, mHadXdg = true;
        if (const char* home = std::getenv("HOME")) mHome = home;
    }
    void TearDown() override
    {
        mHadXdg ? setenv("XDG_CONFIG_HOME", mXdg.c_str(), 1) : unsetenv("XDG_CONFIG_HOME");
        setenv("HOME", mHome.c_str(), 1);
        Dir::SetPrefDir(Dir());
    }

    testsupport::HostIdentity mHost{u"", u"", u""};  // puts the identity back afterwards
    std::string mXdg, mHome;
    bool mHadXdg = false;
};

TEST_F(DirLocationsTest, PrefDirFollowsConfigHomeAndHostIdentityAppDirTheExecutable)
{
    setenv("XDG_CONFIG_HOME", "/xdg/config", 1);
    tolmocore::config::SetCompanyName(u"Acme/Labs");
    tolmocore::config::SetClientName(u"Éditeur");
    EXPECT_EQ(Dir::PrefDir(), Dir(u"/xdg/config/Acme_Labs/Éditeur"));
    tolmocore::config::SetCompanyName(u"");
    setenv("XDG_CONFIG_HOME", "relative/ignored", 1);
    setenv("HOME", "/home/someone", 1);
    EXPECT_EQ(Dir::PrefDir(), Dir(u"/home/someone/.config/Éditeur"));

    // argv[0], as the C library kept it: a source apart from /proc.
    const std::filesystem::path expected = std::filesystem::canonical(program_invocation_name).parent_path();
    EXPECT_EQ(Dir::AppDir(), Dir(ToUTF16(expected.string())));
}

TEST_F(DirLocationsTest, PrefDirOthersCouldChangeIsRefusedByName)
{
    testsupport::TempDir temp;
    const std::filesystem::path pref = temp / "pref";
    Dir::SetPrefDir(Dir(ToUTF16(pref.string())));
    EXPECT_NO_THROW(Dir::CheckPrefDir());  // missing: it will be made 0700
    std::filesystem::create_directory(pref);
    ::chmod(pref.c_str(), 0755);
    EXPECT_NO_THROW(Dir::CheckPrefDir());

    auto refusal = [] {
        try {
            Dir::CheckPrefDir();
        } catch (const FileSystemError& e) {
            return std::string(e.what());
        }
        return std::string("accepted");
    };
    const std::string named = "Refusing the preference directory " + pref.string() + ": ";
    ::chmod(pref.c_str(), 0777);
    EXPECT_EQ(refusal(), named + "it is writable by other users (mode 0777)");
    Dir::SetAllowSharedPrefDir(true);
    EXPECT_EQ(refusal(), "accepted");
    Dir::SetAllowSharedPrefDir(false);

    if (::geteuid() != 0) return;  // giving a directory away takes root
    ::chmod(pref.c_str(), 0775);
    ASSERT_EQ(::chown(pref.c_str(), 0, 65534), 0);  // a group that is not root's own
    EXPECT_EQ(refusal(), named + "it is writable by group 65534, which is not its owner's own (mode 0775)");
    ASSERT_EQ(::chown(pref.c_str(), 0, 0), 0);
    EXPECT_EQ(refusal(), "accepted");
    ASSERT_EQ(::chown(pref.c_str(), 65534, 0), 0);
    ::chmod(pref.c_str(), 0700);
    EXPECT_EQ(refusal(), named + "it belongs to another user (uid 65534)");
}
