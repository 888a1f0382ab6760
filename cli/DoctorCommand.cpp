#include "cli/DoctorCommand.h"

#include <iomanip>
#include <iostream>

#include <boost/json/serialize.hpp>

#include "cli/DoctorChecks.h"
#include "cli/DoctorProbe.h"
#include "cli/PrintableName.h"
#include "cli/Registrations.h"
#include "cli/SyncJob.h"
#include "foundation/core/Dir.h"
#include "sync/SyncFilesService.h"

namespace tolmonetsync {
namespace cli {

namespace {

using tolmocore::utility::ToNarrow;

const char kDoctorUsage[] = "usage: tolmonetsync [global options] doctor [--dir SPEC]... [--file SPEC]...\n";

const char kDoctorHelp[] =
    "\n"
    "Checks, one line each: the stored sign-in (keychain and last-user file agree), what the\n"
    "service says to it (accepted, expired, refused connection, TLS failure, server error), the\n"
    "clock against the service's, the cache file (parses, entries for unregistered or vanished\n"
    "files, written for someone else), unfinished downloads and writes beside registered files,\n"
    "registered directories missing or unreadable, names differing only in case or Unicode form,\n"
    "and the backups. Give the same --dir and --file as to sync. It changes nothing: one GET to\n"
    "the service and reading the disk. Exit status: 0 nothing needs attention, 1 something does,\n"
    "2 bad usage.\n";

struct DoctorRequest {
    std::vector<SyncDir> mDirs;
    std::vector<SyncFile> mFiles;
};

DoctorRequest ParseDoctor(GlobalOptions& globals, const std::vector<std::string>& arguments)
{
    DoctorRequest request;
    for (std::size_t i = 0; i < arguments.size(); ++i) {
        if (ReadGlobalOption(arguments, i, globals)) continue;
        if (arguments[i] == "--dir") {
            request.mDirs.push_back(ParseDirRegistration(OptionValue(arguments, i), false));
        } else if (arguments[i] == "--file") {
            request.mFiles.push_back(ParseFileRegistration(OptionValue(arguments, i), false));
        } else {
            throw UsageError("unknown option '" + arguments[i] + "'");
        }
    }
    return request;
}

// The preference directory may be missing (nothing synced yet) but never shared.
DoctorFinding CheckPrefDir(const std::string& path)
{
    try {
        tolmocore::filesupport::Dir::CheckPrefDir();
    } catch (const std::exception& e) {
        return {"preferences", true, PrintableName(e.what())};
    }
    std::error_code error;
    if (!std::filesystem::is_directory(path, error))
        return {"preferences", false, PrintableName(path) + " does not exist yet: nothing was synced here"};
    return {"preferences", false, PrintableName(path)};
}

void Print(const std::vector<DoctorFinding>& findings, const GlobalOptions& globals, std::ostream& out)
{
    std::size_t attention = 0;
    for (const DoctorFinding& finding : findings) attention += finding.mAttention ? 1 : 0;
    if (globals.mJson) {
        boost::json::array checks;
        for (const DoctorFinding& finding : findings)
            checks.push_back(boost::json::object{
                {"check", finding.mCheck}, {"attention", finding.mAttention}, {"detail", finding.mDetail}});
        out << boost::json::serialize(boost::json::object{{"ok", attention == 0}, {"checks", checks}}) << std::endl;
        return;
    }
    for (const DoctorFinding& finding : findings) {
        if (globals.mQuiet && !finding.mAttention) continue;
        out << std::left << std::setw(10) << (finding.mAttention ? "attention" : "ok") << std::setw(12)
            << finding.mCheck << finding.mDetail << "\n";
    }
    if (!globals.mQuiet)
        out << (attention == 0 ? std::string("nothing needs attention")
                               : std::to_string(attention) + " check(s) need attention")
            << "\n";
    out.flush();
}

}  // namespace

int RunDoctor(GlobalOptions globals, const std::vector<std::string>& arguments)
{
    DoctorRequest request;
    try {
        request = ParseDoctor(globals, arguments);
    } catch (const UsageError& e) {
        std::cerr << "tolmonetsync doctor: " << e.what() << "\n" << kDoctorUsage;
        return 2;
    }
    if (globals.mHelp) {
        std::cout << kDoctorUsage << kDoctorHelp << "\n" << kGlobalOptionsHelp;
        return 0;
    }
    ApplyGlobalOptions(globals);

    DoctorSetup setup;
    setup.mPrefDir = ToNarrow(tolmocore::filesupport::Dir::PrefDir().FullPath());
    setup.mDirs = request.mDirs;
    setup.mFiles = request.mFiles;
    // A client made only to name what it would use; it sends nothing.
    SyncJob job;
    job.mServer = globals.mServer;
    job.mClientId = globals.mClientId;
    const boost::shared_ptr<SyncServer> client =
        CreateSyncFilesService(SyncServiceType_Tarnvault, MakeJobParameters(job))->GetApi();
    setup.mService = client->mServerURL.ToStdString();
    setup.mPreferencesRoot = ToNarrow(client->GetPreferencesRootName());

    std::vector<DoctorFinding> findings;
    findings.push_back(CheckPrefDir(setup.mPrefDir.string()));
    std::string token;
    if (!globals.mToken.empty()) {
        findings.push_back({"sign-in", false, "the token given (--token, --token-file or TOLMONETSYNC_TOKEN)"});
        token = globals.mToken;
    } else if (globals.mAutoLogin) {
        findings.push_back({"sign-in", false, "--auto-login: signing in is not tried (it is no read)"});
    } else {
        const StoredSignIn stored = CheckStoredSignIn();
        findings.push_back(stored.mFinding);
        token = stored.mAccessToken;
        setup.mUser = stored.mUser;
    }
    for (const DoctorFinding& finding : ProbeService(setup.mService, globals.mClientId, token))
        findings.push_back(finding);
    findings.push_back(CheckCacheFile(setup));
    findings.push_back(CheckCacheOwner(setup));
    findings.push_back(CheckDirectories(setup));
    findings.push_back(CheckLeftovers(setup));
    findings.push_back(CheckNames(setup));
    findings.push_back(CheckBackups(setup));
    Print(findings, globals, std::cout);
    for (const DoctorFinding& finding : findings)
        if (finding.mAttention) return 1;
    return 0;
}

}  // namespace cli
}  // namespace tolmonetsync
