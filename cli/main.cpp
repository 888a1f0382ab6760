// The tolmonetsync command: parses the command word and hands the rest on.

#include <iostream>
#include <string>
#include <vector>

#include "cli/ServeCommand.h"

namespace {

const char kUsage[] =
    "usage: tolmonetsync COMMAND [options]\n"
    "  serve    run the local asset service (see 'tolmonetsync serve --help')\n";

}  // namespace

int main(int argc, char** argv)
{
    if (argc < 2) {
        std::cerr << kUsage;
        return 2;
    }
    const std::string command = argv[1];
    const std::vector<std::string> arguments(argv + 2, argv + argc);
    if (command == "serve") return tolmonetsync::cli::RunServe(arguments);
    if (command == "--help" || command == "-h" || command == "help") {
        std::cout << kUsage;
        return 0;
    }
    std::cerr << "tolmonetsync: unknown command '" << command << "'\n" << kUsage;
    return 2;
}
