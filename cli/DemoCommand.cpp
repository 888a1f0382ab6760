#include "cli/DemoCommand.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iostream>

#include "cli/PrintableName.h"
#include "cli/Registrations.h"
#include "cli/SyncJob.h"
#include "foundation/core/Dir.h"
#include "server/LocalService.h"
#include "server/Random.h"

namespace tolmonetsync {
namespace cli {

namespace {

namespace fs = std::filesystem;
using tolmocore::utility::ToUTF16;

const char kDemoUsage[] = "usage: tolmonetsync [global options] demo [--keep]\n";
const char kDemoHelp[] =
    "\n"
    "Starts the local asset service on a free port with temporary data, then plays two computers\n"
    "of one user keeping a preferences folder in step through it: a first upload, a download onto\n"
    "the second computer, a change on each side, and the sync that brings them together again.\n"
    "Everything it made is removed at the end unless --keep is given.\n";

// One computer of the demo user: the folder it keeps in step and its
// preference directory (cache file and backups).
struct Computer {
    std::string mName;
    fs::path mFolder;
    fs::path mPrefDir;
};

fs::path MakeWorkspace()
{
    const fs::path base = fs::temp_directory_path();
    std::string pattern = (base / "tolmonetsync-demo-XXXXXX").string();
    if (mkdtemp(pattern.data()) == nullptr) throw std::runtime_error("cannot make a directory in " + base.string());
    return pattern;
}

void WriteText(const fs::path& path, const std::string& text)
{
    std::ofstream stream(path, std::ios::binary | std::ios::trunc);
    stream << text;
    if (!stream.flush()) throw std::runtime_error("cannot write " + path.string());
}

Computer MakeComputer(const fs::path& workspace, const std::string& name)
{
    Computer computer{name, workspace / name / "Preferences", workspace / name / "pref"};
    fs::create_directories(computer.mFolder);
    fs::create_directories(computer.mPrefDir);
    fs::permissions(computer.mPrefDir, fs::perms::owner_all);  // as the library makes one
    return computer;
}

// Runs one sync of the demo folder as `computer`, with its heading.
bool SyncAs(const Computer& computer, const std::string& serverUrl, const std::string& token, const std::string& what)
{
    std::cout << "\n== " << computer.mName << ": " << what << "\n" << std::flush;
    tolmocore::filesupport::Dir::SetPrefDir(tolmocore::filesupport::Dir(ToUTF16(computer.mPrefDir.string())));
    SyncJob job;
    job.mServer = serverUrl;
    job.mClientId = "tolmonetsync-demo";
    job.mToken = token;
    job.mDirs.push_back(ParseDirRegistration("path=" + computer.mFolder.string() + ",group=Preferences,ext=.json"));
    return RunSyncJob(job, Output::Text, std::cout, std::cerr) == 0;
}

int PlayDemo(const fs::path& workspace, const GlobalOptions& globals)
{
    const std::string user = "demo";
    const std::string token = server::RandomUrlSafe(24);
    server::LocalServiceOptions options;
    options.mDataDirectory = (workspace / "service").string();
    options.mUsers.push_back({user, server::RandomUrlSafe(12), ""});
    options.mTokens.push_back({user, token});
    server::LocalService service(options);
    service.Start();
    const std::string serverUrl = service.AssetServiceUrl();
    std::cout << "Local asset service at " << serverUrl << " (data in " << options.mDataDirectory << "),\n"
              << "user \"" << user << "\", host " << globals.mCompany << " " << globals.mApp << " "
              << globals.mAppVersion << ".\n";

    const Computer laptop = MakeComputer(workspace, "laptop");
    const Computer desktop = MakeComputer(workspace, "desktop");
    WriteText(laptop.mFolder / "colors.json", "{\"theme\": \"dark\", \"accent\": \"teal\"}\n");
    WriteText(laptop.mFolder / "shortcuts.json", "{\"save\": \"Ctrl+S\", \"find\": \"Ctrl+F\"}\n");
    WriteText(laptop.mFolder / "layout.json", "{\"panels\": [\"library\", \"editor\"]}\n");
    std::cout << "The laptop keeps three preference files in " << laptop.mFolder.string() << ".\n";

    if (!SyncAs(laptop, serverUrl, token, "first sync: the server has nothing yet, so every file goes up")) return 1;
    if (!SyncAs(desktop, serverUrl, token, "first sync of an empty folder: every file comes down")) return 1;

    WriteText(desktop.mFolder / "layout.json", "{\"panels\": [\"library\", \"editor\", \"histogram\"]}\n");
    std::cout << "\nOn the desktop the user adds a panel: layout.json changes there.\n";
    if (!SyncAs(desktop, serverUrl, token, "the changed layout goes up")) return 1;

    WriteText(laptop.mFolder / "colors.json", "{\"theme\": \"light\", \"accent\": \"teal\"}\n");
    std::cout << "\nOn the laptop the user switches to the light theme: colors.json changes there.\n";
    if (!SyncAs(laptop, serverUrl, token,
                "its change goes up, the desktop's layout comes down; the old layout is backed up first"))
        return 1;

    std::cout << "\nBoth computers now hold the same three files. The laptop's earlier layout is kept in:\n";
    for (const fs::directory_entry& entry : fs::recursive_directory_iterator(laptop.mPrefDir / "SyncBackup"))
        if (entry.is_regular_file()) std::cout << "  " << PrintableName(entry.path().string()) << "\n";
    service.Stop();
    return 0;
}

}  // namespace

int RunDemo(GlobalOptions globals, const std::vector<std::string>& arguments)
{
    bool keep = false;
    try {
        for (std::size_t i = 0; i < arguments.size(); ++i) {
            if (ReadGlobalOption(arguments, i, globals)) continue;
            if (arguments[i] != "--keep") throw UsageError("unknown option '" + arguments[i] + "'");
            keep = true;
        }
    } catch (const UsageError& e) {
        std::cerr << "tolmonetsync demo: " << e.what() << "\n" << kDemoUsage;
        return 2;
    }
    if (globals.mHelp) {
        std::cout << kDemoUsage << kDemoHelp;
        return 0;
    }
    ApplyGlobalOptions(globals);

    int status = 1;
    fs::path workspace;
    try {
        workspace = MakeWorkspace();
        status = PlayDemo(workspace, globals);
    } catch (const std::exception& e) {
        std::cerr << "tolmonetsync demo: " << PrintableName(e.what()) << std::endl;
        status = 1;
    }
    if (workspace.empty()) return status;
    if (keep) {
        std::cout << "Kept everything the demo made in " << workspace.string() << ".\n";
    } else {
        std::error_code error;
        fs::remove_all(workspace, error);
        std::cout << "Removed everything the demo made (" << workspace.string() << "); --keep keeps it.\n";
    }
    return status;
}

}  // namespace cli
}  // namespace tolmonetsync
