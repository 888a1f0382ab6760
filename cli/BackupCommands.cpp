#include "cli/BackupCommands.h"

#include <filesystem>
#include <iostream>

#include <boost/json/serialize.hpp>

#include "cli/PrintableName.h"
#include "foundation/core/File.h"
#include "sync/BackupRestore.h"

namespace tolmonetsync {
namespace cli {

namespace {

const char kBackupsUsage[] = "usage: tolmonetsync [global options] backups\n";
const char kBackupsHelp[] =
    "\n"
    "Lists the backup directories under the preference directory, newest first, with each copy:\n"
    "why it was made, the file it came from, its group and name and its size. --json gives them\n"
    "as {\"runs\": [{\"run\", \"copies\": [...]}]}.\n";
const char kRestoreUsage[] = "usage: tolmonetsync [global options] restore PATH [--from RUN]\n";
const char kRestoreHelp[] =
    "\n"
    "Puts back the newest backup copy of the file at PATH, or the one of backup directory RUN.\n"
    "The present file is copied into a new backup directory first. Refused while a sync of the\n"
    "same preference directory runs. Exit status: 0 restored, 1 no copy or refused, 2 bad usage.\n";

int Usage(const char* command, const char* usage, const std::string& why)
{
    std::cerr << "tolmonetsync " << command << ": " << why << "\n" << usage;
    return 2;
}

boost::json::object EntryToJson(const BackupEntry& entry)
{
    boost::json::object json{{"path", entry.mPath},         {"copy", entry.mCopy},     {"group", entry.mGroup},
                             {"name", entry.mName},         {"reason", entry.mReason}, {"size", entry.mSize},
                             {"checksum", entry.mChecksum}, {"time", entry.mTime}};
    if (!entry.mReplaces.empty()) json["replaces"] = entry.mReplaces;
    return json;
}

void PrintRuns(const std::vector<BackupRun>& runs)
{
    if (runs.empty()) std::cout << "no backup copies\n";
    for (const BackupRun& run : runs) {
        std::cout << PrintableName(run.mRun) << "\n";
        for (const BackupEntry& copy : run.mCopies) {
            std::cout << "  " << copy.mReason << "  " << PrintableName(copy.mPath);
            if (!copy.mGroup.empty()) std::cout << " (" << PrintableName(copy.mGroup + "/" + copy.mName) << ")";
            if (copy.mCopy != copy.mName) std::cout << " as " << PrintableName(copy.mCopy);
            std::cout << ", " << copy.mSize << " bytes";
            if (!copy.mReplaces.empty()) std::cout << "; overwrote the copy of " << PrintableName(copy.mReplaces);
            std::cout << "\n";
        }
    }
}

}  // namespace

int RunBackups(GlobalOptions globals, const std::vector<std::string>& arguments)
{
    for (std::size_t i = 0; i < arguments.size(); ++i) {
        try {
            if (!ReadGlobalOption(arguments, i, globals)) throw UsageError("unknown option '" + arguments[i] + "'");
        } catch (const UsageError& e) {
            return Usage("backups", kBackupsUsage, e.what());
        }
    }
    if (globals.mHelp) {
        std::cout << kBackupsUsage << kBackupsHelp << "\n" << kGlobalOptionsHelp;
        return 0;
    }
    ApplyGlobalOptions(globals);
    const std::vector<BackupRun> runs = ListBackups();
    if (globals.mJson) {
        boost::json::array list;
        for (const BackupRun& run : runs) {
            boost::json::array copies;
            for (const BackupEntry& copy : run.mCopies) copies.push_back(EntryToJson(copy));
            list.push_back(boost::json::object{{"run", run.mRun}, {"copies", std::move(copies)}});
        }
        std::cout << boost::json::serialize(boost::json::object{{"runs", std::move(list)}}) << std::endl;
    } else if (!globals.mQuiet) {
        PrintRuns(runs);
    }
    return 0;
}

int RunRestore(GlobalOptions globals, const std::vector<std::string>& arguments)
{
    std::string path;
    std::string run;
    try {
        for (std::size_t i = 0; i < arguments.size(); ++i) {
            if (ReadGlobalOption(arguments, i, globals)) continue;
            if (arguments[i] == "--from") {
                run = OptionValue(arguments, i);
            } else if (!arguments[i].empty() && arguments[i][0] == '-') {
                throw UsageError("unknown option '" + arguments[i] + "'");
            } else if (path.empty()) {
                path = arguments[i];
            } else {
                throw UsageError("one PATH only");
            }
        }
        if (!globals.mHelp && path.empty()) throw UsageError("give the PATH of the file to restore");
    } catch (const UsageError& e) {
        return Usage("restore", kRestoreUsage, e.what());
    }
    if (globals.mHelp) {
        std::cout << kRestoreUsage << kRestoreHelp << "\n" << kGlobalOptionsHelp;
        return 0;
    }
    ApplyGlobalOptions(globals);
    EnsurePrefDir();  // a restore writes there: refused if others could change it
    // The index names files by the absolute paths the sync was given.
    const std::string absolute = std::filesystem::absolute(path).lexically_normal().string();
    RestoreResult result;
    try {
        result = RestoreFromBackup(tolmocore::filesupport::File(tolmocore::utility::ToUTF16(absolute)), run);
    } catch (const std::exception& e) {
        std::cerr << "tolmonetsync restore: " << PrintableName(e.what()) << std::endl;
        return 1;
    }
    if (globals.mJson) {
        boost::json::object json{{"restored", absolute}, {"from", EntryToJson(result.mFrom)}};
        json["fromRun"] = result.mFrom.mRun;
        json["backedUpTo"] = result.mBackedUpRun;
        std::cout << boost::json::serialize(json) << std::endl;
    } else if (!globals.mQuiet) {
        std::cout << "restored " << PrintableName(absolute) << " from " << PrintableName(result.mFrom.mRun) << "/"
                  << PrintableName(result.mFrom.mCopy) << " (" << result.mFrom.mReason << ")";
        if (!result.mBackedUpRun.empty())
            std::cout << "; the replaced file is in " << PrintableName(result.mBackedUpRun);
        std::cout << "\n";
    }
    return 0;
}

}  // namespace cli
}  // namespace tolmonetsync
