// Every kind of request of a sync meets every kind of failure on the
// service's side. Each case starts from a synced state with changes on both
// sides, a stale server group and a new local group, so that every kind of
// request really occurs; then checks that the hook fired, that an error came
// (with the service's text where there is one), that no file was lost or torn
// and every replaced one was backed up, that the cache file is as it was, and
// that a sync without faults converges.

#include <gtest/gtest.h>

#include <cstdio>
#include <map>

#include "SyncHarness.h"
#include "foundation/core/HostConfig.h"
#include "foundation/net/CurlRequestProcessor.h"
#include "foundation/net/HeaderConstants.h"
#include "server/Accounts.h"
#include "server/AssetStore.h"
#include "server/LocalService.h"
#include "server/TreeSeeder.h"
#include "support/TempDir.h"
#include "support/TestScopes.h"
#include "tarnvault/Tarnvault.h"

namespace {

namespace fs = std::filesystem;
using namespace tolmonetsync;
using namespace tolmonetsync::server;
using synctest::RunResult;
using synctest::SyncHarness;
using testsupport::ReadFileBytes;
using testsupport::WriteFileBytes;

const char kClient[] = "matrix";
const char kRootName[] = "Co_Matrix_1.0";

struct RequestKind {
    const char* mName;
    const char* mMethod;
    const char* mPath;
    const char* mQuery;  // searched for in the query; "" any
    bool mBodyRead;      // the client reads a JSON body from the answer
    bool mSendsBody;     // the request carries a body of its own
};

const RequestKind kKinds[] = {
    {"root", "GET", "/api/collections", "", true, false},
    // A collection's children come from a search scoped to it with no name.
    {"children", "POST", "/api/search", "q=%7b%22trashed", true, true},
    {"search", "POST", "/api/search", "%22name%22", true, true},
    {"create", "POST", "/api/collections", "", false, true},
    {"header after create", "GET", "/api/collections/[^/]+/header", "", true, false},
    {"add", "PUT", "/api/collections/[^/]+/members", "", false, true},
    {"delete by name", "DELETE", "/api/collections/[^/]+", "", false, false},
    {"delete", "DELETE", "/api/assets/[^/]+", "", false, false},
    {"upload", "POST", "/api/assets", "", false, true},
    {"metadata after upload", "GET", "/api/assets/[^/]+/metadata", "", true, false},
    {"download", "GET", "/api/assets/[^/]+", "", false, false},
};

struct Fault {
    const char* mName;
    FaultAction mAction;
    int mStatus;
    bool mBodyOnly;  // only for requests whose bodies the client reads
};

const Fault kFaults[] = {
    {"500 with a body", FaultAction_Status, 500, false},
    {"401", FaultAction_Status, 401, false},
    {"404", FaultAction_Status, 404, false},
    {"closed before an answer", FaultAction_CloseBeforeAnswer, 0, false},
    {"no answer until the stall time-out", FaultAction_Delay, 0, false},
    {"not JSON", FaultAction_NotJson, 0, true},
    {"JSON of the wrong shape", FaultAction_WrongShapeJson, 0, true},
};

const char kBody[] = "injected failure";

// The service and one computer's folders, staged for a case.
class Stage {
public:
    Stage() : mKeep(mRoot / "Keep"), mFresh(mRoot / "Fresh")
    {
        LocalServiceOptions options;
        options.mDataDirectory = (mRoot / "service").string();
        options.mTokens.push_back({"matrix", "tok"});
        mService.reset(new LocalService(options));
        mService->Start();
        mSeed.reset(new TreeSeeder(*mService, "matrix"));
        fs::create_directories(mKeep);
        fs::create_directories(mFresh);
    }
    ~Stage() { mService->Stop(); }

    boost::shared_ptr<SyncServer> Client()
    {
        ParameterList parameters;
        const std::string url = mService->AssetServiceUrl();
        parameters.emplace_back(tolmonet::kHEADER_LOCATION, UTF8String(url.begin(), url.end()));
        parameters.emplace_back(tolmonet::kHEADER_USER_AGENT, Text(kClient));
        parameters.emplace_back(tolmonet::kHEADER_COOKIE, Text("tok"));
        return boost::shared_ptr<SyncServer>(new tarnvault::Tarnvault(parameters));
    }
    RunResult Sync(bool withFresh)
    {
        SyncHarness host(Client());
        host.Service().RegisterSyncDirectory(Dir(mKeep, "Keep"));
        if (withFresh) host.Service().RegisterSyncDirectory(Dir(mFresh, "Fresh"));
        return host.Sync(SyncMode_TwoWay);
    }
    // A synced Keep group, then a change on each side, a stale group on the
    // server and a new local group.
    void Prepare()
    {
        WriteFileBytes(mKeep / "k1.txt", "k1 old");
        WriteFileBytes(mKeep / "k2.txt", "k2 old");
        WriteFileBytes(mKeep / "k3.txt", "k3 old");
        ASSERT_TRUE(Sync(false).Ok());
        PutOnServer("Keep", "k1.txt", "k1 from the server");
        WriteFileBytes(mKeep / "k2.txt", "k2 changed here");
        const std::string root = mSeed->Find(mSeed->ClientRoot(kClient), kRootName);
        mSeed->Item(mSeed->Collection(root, "Stale"), "s.txt", "stale");
        WriteFileBytes(mFresh / "f1.txt", "f1 new");
    }
    std::map<std::string, std::string> Local() const
    {
        std::map<std::string, std::string> files;
        for (const fs::path& dir : {mKeep, mFresh})
            for (const auto& entry : fs::directory_iterator(dir))
                if (entry.path().extension() == ".txt")
                    files[dir.filename().string() + "/" + entry.path().filename().string()] =
                        ReadFileBytes(entry.path());
        return files;
    }
    std::map<std::string, std::string> Server()
    {
        std::map<std::string, std::string> files;
        const std::string root = mSeed->Find(mSeed->ClientRoot(kClient), kRootName);
        for (const char* group : {"Keep", "Fresh"}) {
            const std::string id = root.empty() ? std::string() : mSeed->Find(root, group);
            if (id.empty()) continue;
            for (const AssetRecord& member : mService->Assets().Members(Owner(), id)) {
                AssetRecord record;
                const std::string name = std::string(group) + "/" + member.mName;
                if (!files.count(name)) files[name] = mService->Assets().Content(Owner(), member.mId, record);
            }
        }
        return files;
    }
    std::map<std::string, std::string> Backups() const
    {
        std::map<std::string, std::string> files;
        if (!fs::exists(mPrefs.Path() / "SyncBackup")) return files;
        for (const auto& entry : fs::recursive_directory_iterator(mPrefs.Path() / "SyncBackup"))
            if (entry.is_regular_file()) files[entry.path().filename().string()] += ReadFileBytes(entry.path()) + "|";
        return files;
    }
    std::string CacheFile() const
    {
        const fs::path path = mPrefs.Path() / "tolmonetsynccache.json";
        return fs::exists(path) ? ReadFileBytes(path) : std::string("<none>");
    }
    LocalService& Service() { return *mService; }

private:
    static UTF8String Text(const char* text) { return UTF8String(reinterpret_cast<const unsigned char*>(text)); }
    static SyncDir Dir(const fs::path& path, const char* group)
    {
        return SyncDir(tolmocore::filesupport::Dir(tolmocore::utility::ToUTF16(path.string())), u".txt",
                       tolmocore::utility::ToUTF16(group), ImmutableString::CreateStatic("text/plain"),
                       SyncMetadata_ModDate, 1 << 20);
    }
    std::int64_t Owner() { return mService->GetAccounts().EnsureUser("matrix"); }
    void PutOnServer(const char* group, const std::string& name, const std::string& bytes)
    {
        const std::string groupId = mSeed->Find(mSeed->Find(mSeed->ClientRoot(kClient), kRootName), group);
        for (const AssetRecord& member : mService->Assets().Members(Owner(), groupId))
            if (member.mName == name) mService->Assets().Delete(Owner(), member.mId, false);
        mService->Assets().Upload(Owner(), {groupId}, name, "text/plain", bytes);
    }

    testsupport::TempDir mRoot;
    testsupport::PrefDirScope mPrefs;
    fs::path mKeep;
    fs::path mFresh;
    std::unique_ptr<LocalService> mService;
    std::unique_ptr<TreeSeeder> mSeed;
};

class FaultMatrix : public ::testing::Test {
protected:
    static void SetUpTestSuite()
    {
        tolmocore::config::SetCompanyName(u"Co");
        tolmocore::config::SetClientName(u"Matrix");
        tolmocore::config::SetClientInternalVersion(u"1.0");
        tolmonet::http::CurlRequestProcessor::SetProcessWideTimeouts(std::chrono::seconds(5), std::chrono::seconds(1));
    }
    static void TearDownTestSuite()
    {
        tolmonet::http::CurlRequestProcessor::SetProcessWideTimeouts(std::chrono::seconds(30),
                                                                     std::chrono::seconds(60));
    }
};

// Every file holds its old or its new bytes; a replaced one has its old bytes backed up.
void ExpectNothingLost(const std::map<std::string, std::string>& before,
                       const std::map<std::string, std::string>& server,
                       const std::map<std::string, std::string>& after,
                       const std::map<std::string, std::string>& backups, const std::string& label)
{
    for (const auto& file : before) {
        const auto now = after.find(file.first);
        ASSERT_TRUE(now != after.end()) << label << ": " << file.first << " is gone";
        if (now->second == file.second) continue;
        const auto theirs = server.find(file.first);
        EXPECT_TRUE(theirs != server.end() && theirs->second == now->second) << label << ": " << file.first << " torn";
        const std::string name = file.first.substr(file.first.find('/') + 1);
        const auto backup = backups.find(name);
        EXPECT_TRUE(backup != backups.end() && backup->second.find(file.second) != std::string::npos)
            << label << ": " << file.first << " replaced without a backup";
    }
}

TEST_F(FaultMatrix, EveryRequestKindMeetsEveryFault)
{
    int run = 0, passed = 0;
    std::string table;
    for (const RequestKind& kind : kKinds) {
        for (const Fault& fault : kFaults) {
            if (fault.mBodyOnly && !kind.mBodyRead) continue;
            const std::string label = std::string(kind.mName) + " / " + fault.mName;
            const int failuresBefore =
                ::testing::UnitTest::GetInstance()->current_test_info()->result()->total_part_count();
            ++run;
            Stage stage;
            stage.Prepare();
            if (HasFatalFailure()) return;
            const std::map<std::string, std::string> before = stage.Local();
            const std::map<std::string, std::string> serverBefore = stage.Server();
            const std::string cacheBefore = stage.CacheFile();

            FaultRule rule;
            rule.mMethod = kind.mMethod;
            rule.mPathPattern = kind.mPath;
            rule.mQueryPattern = kind.mQuery;
            rule.mAction = fault.mAction;
            rule.mStatus = fault.mStatus;
            rule.mBody = kBody;
            // libcurl judges a stall by the average speed over a few seconds,
            // which the bytes a request sent keep up for a while.
            rule.mDelay = std::chrono::milliseconds(kind.mSendsBody ? 11000 : 2500);
            const auto hook = stage.Service().Faults().Install(rule);
            const RunResult faulted = stage.Sync(true);
            stage.Service().Faults().Clear();

            EXPECT_TRUE(hook->Fired()) << label << ": the fault was never met";
            // A dropped kept-alive connection before any byte of the answer is
            // resent by libcurl on its own: the service then sees the request
            // twice and the sync may pass. Anything else must fail the sync.
            const bool resent = fault.mAction == FaultAction_CloseBeforeAnswer && hook->Seen() >= 2;
            if (!resent) {
                EXPECT_GT(faulted.mErrorCount, 0) << label << ": no error came";
                if (fault.mAction == FaultAction_Status) {
                    EXPECT_NE(faulted.mError.find(kBody), std::string::npos) << label << ": " << faulted.mError;
                }
                EXPECT_EQ(stage.CacheFile(), cacheBefore) << label << ": the cache file changed";
            }
            ExpectNothingLost(before, serverBefore, stage.Local(), stage.Backups(), label);

            const RunResult again = stage.Sync(true);
            EXPECT_TRUE(again.Ok()) << label << ": the sync after the fault failed: " << again.mError;
            EXPECT_EQ(stage.Local(), stage.Server()) << label << ": no convergence";
            EXPECT_NE(stage.CacheFile(), "<none>") << label;

            const bool ok =
                ::testing::UnitTest::GetInstance()->current_test_info()->result()->total_part_count() == failuresBefore;
            passed += ok ? 1 : 0;
            char line[160];
            std::snprintf(line, sizeof line, "  %-24s %-36s %s%s\n", kind.mName, fault.mName, ok ? "passed" : "FAILED",
                          resent ? " (resent by libcurl, sync passed)" : "");
            table += line;
        }
    }
    std::printf("fault matrix:\n%s%d cases run, %d passed\n", table.c_str(), run, passed);
    EXPECT_EQ(passed, run);
}

}  // namespace
