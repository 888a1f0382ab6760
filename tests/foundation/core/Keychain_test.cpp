// The keychain store: private, atomic, and forgiving of damage.

#include <gtest/gtest.h>

#include <sys/stat.h>

#include <thread>
#include <vector>

#include "foundation/core/Dir.h"
#include "foundation/core/Keychain.h"
#include "foundation/core/SecretServiceStore.h"
#include "support/SecretServiceSession.h"
#include "support/TempDir.h"

using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;
using tolmocore::Keychain;
using tolmocore::filesupport::Dir;
using tolmocore::utility::ToNarrow;
using tolmocore::utility::ToUTF16;

bool Contains(const std::string& text, const std::string& part)
{
    return text.find(part) != std::string::npos;
}

class KeychainTest : public ::testing::Test {
protected:
    void SetUp() override { Dir::SetPrefDir(Dir(ToUTF16(mPrefDir.string()))); }
    void TearDown() override { Dir::SetPrefDir(Dir()); }

    testsupport::TempDir mTemp;
    std::filesystem::path mPrefDir = mTemp / "prefs" / "host";  // made by the first write
    std::filesystem::path mStore = mPrefDir / "keychain.store";
};

TEST_F(KeychainTest, PasswordsRoundTripWhateverTheirTextInAPrivateStore)
{
    const UTF16String domain(u"Tarnvault\tÉdition 9.0"), account(u"jöhn\\doe\n");
    const UTF16String password(u"p\u00e4ss\r\n\t\\t wörd \U0001F511");
    const mode_t oldMask = ::umask(0);
    EXPECT_TRUE(Keychain::SetPassword(domain, account, password));
    std::filesystem::permissions(mStore, static_cast<std::filesystem::perms>(0644));
    EXPECT_TRUE(Keychain::SetPassword(domain, u"other", u"second"));
    ::umask(oldMask);
    EXPECT_EQ(Keychain::GetPassword(domain, account), password);
    EXPECT_EQ(Keychain::GetPassword(domain, u"other"), UTF16String(u"second"));
    EXPECT_EQ(Keychain::GetPassword(u"Tarnvault", account), UTF16String());

    EXPECT_TRUE(Keychain::SetPassword(domain, account, u"replaced"));
    EXPECT_EQ(Keychain::GetPassword(domain, account), UTF16String(u"replaced"));
    EXPECT_TRUE(Keychain::RemovePassword(domain, account));
    EXPECT_TRUE(Keychain::RemovePassword(domain, account));
    EXPECT_EQ(Keychain::GetPassword(domain, account), UTF16String());
    EXPECT_EQ(Keychain::GetPassword(domain, u"other"), UTF16String(u"second"));

    struct stat info;
    ASSERT_EQ(::stat(mStore.c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0600u) << "whatever the umask, and rewritten private";
    ASSERT_EQ(::stat(mPrefDir.c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0700u);
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(mPrefDir), {}), 1) << "no temporary left";
}

TEST_F(KeychainTest, DamagedStoreKeepsWhatCanStillBeRead)
{
    std::filesystem::create_directories(mPrefDir);
    WriteFileBytes(mStore,
                   "tolmonetsync keychain store 1\nd\ta\tgood\ngarbage without tabs\n"
                   "d\tbad\tunknown \\q escape\nd\tbad2\t\xff\xfe not utf-8\nd\tb\tgood too\n"
                   "d\tcut\tpartial pass");
    EXPECT_TRUE(Keychain::SetPassword(u"d", u"c", u"new"));
    const std::pair<const char16_t*, const char16_t*> expected[] = {
        {u"a", u"good"}, {u"b", u"good too"}, {u"c", u"new"}, {u"bad", u""}, {u"bad2", u""}, {u"cut", u""}};
    for (const auto& entry : expected) EXPECT_EQ(Keychain::GetPassword(u"d", entry.first), UTF16String(entry.second));
}

TEST_F(KeychainTest, UnreadableStoreIsNeverOverwritten)
{
    // A directory in the store's place cannot be read, even by root.
    std::filesystem::create_directories(mStore);
    WriteFileBytes(mStore / "inside", "x");
    EXPECT_EQ(Keychain::GetPassword(u"d", u"a"), UTF16String());
    EXPECT_FALSE(Keychain::SetPassword(u"d", u"a", u"p"));
    EXPECT_FALSE(Keychain::RemovePassword(u"d", u"a"));
    EXPECT_EQ(ReadFileBytes(mStore / "inside"), "x");
}

TEST_F(KeychainTest, ConcurrentWritersLoseNoEntry)
{
    std::vector<std::thread> writers;
    for (int t = 0; t < 4; ++t)
        writers.emplace_back([t] {
            for (int i = 0; i < 10; ++i)
                Keychain::SetPassword(u"d", ToUTF16(std::to_string(t * 100 + i)), ToUTF16("p" + std::to_string(i)));
        });
    for (std::thread& writer : writers) writer.join();
    for (int t = 0; t < 4; ++t)
        for (int i = 0; i < 10; ++i)
            EXPECT_EQ(Keychain::GetPassword(u"d", ToUTF16(std::to_string(t * 100 + i))),
                      ToUTF16("p" + std::to_string(i)));
}

// The Secret Service of a private session: entries there, reads falling
// back to the file store, and never a prompt.
class SystemKeychainTest : public KeychainTest {
protected:
    void SetUp() override
    {
        std::string whyNot;
        if (!testsupport::StartSecretServiceSession(whyNot)) GTEST_SKIP() << whyNot;
        KeychainTest::SetUp();
    }
    void TearDown() override
    {
        Keychain::SetStore(tolmocore::KeychainStore_File);
        tolmocore::security::detail::SetSecretLibraryName(std::string());
        KeychainTest::TearDown();
    }
    // Straight from the Secret Service, past the fallback.
    static std::string InSystem(const UTF16String& domain, const UTF16String& account)
    {
        UTF16String password;
        std::string error;
        const auto found = tolmocore::security::detail::SecretServiceLookup(domain, account, password, error);
        EXPECT_NE(found, tolmocore::security::detail::SecretLookup_Failed) << error;
        return found == tolmocore::security::detail::SecretLookup_Found ? "=" + ToNarrow(password) : "none";
    }
    std::string InFile(const UTF16String& domain, const UTF16String& account)
    {
        Keychain::SetStore(tolmocore::KeychainStore_File);
        const std::string password = ToNarrow(Keychain::GetPassword(domain, account));
        Keychain::SetStore(tolmocore::KeychainStore_System);
        return password;
    }
};

TEST_F(SystemKeychainTest, EntriesLiveInTheSecretServiceAndOlderFileEntriesStillSignIn)
{
    const UTF16String domain(u"Tolmonet app 9.0 OVRA Access"), password(u"t\u00f6ken \U0001F511\t1");
    ASSERT_TRUE(Keychain::SetPassword(domain, u"old-user", u"from the file"));
    ASSERT_TRUE(Keychain::SetPassword(domain, u"other", u"kept"));
    Keychain::SetStore(tolmocore::KeychainStore_System);
    std::string reason;
    EXPECT_TRUE(Keychain::SystemStoreUsable(reason)) << reason;

    EXPECT_EQ(Keychain::GetPassword(domain, u"old-user"), UTF16String(u"from the file")) << "fallback";
    EXPECT_TRUE(Keychain::SetPassword(domain, u"old-user", password));
    EXPECT_EQ(InSystem(domain, u"old-user"), "=" + ToNarrow(password));
    EXPECT_EQ(InFile(domain, u"old-user"), "") << "the stale copy leaves the file once the system holds it";
    EXPECT_EQ(InFile(domain, u"other"), "kept");
    EXPECT_EQ(Keychain::GetPassword(domain, u"old-user"), password);
    EXPECT_EQ(Keychain::GetPassword(u"Tolmonet app 8.0 OVRA Access", u"old-user"), UTF16String());

    EXPECT_TRUE(Keychain::SetPassword(domain, u"old-user", u"replaced"));
    EXPECT_EQ(Keychain::GetPassword(domain, u"old-user"), UTF16String(u"replaced"));
    EXPECT_TRUE(Keychain::RemovePassword(domain, u"old-user"));
    EXPECT_TRUE(Keychain::RemovePassword(domain, u"other")) << "removal clears the file store too";
    EXPECT_EQ(InSystem(domain, u"old-user"), "none");
    EXPECT_EQ(Keychain::GetPassword(domain, u"other"), UTF16String());
    EXPECT_FALSE(Contains(ReadFileBytes(mStore), "t\xc3\xb6ken")) << "no token ever reached the file";
}

TEST_F(SystemKeychainTest, WithoutTheLibraryWritesFailClearlyAndReadsFallBack)
{
    ASSERT_TRUE(Keychain::SetPassword(u"d", u"a", u"in the file"));
    Keychain::SetStore(tolmocore::KeychainStore_System);
    tolmocore::security::detail::SetSecretLibraryName("libsecret-absent.so.0");
    std::string reason;
    EXPECT_FALSE(Keychain::SystemStoreUsable(reason));
    EXPECT_TRUE(Contains(reason, "libsecret-absent.so.0")) << reason;
    EXPECT_FALSE(Keychain::SetPassword(u"d", u"a", u"new"));
    EXPECT_EQ(Keychain::GetPassword(u"d", u"a"), UTF16String(u"in the file")) << "the file store untouched";
}
