#include "cli/SyncCommand.h"

#include <iostream>

#include "cli/Registrations.h"
#include "cli/SyncJob.h"

namespace tolmonetsync {
namespace cli {

namespace {

const char kSyncUsage[] =
    "usage: tolmonetsync [global options] sync [--mode two-way|server-wins|local-wins] [--dry-run]\n"
    "         [--prune-groups] [--keep-server-copies] [--migrate major|previous-major]...\n"
    "         [--max-delete N] [--max-overwrite N] [-v]\n"
    "         --dir path=DIR,group=NAME,ext=.EXT[,max-size=BYTES][,checksum]...\n"
    "         --file path=FILE,group=NAME[,name=NAME][,type=MIME][,max-size=BYTES][,checksum]...\n";

const char kSyncHelp[] =
    "\n"
    "Prints the plan (what happens to each file and why; risky lines end in [risk KIND: why]),\n"
    "carries it out and prints a summary. \"check\" asks the server for a file unchanged here.\n"
    "  --mode MODE        two-way (default): local changes go up, everything else comes down;\n"
    "                     server-wins: the server's state replaces the local one;\n"
    "                     local-wins: the local state replaces the server's\n"
    "  --dry-run          print the plan and stop: nothing changes on the server or on disk\n"
    "  --prune-groups     allow deleting server groups that no --dir or --file names\n"
    "  --keep-server-copies  before an upload replaces a server version changed since the last\n"
    "                     sync, download it into the backup directory as NAME.server-copy\n"
    "  --migrate FORM     let a new host version copy an earlier version's preferences\n"
    "  --max-delete N     refuse, before anything changes, a sync that would delete more than N\n"
    "                     (local files, server items, items of deleted groups)\n"
    "  --max-overwrite N  refuse, before anything changes, a sync that would overwrite more than N\n"
    "                     (server items replaced by uploads, local changes replaced by downloads)\n"
    "  -v                 list every file of a plan longer than a screenful (otherwise summarised)\n"
    "  --dir SPEC         every file of one extension in a directory (the directory must exist)\n"
    "  --file SPEC        one file (it may be missing: the sync brings it back)\n"
    "Defaults: size limit 16 MiB (files at or above it are not uploaded), media type\n"
    "application/octet-stream, a change is seen by the modification date (checksum: by content).\n"
    "Replaced and removed local files are copied into a backup directory under the preference\n"
    "directory first ('tolmonetsync backups' lists them, 'restore' puts one back).\n"
    "Exit status: 0 done, 1 the sync failed (reason on stderr), 2 bad usage.\n";

// A limit: digits only, so that "-1" or "5x" is bad usage rather than no limit.
std::size_t ParseCount(const std::string& option, const std::string& text)
{
    std::size_t count = 0;
    const bool digits = !text.empty() && text.size() <= 18 && text.find_first_not_of("0123456789") == std::string::npos;
    if (!digits) throw UsageError(option + " " + text + ": give a whole number");
    for (char digit : text) count = count * 10 + static_cast<std::size_t>(digit - '0');
    return count;
}

SyncJob ParseSync(GlobalOptions& globals, const std::vector<std::string>& arguments)
{
    SyncJob job;
    for (std::size_t i = 0; i < arguments.size(); ++i) {
        const std::string& option = arguments[i];
        if (ReadGlobalOption(arguments, i, globals)) continue;
        if (option == "--mode") {
            const std::string& mode = OptionValue(arguments, i);
            if (!ParseModeName(mode, job.mMode))
                throw UsageError("--mode " + mode + ": give two-way, server-wins or local-wins");
        } else if (option == "--dry-run") {
            job.mDryRun = true;
        } else if (option == "--prune-groups") {
            job.mPruneGroups = true;
        } else if (option == "--keep-server-copies") {
            job.mKeepServerCopies = true;
        } else if (option == "--max-delete") {
            job.mLimits.mMaxDelete = ParseCount(option, OptionValue(arguments, i));
        } else if (option == "--max-overwrite") {
            job.mLimits.mMaxOverwrite = ParseCount(option, OptionValue(arguments, i));
        } else if (option == "-v") {
            job.mEveryFile = true;
        } else if (option == "--migrate") {
            const std::string& form = OptionValue(arguments, i);
            if (form != "major" && form != "previous-major")
                throw UsageError("--migrate " + form + ": give major or previous-major");
            job.mMigrate.push_back(form);
        } else if (option == "--dir") {
            job.mDirs.push_back(ParseDirRegistration(OptionValue(arguments, i)));
        } else if (option == "--file") {
            job.mFiles.push_back(ParseFileRegistration(OptionValue(arguments, i)));
        } else {
            throw UsageError("unknown option '" + option + "'");
        }
    }
    if (!globals.mHelp && job.mDirs.empty() && job.mFiles.empty())
        throw UsageError("nothing to sync: give at least one --dir or --file");
    return job;
}

}  // namespace

int RunSync(GlobalOptions globals, const std::vector<std::string>& arguments)
{
    SyncJob job;
    try {
        job = ParseSync(globals, arguments);
    } catch (const UsageError& e) {
        std::cerr << "tolmonetsync sync: " << e.what() << "\n" << kSyncUsage;
        return 2;
    }
    if (globals.mHelp) {
        std::cout << kSyncUsage << kSyncHelp << "\n" << kGlobalOptionsHelp;
        return 0;
    }
    ApplyGlobalOptions(globals);
    EnsurePrefDir();
    job.mServer = globals.mServer;
    job.mClientId = globals.mClientId;
    job.mToken = globals.mToken;
    job.mAutoLogin = globals.mAutoLogin;
    const Output output = globals.mJson ? Output::Json : globals.mQuiet ? Output::Quiet : Output::Text;
    return RunSyncJob(job, output, std::cout, std::cerr);
}

}  // namespace cli
}  // namespace tolmonetsync
