#include "ServiceStage.h"

#include <gtest/gtest.h>

#include "foundation/net/CurlRequestProcessor.h"
#include "server/Accounts.h"
#include "server/AssetStore.h"
#include "support/HostClient.h"
#include "tarnvault/Tarnvault.h"

namespace reliability {

namespace fs = std::filesystem;
using namespace tolmonetsync;
using namespace tolmonetsync::server;
using testsupport::ReadFileBytes;
using testsupport::TestService;
using testsupport::WriteFileBytes;

namespace {

const char kRootName[] = "Co_Matrix_1.0";

SyncDir Registered(const fs::path& path, const char* group)
{
    return SyncDir(synctest::DirAt(path), u".txt", tolmocore::utility::ToUTF16(group),
                   ImmutableString::CreateStatic("text/plain"), SyncMetadata_ModDate, 1 << 20);
}

}  // namespace

void UseStageHost()
{
    testsupport::HostIdentity::Set(u"Co", u"Matrix", u"1.0");
    tolmonet::http::CurlRequestProcessor::SetProcessWideTimeouts(std::chrono::seconds(5), std::chrono::seconds(1));
}

void RestoreTimeouts()
{
    tolmonet::http::CurlRequestProcessor::SetProcessWideTimeouts(std::chrono::seconds(30), std::chrono::seconds(60));
}

Stage::Stage(TestService& service, const std::string& clientId)
    : mKeep(mRoot / "Keep"), mFresh(mRoot / "Fresh"), mClient(clientId), mService(&*service), mSeed(*mService, "alice")
{
    fs::create_directories(mKeep);
    fs::create_directories(mFresh);
}

synctest::RunResult Stage::Sync(bool withFresh)
{
    const std::string url = mApiUrl.empty() ? mService->AssetServiceUrl() : mApiUrl;
    synctest::SyncHarness host(boost::shared_ptr<SyncServer>(
        new tarnvault::Tarnvault(testsupport::Parameters(url, testsupport::kAliceToken, mClient))));
    host.Service().RegisterSyncDirectory(Registered(mKeep, "Keep"));
    if (withFresh) host.Service().RegisterSyncDirectory(Registered(mFresh, "Fresh"));
    return host.Sync(SyncMode_TwoWay);
}

void Stage::PrepareEveryRequestKind()
{
    WriteFileBytes(mKeep / "k1.txt", "k1 old");
    WriteFileBytes(mKeep / "k2.txt", "k2 old");
    WriteFileBytes(mKeep / "k3.txt", "k3 old");
    ASSERT_TRUE(Sync(false).Ok());
    PutOnServer("Keep", "k1.txt", "k1 from the server");
    WriteFileBytes(mKeep / "k2.txt", "k2 changed here");
    const std::string root = mSeed.Find(mSeed.ClientRoot(mClient), kRootName);
    mSeed.Item(mSeed.Collection(root, "Stale"), "s.txt", "stale");  // no folder registers it
    WriteFileBytes(mFresh / "f1.txt", "f1 new");
}

void Stage::PutOnServer(const char* group, const std::string& name, const std::string& bytes)
{
    const std::int64_t owner = mService->GetAccounts().EnsureUser("alice");
    for (const AssetRecord& member : mService->Assets().Members(owner, GroupId(group)))
        if (member.mName == name) mService->Assets().Delete(owner, member.mId, false);
    mSeed.Item(GroupId(group), name, bytes, "text/plain");
}

FileMap Stage::Local() const
{
    FileMap files;
    for (const fs::path& dir : {mKeep, mFresh})
        for (const auto& [name, bytes] : testsupport::Snapshot(dir))
            if (fs::path(name).extension() == ".txt") files[dir.filename().string() + "/" + name] = bytes;
    return files;
}

FileMap Stage::Server()
{
    FileMap files;
    for (const char* group : {"Keep", "Fresh"}) {
        const std::string id = GroupId(group);
        if (id.empty()) continue;
        for (const auto& item : mSeed.Contents(id)) files[std::string(group) + "/" + item.first] = item.second;
    }
    return files;
}

std::set<std::string> Stage::BackupDirs() const
{
    std::set<std::string> names;
    if (!fs::exists(mPrefs.Path() / "SyncBackup")) return names;
    for (const auto& entry : fs::directory_iterator(mPrefs.Path() / "SyncBackup"))
        if (entry.is_directory()) names.insert(entry.path().filename().string());
    return names;
}

FileMap Stage::Backups(const std::set<std::string>& skip) const
{
    FileMap files;
    for (const std::string& dir : BackupDirs()) {
        if (skip.count(dir)) continue;
        for (const auto& entry : fs::recursive_directory_iterator(mPrefs.Path() / "SyncBackup" / dir))
            if (entry.is_regular_file()) files[entry.path().filename().string()] += ReadFileBytes(entry.path()) + "|";
    }
    return files;
}

std::string Stage::GroupId(const char* group)
{
    const std::string root = mSeed.Find(mSeed.ClientRoot(mClient), kRootName);
    return root.empty() ? std::string() : mSeed.Find(root, group);
}

void ExpectNothingLost(const FileMap& before, const FileMap& serverBefore, const FileMap& after, const FileMap& backups,
                       const std::string& label)
{
    const auto backedUp = [&](const std::string& file, const std::string& bytes) {
        const auto copies = backups.find(file.substr(file.find('/') + 1));
        return copies != backups.end() && copies->second.find(bytes + "|") != std::string::npos;
    };
    for (const auto& file : before) {
        const auto now = after.find(file.first);
        const auto theirs = serverBefore.find(file.first);
        if (now == after.end()) {
            EXPECT_TRUE(theirs == serverBefore.end()) << label << ": " << file.first << " is gone";
            EXPECT_TRUE(backedUp(file.first, file.second))
                << label << ": " << file.first << " removed without a backup";
            continue;
        }
        if (now->second == file.second) continue;
        EXPECT_TRUE(theirs != serverBefore.end() && theirs->second == now->second)
            << label << ": " << file.first << " torn";
        EXPECT_TRUE(backedUp(file.first, file.second)) << label << ": " << file.first << " replaced without a backup";
    }
    for (const auto& file : after) {
        if (before.count(file.first)) continue;
        const auto theirs = serverBefore.find(file.first);
        EXPECT_TRUE(theirs != serverBefore.end() && theirs->second == file.second)
            << label << ": new " << file.first << " torn";
    }
}

}  // namespace reliability
