#include "cli/ServeCommand.h"

#include <csignal>
#include <cstdio>
#include <iostream>
#include <stdexcept>

#include <pthread.h>

#include "server/LocalService.h"

namespace tolmonetsync {
namespace cli {
namespace {

struct UsageError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

const char kServeUsage[] =
    "usage: tolmonetsync serve --data DIR [--listen HOST:PORT] [--user NAME:PASSWORD[:EMAIL]]... "
    "[--token NAME:TOKEN]...";

// "NAME:REST": the first colon splits.
std::pair<std::string, std::string> SplitOnce(const std::string& text, const char* what)
{
    const size_t colon = text.find(':');
    if (colon == std::string::npos || colon == 0 || colon + 1 == text.size())
        throw UsageError(std::string("expected ") + what + ", got '" + text + "'");
    return {text.substr(0, colon), text.substr(colon + 1)};
}

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
            const std::string listen = value();
            const size_t colon = listen.rfind(':');
            if (colon == std::string::npos) throw UsageError("--listen takes HOST:PORT");
            options.mHost = listen.substr(0, colon);
            try {
                size_t used = 0;
                options.mPort = std::stoi(listen.substr(colon + 1), &used);
                if (used != listen.size() - colon - 1 || options.mPort < 0 || options.mPort > 65535) throw 0;
            } catch (...) {
                throw UsageError("--listen has no valid port: '" + listen + "'");
            }
        } else if (option == "--user") {
            const auto user = SplitOnce(value(), "NAME:PASSWORD[:EMAIL]");
            const size_t colon = user.second.find(':');
            server::ServiceUser entry;
            entry.mName = user.first;
            entry.mPassword = user.second.substr(0, colon);
            if (colon != std::string::npos) entry.mEmail = user.second.substr(colon + 1);
            options.mUsers.push_back(entry);
        } else if (option == "--token") {
            const auto token = SplitOnce(value(), "NAME:TOKEN");
            options.mTokens.push_back({token.first, token.second});
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
    } catch (const UsageError& e) {
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
