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

const char kServeUsage[] =
    "usage: tolmonetsync serve --data DIR [--listen HOST:PORT] [--user NAME:PASSWORD[:EMAIL]]...\n"
    "         [--token NAME:TOKEN]... [--token-ttl SECONDS] [--denied-user NAME]... [--cert FILE --key FILE]\n"
    "         [--max-upload BYTES]\n";
const char kServeHelp[] =
    "\n"
    "Runs the local asset service (under /api) and identity service (under /ovra) in the foreground until SIGINT or "
    "SIGTERM.\n"
    "  --data DIR          where users, tokens and content are kept (made if missing)\n"
    "  --listen HOST:PORT  the address to listen on (default 127.0.0.1:0; port 0 picks a free one)\n"
    "  --user NAME:PASSWORD[:EMAIL]   creates or updates a user\n"
    "  --token NAME:TOKEN  grants the user a fixed access token\n"
    "  --token-ttl SECONDS access tokens expire after this long (the fixed ones too; signed-in\n"
    "                      ones after an hour without it)\n"
    "  --denied-user NAME  the user's sign-in is refused (access denied) even with the right password\n"
    "  --cert FILE --key FILE   serve HTTPS with this certificate (chain) and private key, both PEM;\n"
    "                      clients that do not trust its issuer take --ca-file FILE\n"
    "  --max-upload BYTES  uploads larger than this are refused with 413 (default 1073741824, 1 GiB)\n"
    "The identity service is under /ovra. The first line on stdout is \"listening on http://HOST:PORT\"\n"
    "(https with a certificate).\n";

server::LocalServiceOptions ParseServe(GlobalOptions& globals, const std::vector<std::string>& arguments)
{
    server::LocalServiceOptions options;
    for (size_t i = 0; i < arguments.size(); ++i) {
        const std::string& option = arguments[i];
        auto value = [&]() -> const std::string& { return OptionValue(arguments, i); };
        if (option == "--data") {
            options.mDataDirectory = value();
        } else if (option == "--listen") {
            server::ParseListenArgument(value(), options);
        } else if (option == "--user") {
            options.mUsers.push_back(server::ParseUserArgument(value()));
        } else if (option == "--token-ttl") {
            options.mTokenTtlSeconds = server::ParseSecondsArgument(value());
        } else if (option == "--denied-user") {
            options.mDeniedUsers.push_back(value());
        } else if (option == "--cert") {
            options.mCertificateFile = value();
        } else if (option == "--key") {
            options.mPrivateKeyFile = value();
        } else if (option == "--max-upload") {
            options.mMaxUploadBytes = server::ParseBytesArgument(value());
        } else if (option == "--token") {
            // serve's own --token (NAME:TOKEN) comes before the global one.
            options.mTokens.push_back(server::ParseTokenArgument(value()));
        } else if (!ReadGlobalOption(arguments, i, globals)) {
            throw UsageError("unknown option '" + option + "'");
        }
    }
    if (options.mDataDirectory.empty() && !globals.mHelp) throw UsageError("--data is required");
    if (options.mCertificateFile.empty() != options.mPrivateKeyFile.empty())
        throw UsageError("--cert and --key go together");
    return options;
}

}  // namespace

int RunServe(GlobalOptions globals, const std::vector<std::string>& arguments)
{
    server::LocalServiceOptions options;
    try {
        options = ParseServe(globals, arguments);
    } catch (const std::invalid_argument& e) {
        std::cerr << "tolmonetsync serve: " << e.what() << "\n" << kServeUsage << std::flush;
        return 2;
    }
    if (globals.mHelp) {
        std::cout << kServeUsage << kServeHelp;
        return 0;
    }
    ApplyGlobalOptions(globals);

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
        std::cout << "listening on " << (service.Secure() ? "https://" : "http://") << options.mHost << ":"
                  << service.Port() << std::endl;
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
