// The tolmonetsync command: global options, then a command word and its
// own options.

#include <malloc.h>

#include <iostream>
#include <string>
#include <vector>

#include "cli/BackupCommands.h"
#include "cli/CommandLine.h"
#include "cli/DemoCommand.h"
#include "cli/DoctorCommand.h"
#include "cli/ServeCommand.h"
#include "cli/SignInCommands.h"
#include "cli/SyncCommand.h"

namespace {

using namespace tolmonetsync::cli;

const char kUsage[] =
    "usage: tolmonetsync [global options] COMMAND [options]\n"
    "commands:\n"
    "  serve    run the local asset service\n"
    "  login    sign in and store the sign-in\n"
    "  logout   forget the stored sign-in\n"
    "  status   connected, not-logged-in or connection-failed\n"
    "  sync     keep directories and files in step with the asset service\n"
    "  demo     the main job end to end on a local service with temporary data\n"
    "  backups  the backup copies, newest run first, with where each came from and why\n"
    "  restore  PATH [--from RUN]: put back a backup copy (the current file is backed up first)\n"
    "  doctor   sign-in, connection, clock, cache file, leftovers, names, backups: what needs attention\n"
    "'tolmonetsync --version' prints the version.\n"
    "'tolmonetsync COMMAND --help' tells more.\n";

int RunCommand(const std::string& command, const GlobalOptions& globals, const std::vector<std::string>& rest)
{
    if (command == "serve") return RunServe(globals, rest);
    if (command == "sync") return RunSync(globals, rest);
    if (command == "demo") return RunDemo(globals, rest);
    if (command == "login") return RunLogin(globals, rest);
    if (command == "logout") return RunLogout(globals, rest);
    if (command == "status") return RunStatus(globals, rest);
    if (command == "backups") return RunBackups(globals, rest);
    if (command == "restore") return RunRestore(globals, rest);
    if (command == "doctor") return RunDoctor(globals, rest);
    if (command == "help") {
        std::cout << kUsage << "\n" << kGlobalOptionsHelp;
        return 0;
    }
    std::cerr << "tolmonetsync: unknown command '" << command << "'\n" << kUsage;
    return 2;
}

}  // namespace

int main(int argc, char** argv)
{
    // Each of the library's threads would otherwise get a heap arena of its
    // own; two keep a large sync's peak down without slowing it.
    mallopt(M_ARENA_MAX, 2);
    const std::vector<std::string> arguments(argv + 1, argv + argc);
    GlobalOptions globals;
    std::size_t index = 0;
    try {
        while (index < arguments.size() && ReadGlobalOption(arguments, index, globals)) ++index;
        if (index < arguments.size() && arguments[index] == "--version") {
            std::cout << "tolmonetsync " << TOLMONETSYNC_VERSION << "\n";
            return 0;
        }
    } catch (const UsageError& e) {
        std::cerr << "tolmonetsync: " << e.what() << "\n" << kUsage;
        return 2;
    }
    if (index >= arguments.size()) {
        if (globals.mHelp) {
            std::cout << kUsage << "\n" << kGlobalOptionsHelp;
            return 0;
        }
        std::cerr << "tolmonetsync: no command given\n" << kUsage;
        return 2;
    }
    const std::string& command = arguments[index];
    const std::vector<std::string> rest(arguments.begin() + static_cast<long>(index) + 1, arguments.end());
    try {
        return RunCommand(command, globals, rest);
    } catch (const std::exception& e) {
        // A refused preference directory, for one: the reason, on one line.
        std::cerr << "tolmonetsync " << command << ": " << e.what() << "\n";
        return 1;
    }
}
