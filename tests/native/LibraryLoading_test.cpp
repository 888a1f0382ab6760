// Finding and loading the native library, once per process: a missing
// library or function, the device identifier read once, and which path wins.
// Each TEST needs a process of its own (ctest gives it one).

#include <gtest/gtest.h>

#include <dlfcn.h>

#include <filesystem>

#include "FakeOvraLibrary.h"
#include "foundation/core/Dir.h"
#include "support/TempDir.h"

namespace {

using namespace nativetest;
using tolmonetsync::GetOvraLib;
using tolmonetsync::OvraConnection;
using tolmonetsync::sRecommendedOvraPath;

// The handle of a library already loaded from `path`, or null.
void* LoadedFrom(const std::string& path)
{
    void* handle = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL | RTLD_NOLOAD);
    if (handle != nullptr) dlclose(handle);  // drops only the count RTLD_NOLOAD added
    return handle;
}

TEST(NativeLibraryMissing, EveryOperationFailsQuietly)
{
    auto connection = Connect("/nonexistent/Frameworks/OvraLib.dylib");
    Completions done;
    EXPECT_TRUE(connection->GetDeviceID().empty());
    EXPECT_TRUE(OvraConnection::InitializeDeviceID().empty());
    EXPECT_FALSE(GetOvraLib().IsAvailable());

    EXPECT_FALSE(connection->GetUserInfoAndFetchToken(true, UTF8String(), UTF8String(), UTF8String(), UTF8String()));
    EXPECT_EQ(connection->GetFetchState(), OvraConnection::kFetchState_NotStarted);
    connection = Connect("/nonexistent/Frameworks/OvraLib.dylib");
    EXPECT_FALSE(connection->GetUserInfoAndFetchToken(false, Text("ann"), UTF8String(), UTF8String(), UTF8String()));
    EXPECT_EQ(connection->GetFetchState(), OvraConnection::kFetchState_NotStarted);

    EXPECT_FALSE(connection->AsyncFetchAccessToken(true, Text("ann"), Text("c"), Text("s"), Text("o"),
                                                   Completion(done, "fetch")));
    EXPECT_FALSE(connection->AsyncRegisterDeviceToken(true, Text("c"), Text("s"), Text("o"), Text("d"),
                                                      Completion(done, "register")));
    EXPECT_FALSE(connection->AsyncRevokeDeviceToken(true, Text("a"), Text("b"), Text("c"), Completion(done, "revoke")));
    EXPECT_EQ(connection->RevokeDeviceToken(true, "a", "b", "c", nullptr), tolmonetsync::kOVRA_STATUS_Unavailable);
    EXPECT_FALSE(connection->JumpToURL(ImmutableString::CreateStatic("https://app.example.test"), Text("x")));
    EXPECT_TRUE(connection->FetchAccounts(true, Text("x")).empty());
    EXPECT_EQ(done.Count(), 0u);
}

TEST(NativeLibraryIncomplete, AMissingFunctionFailsItsOperationsAlone)
{
    FakeOvraState& fake = LoadFake(FAKE_OVRA_LIB_INCOMPLETE);
    auto connection = Connect(FAKE_OVRA_LIB_INCOMPLETE);
    fake.SetText("OVRA_fetchDefaultUserInfoForClientId", "<UserID>u-1</UserID>");
    fake.SetText("OVRA_fetchAccounts", "[]");
    fake.SetText("OVRA_revokeDeviceToken", "revoked");

    EXPECT_FALSE(connection->GetUserInfoAndFetchToken(true, UTF8String(), UTF8String(), UTF8String(), UTF8String()));
    EXPECT_EQ(connection->GetFetchState(), OvraConnection::kFetchState_NotStarted);
    ASSERT_TRUE(GetOvraLib().IsAvailable());

    Completions done;
    EXPECT_FALSE(connection->AsyncFetchAccessToken(true, Text("u-1"), Text("c"), Text("s"), Text("o"),
                                                   Completion(done, "fetch")));
    // Nothing was left pending by the refusal: the next operation goes out.
    EXPECT_TRUE(connection->AsyncRevokeDeviceToken(true, Text("a"), Text("b"), Text("c"), Completion(done, "revoke")));
    ASSERT_TRUE(done.WaitFor(1));
    EXPECT_TRUE(fake.WaitUntilIdle());
    EXPECT_EQ(done.All(), std::vector<std::string>{"revoke 0 revoked"});
    EXPECT_EQ(connection->FetchAccounts(true, Text("x")), Text("[]"));
}

TEST(NativeDeviceID, IsAskedForOncePerProcess)
{
    FakeOvraState& fake = LoadFake(FAKE_OVRA_LIB);
    fake.SetText("OVRA_getDeviceID", "dev-A");
    auto connection = Connect(FAKE_OVRA_LIB);
    EXPECT_EQ(connection->GetDeviceID(), Text("dev-A"));
    EXPECT_EQ(fake.Arguments("OVRA_createRef"), (Strings{"null", "1"}));  // a handle of its own, for production

    fake.SetText("OVRA_getDeviceID", "dev-B");
    EXPECT_EQ(connection->GetDeviceID(), Text("dev-A"));
    EXPECT_EQ(Connect(FAKE_OVRA_LIB)->GetDeviceID(), Text("dev-A"));
    EXPECT_EQ(fake.Calls("OVRA_getDeviceID"), 1);
    EXPECT_EQ(OvraConnection::InitializeDeviceID(), Text("dev-B"));
}

TEST(NativeLibraryPath, TheFirstConstructorsPathWins)
{
    auto first = Connect(FAKE_OVRA_LIB);
    auto second = Connect("/nonexistent/OvraLib.dylib");
    EXPECT_EQ(sRecommendedOvraPath, FAKE_OVRA_LIB);
    FakeOvraState& fake = LoadFake(FAKE_OVRA_LIB);
    fake.SetText("OVRA_fetchAccounts", "from the first path");
    EXPECT_EQ(second->FetchAccounts(true, Text("x")), Text("from the first path"));
    EXPECT_EQ(GetOvraLib().mLibrary, LoadedFrom(FAKE_OVRA_LIB));
}

TEST(NativeLibraryPath, WithoutAPathItIsFrameworksUnderTheApplicationDirectory)
{
    testsupport::TempDir app;
    std::filesystem::create_directories(app / "Frameworks");
    const std::string copy = (app.Path() / "Frameworks" / "OvraLib.dylib").string();
    std::filesystem::copy_file(FAKE_OVRA_LIB, copy);
    using tolmocore::filesupport::Dir;
    Dir::SetAppDir(Dir(tolmocore::utility::ToUTF16(app.Path().string())));

    auto connection = boost::shared_ptr<OvraConnection>(new OvraConnection());
    FakeOvraState& fake = LoadFake(copy);
    fake.SetText("OVRA_fetchAccounts", "from the application's copy");
    EXPECT_EQ(connection->FetchAccounts(true, Text("x")), Text("from the application's copy"));
    EXPECT_TRUE(sRecommendedOvraPath.empty());
    EXPECT_EQ(GetOvraLib().mLibrary, LoadedFrom(copy));

    // A path named after the load is recorded but changes nothing.
    auto later = Connect(FAKE_OVRA_LIB);
    EXPECT_EQ(sRecommendedOvraPath, FAKE_OVRA_LIB);
    EXPECT_EQ(later->FetchAccounts(true, Text("x")), Text("from the application's copy"));
    EXPECT_EQ(LoadedFrom(FAKE_OVRA_LIB), nullptr);
    Dir::SetAppDir(Dir());
}

}  // namespace
