// What a pass leaves behind against the local service over loopback: the
// cache file it saves and the trace lines of its downloads.

#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>

#include "LocalScenarioServer.h"
#include "SyncHarness.h"
#include "foundation/json/JSONText.h"
#include "support/TestScopes.h"
#include "sync/CacheFile.h"

namespace synctest {

namespace {

namespace fs = std::filesystem;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;

class PassOutcomes : public ::testing::Test {
protected:
    fs::path SettingsPath() const { return mDesk.Path() / "settings.json"; }

    // A new run of the host with one registered file, group "Settings".
    RunResult Sync(SyncMode mode)
    {
        SyncHarness host(mServer.Client());
        host.Service().RegisterSyncFile(
            SyncFile(File(tolmocore::utility::ToUTF16(SettingsPath().string())), u"settings", u"Settings",
                     ImmutableString::CreateStatic("application/json"), SyncMetadata_ModDate, 1 << 20));
        return host.Sync(mode);
    }

    // The cached entity tag of the one record in the saved cache file.
    std::string CachedEtag() const
    {
        namespace json = tolmocore::serialization;
        std::vector<CachedSyncFile> records;
        json::JSONConvertStdVector<CachedSyncFile>::FromJSON(
            json::JSONParse(UTF8String(ReadFileBytes(mPrefs.Path() / "tolmonetsynccache.json"))), records);
        EXPECT_EQ(records.size(), 1u);
        return records.empty() ? std::string("<no record>") : records[0].mCachedServerEtag.ToStdString();
    }

    testsupport::PrefDirScope mPrefs;
    testsupport::TempDir mDesk;
    LocalScenarioServer mServer;
};

TEST_F(PassOutcomes, ServerWinsForgetsTheTagOfAChangedFileEvenWhenTheServerLacksIt)
{
    WriteFileBytes(SettingsPath(), "v1");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    ASSERT_FALSE(CachedEtag().empty());

    // Changed here, gone from the server: nothing moves, but the cache saved
    // after the pass must not keep vouching for the old server version.
    WriteFileBytes(SettingsPath(), "v2 from the desk");
    fs::last_write_time(SettingsPath(), fs::last_write_time(SettingsPath()) + std::chrono::seconds(5));
    mServer.RemoveItem("Settings", "settings");
    const RunResult result = Sync(SyncMode_ServerWins);
    ASSERT_TRUE(result.Ok()) << result.mError;
    EXPECT_EQ(result.mMoved, 0);
    EXPECT_EQ(ReadFileBytes(SettingsPath()), "v2 from the desk");
    EXPECT_EQ(CachedEtag(), "");
}

TEST_F(PassOutcomes, TheDownloadsCompletionTraceLineNamesItsRequest)
{
    WriteFileBytes(SettingsPath(), "v1");
    ASSERT_TRUE(Sync(SyncMode_TwoWay).Ok());
    mServer.PutItem("Settings", "settings", "v2 from elsewhere");

    testsupport::TraceCapture trace("Tarnvault:8");
    const RunResult result = Sync(SyncMode_TwoWay);
    ASSERT_TRUE(result.Ok()) << result.mError;
    ASSERT_EQ(ReadFileBytes(SettingsPath()), "v2 from elsewhere");
    const std::string line = trace.LineWith("Download, content-type: ");
    ASSERT_FALSE(line.empty());
    EXPECT_NE(line.find(", last_modified: "), std::string::npos) << line;
    EXPECT_NE(line.find(", requestUID: "), std::string::npos) << line;
    EXPECT_GT(line.find(", requestUID: "), line.find(", last_modified: ")) << line;
}

}  // namespace

}  // namespace synctest
