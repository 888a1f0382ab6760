#pragma once
// Whole syncs of one computer against the local service over loopback: the
// folder "Presets" (".txt" files, group "Presets") and the file
// "settings.json" (group "Settings", item "settings") are registered; the
// service's store is the back door to the user's groups on the server.

#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "support/SyncHarness.h"
#include "support/TestService.h"

namespace synctest {

using Files = std::map<std::string, std::string>;

class FolderSync : public ::testing::Test {
protected:
    FolderSync();

    std::filesystem::path Folder() const { return mDesk.Path() / "Presets"; }
    std::filesystem::path SettingsPath() const { return mDesk.Path() / "settings.json"; }
    void Write(const std::string& name, const std::string& bytes)
    {
        testsupport::WriteFileBytes(Folder() / name, bytes);
    }
    // Gives a local file a date clearly later than the one cached.
    static void Touch(const std::filesystem::path& path)
    {
        std::filesystem::last_write_time(path, std::filesystem::last_write_time(path) + std::chrono::seconds(5));
    }

    // A new run of the host, with nothing cached but the cache file; its
    // client sends through the global request processor of the moment.
    std::unique_ptr<SyncHarness> NewHost();
    RunResult Sync(SyncMode mode) { return NewHost()->Sync(mode); }

    // The folder's files by name, ".temp" files included.
    Files Local() const { return testsupport::Snapshot(Folder()); }
    // Every backed-up copy of a name, joined by "|".
    Files Backups() const;
    // The cache file's bytes; "<none>" without one.
    std::string CacheFile() const { return CacheFileIn(mPrefs.Path()); }

    // The groups under this host's preferences root, sorted.
    std::vector<std::string> Groups();
    Files Items(const std::string& group);
    // A new upload of the name, dated a second after any before it.
    void PutItem(const std::string& group, const std::string& name, const std::string& bytes);
    void RemoveItem(const std::string& group, const std::string& name);
    void MakeGroup(const std::string& group) { Group(group, true); }

    PrefDirScope mPrefs;
    testsupport::TempDir mDesk;
    testsupport::TestService mService;

private:
    // The group's id (the preferences root's for ""); empty if missing.
    std::string Group(const std::string& group, bool create);
    std::int64_t mOwner;
    std::int64_t mRemoteSecond = 1577836800;  // 2020-01-01, counting up
};

}  // namespace synctest
