#include "cli/ServeCommand.h"

#include <csignal>
#include <cstdio>
#include <iostream>
#include <stdexcept>

#include <pthread.h>

#include "server/LocalService.h"
#include "server/ServiceArguments.h"

namespace tolmonetsync {
namespace cli {
namespace {

struct UsageError : std::invalid_argument {
    using std::invalid_argument::invalid_argument;
};

const char kServeUsage[] =
    "usage: tolmonetsync serve --data DIR [--listen HOST:PORT] [--user NAME:PASSWORD[:EMAIL]]... "
    "[--token NAME:TOKEN]...";

server::LocalServiceOptions ParseServe(const std::vector<std::string>& arguments)
{
    server::LocalServiceOptions options;
    for (size_t i = 0; i < arguments.size(); ++i) {
        const std::string& option = arguments[i];
        auto value = [&]() -> const std::string& {
            if (i + 1 >= arguments.size()) throw UsageError(option + " needs a value");
            return arguments[++i];
        };
        if (option == "--data") {
            options.mDataDirectory = value();
        } else if (option == "--listen") {
            server::ParseListenArgument(value(), options);
        } else if (option == "--user") {
            options.mUsers.push_back(server::ParseUserArgument(value()));
        } else if (option == "--token") {
            options.mTokens.push_back(server::ParseTokenArgument(value()));
        } else {
            throw UsageError("unknown option '" + option + "'");
        }
    }
    if (options.mDataDirectory.empty()) throw UsageError("--data is required");
    return options;
}

}  // namespace

int RunServe(const std::vector<std::string>& arguments)
{
    server::LocalServiceOptions options;
    try {
        options = ParseServe(arguments);
    } catch (const std::invalid_argument& e) {
        std::cerr << "tolmonetsync serve: " << e.what() << "\n" << kServeUsage << std::endl;
        return 2;
    }

    // Block the stop signals in every thread the service starts; this one
    // waits for them below.
    sigset_t stopSignals;
    sigemptyset(&stopSignals);
    sigaddset(&stopSignals, SIGINT);
    sigaddset(&stopSignals, SIGTERM);
    pthread_sigmask(SIG_BLOCK, &stopSignals, nullptr);

    try {
        server::LocalService service(options);
        service.Start();
        std::cout << "listening on http://" << options.mHost << ":" << service.Port() << std::endl;
        int received = 0;
        sigwait(&stopSignals, &received);
        service.Stop();
    } catch (const std::exception& e) {
        std::cerr << "tolmonetsync serve: " << e.what() << std::endl;
        return 1;
    }
    return 0;
}

}  // namespace cli
}  // namespace tolmonetsync
