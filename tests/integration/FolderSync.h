#pragma once
// One registered folder ("Presets", ".txt" files) synced against the local
// service over loopback, and what a test looks at afterwards.

#include <gtest/gtest.h>

#include <filesystem>
#include <map>
#include <string>

#include "LocalScenarioServer.h"
#include "SyncHarness.h"
#include "support/TestScopes.h"

namespace synctest {

using Files = std::map<std::string, std::string>;

class FolderSync : public ::testing::Test {
protected:
    std::filesystem::path Folder() const { return mDesk.Path() / "Presets"; }

    void Register(SyncHarness& host)
    {
        host.Service().RegisterSyncDirectory(SyncDir(Dir(tolmocore::utility::ToUTF16(Folder().string())), u".txt",
                                                     u"Presets", ImmutableString::CreateStatic("text/plain"),
                                                     SyncMetadata_ModDate, 1 << 20));
    }
    // A whole sync by a new run of the host.
    RunResult Sync(SyncMode mode)
    {
        SyncHarness host(mServer.Client());
        Register(host);
        return host.Sync(mode);
    }

    // Every file of the folder by name, ".temp" files included.
    Files Local() const
    {
        Files files;
        for (const auto& entry : std::filesystem::directory_iterator(Folder()))
            files[entry.path().filename().string()] = testsupport::ReadFileBytes(entry.path());
        return files;
    }

    // Every backed-up copy of a name, joined by "|".
    Files Backups() const
    {
        Files saved;
        const std::filesystem::path root = mPrefs.Path() / "SyncBackup";
        if (!std::filesystem::exists(root)) return saved;
        for (const auto& dir : std::filesystem::directory_iterator(root))
            for (const auto& file : std::filesystem::directory_iterator(dir.path())) {
                std::string& copies = saved[file.path().filename().string()];
                copies += (copies.empty() ? "" : "|") + testsupport::ReadFileBytes(file.path());
            }
        return saved;
    }

    std::string CacheFile() const { return testsupport::ReadFileBytes(mPrefs.Path() / "tolmonetsynccache.json"); }

    testsupport::PrefDirScope mPrefs;
    testsupport::TempDir mDesk;
    LocalScenarioServer mServer;
};

}  // namespace synctest
