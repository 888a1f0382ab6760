#pragma once
// The sync scenarios: whole syncs by the real client against the local
// service, once for each answer style the test is given.

#include <gtest/gtest.h>

#include "LocalScenarioServer.h"
#include "SyncHarness.h"
#include "SyncTestSupport.h"

namespace synctest {

class SyncScenarios : public ::testing::TestWithParam<tolmonetsync::server::AnswerStyle> {
protected:
    void SetUp() override;

    // The host's side: a directory of presets (".xmp", group "Presets") and
    // one registered settings file (group "Settings", item "settings").
    std::filesystem::path PresetPath(const std::string& name) const { return mDesk.Path() / "Presets" / name; }
    std::filesystem::path SettingsPath() const { return mDesk.Path() / "settings.json"; }
    void WritePreset(const std::string& name, const std::string& bytes);
    std::string ReadLocal(const std::filesystem::path& path) const;
    // Local presets by name; the same shape as LocalScenarioServer::Items.
    std::map<std::string, std::string> LocalPresets() const;
    // Every file in this run's backup directories, by name.
    std::map<std::string, std::string> Backups() const;
    std::string CacheFileText() const;

    // A fresh service (as in a new run of the host), registered as above.
    std::unique_ptr<SyncHarness> NewHost();
    RunResult Sync(SyncMode mode) { return NewHost()->Sync(mode); }

    PrefDirScope mPrefs;
    testsupport::TempDir mDesk;
    std::unique_ptr<LocalScenarioServer> mServer;
};

}  // namespace synctest
