#include "cli/ServeCommand.h"

#include <chrono>
#include <csignal>
#include <cstdio>
#include <iostream>
#include <stdexcept>

#include <pthread.h>

#include "server/DataDirectoryLock.h"
#include "server/LocalService.h"
#include "server/SecretFiles.h"
#include "server/ServiceArguments.h"

namespace tolmonetsync {
namespace cli {
namespace {

const char kServeUsage[] =
    "usage: tolmonetsync serve --data DIR [--listen HOST:PORT] [--users-file FILE] [--tokens-file FILE]\n"
    "         [--user NAME:PASSWORD[:EMAIL]]... [--token NAME:TOKEN]... [--token-ttl SECONDS]\n"
    "         [--denied-user NAME]... [--cert FILE --key FILE] [--max-upload BYTES]\n";
const char kServeHelp[] =
    "\n"
    "Runs the local asset service (under /api) and identity service (under /ovra) in the foreground until SIGINT or "
    "SIGTERM.\n"
    "  --data DIR          where users, tokens and content are kept (made 0700 if missing); one\n"
    "                      service at a time may use it\n"
    "  --listen HOST:PORT  the address to listen on (default 127.0.0.1:0; port 0 picks a free one)\n"
    "  --users-file FILE   creates or updates the users of FILE, one NAME:PASSWORD[:EMAIL] a line\n"
    "                      ('#' starts a comment line); FILE must be readable by its owner alone\n"
    "  --tokens-file FILE  grants the fixed access tokens of FILE, one NAME:TOKEN a line; owner alone\n"
    "  --user NAME:PASSWORD[:EMAIL]   creates or updates a user (other local users can read\n"
    "                      command lines: prefer --users-file)\n"
    "  --token NAME:TOKEN  grants the user a fixed access token (prefer --tokens-file)\n"
    "  --token-ttl SECONDS access tokens expire after this long (the fixed ones too; signed-in\n"
    "                      ones after an hour without it)\n"
    "  --denied-user NAME  the user's sign-in is refused (access denied) even with the right password\n"
    "  --cert FILE --key FILE   serve HTTPS with this certificate (chain) and private key, both PEM;\n"
    "                      clients that do not trust its issuer take --ca-file FILE\n"
    "  --max-upload BYTES  uploads larger than this are refused with 413 (default 1073741824, 1 GiB)\n"
    "The identity service is under /ovra. The first line on stdout is \"listening on http://HOST:PORT\"\n"
    "(https with a certificate).\n";

// A whole number of milliseconds, 0 or more.
std::chrono::milliseconds ParseMilliseconds(const std::string& text)
{
    if (text.empty() || text.size() > 9 || text.find_first_not_of("0123456789") != std::string::npos)
        throw UsageError("expected a number of milliseconds");
    return std::chrono::milliseconds(std::stol(text));
}

template <typename Entry>
void Append(std::vector<Entry>& entries, const std::vector<Entry>& more)
{
    entries.insert(entries.end(), more.begin(), more.end());
}

struct ServeArguments {
    server::LocalServiceOptions mOptions;
    bool mSecretOnCommandLine = false;  // --user or --token
};

ServeArguments ParseServe(GlobalOptions& globals, const std::vector<std::string>& arguments)
{
    ServeArguments parsed;
    server::LocalServiceOptions& options = parsed.mOptions;
    for (size_t i = 0; i < arguments.size(); ++i) {
        const std::string& option = arguments[i];
        auto value = [&]() -> const std::string& { return OptionValue(arguments, i); };
        if (option == "--data") {
            options.mDataDirectory = value();
        } else if (option == "--listen") {
            server::ParseListenArgument(value(), options);
        } else if (option == "--user") {
            options.mUsers.push_back(server::ParseUserArgument(value()));
            parsed.mSecretOnCommandLine = true;
        } else if (option == "--users-file") {
            Append(options.mUsers, server::ReadUsersFile(value()));
        } else if (option == "--tokens-file") {
            Append(options.mTokens, server::ReadTokensFile(value()));
        } else if (option == "--dev-sign-in-delay-cap") {
            // Not in the help: lets tests of failed sign-ins run without waiting.
            options.mSignInDelays.mCap = ParseMilliseconds(value());
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
            parsed.mSecretOnCommandLine = true;
        } else if (!ReadGlobalOption(arguments, i, globals)) {
            throw UsageError("unknown option '" + option + "'");
        }
    }
    if (options.mDataDirectory.empty() && !globals.mHelp) throw UsageError("--data is required");
    if (options.mCertificateFile.empty() != options.mPrivateKeyFile.empty())
        throw UsageError("--cert and --key go together");
    return parsed;
}

}  // namespace

int RunServe(GlobalOptions globals, const std::vector<std::string>& arguments)
{
    ServeArguments parsed;
    try {
        parsed = ParseServe(globals, arguments);
    } catch (const std::invalid_argument& e) {
        std::cerr << "tolmonetsync serve: " << e.what() << "\n" << kServeUsage << std::flush;
        return 2;
    }
    if (globals.mHelp) {
        std::cout << kServeUsage << kServeHelp;
        return 0;
    }
    ApplyGlobalOptions(globals);
    const server::LocalServiceOptions& options = parsed.mOptions;
    if (parsed.mSecretOnCommandLine) {
        std::cerr << "tolmonetsync serve: warning: other local users can read command-line arguments; "
                     "give passwords and tokens with --users-file and --tokens-file instead"
                  << std::endl;
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
        std::cout << "listening on " << (service.Secure() ? "https://" : "http://") << options.mHost << ":"
                  << service.Port() << std::endl;
        int received = 0;
        sigwait(&stopSignals, &received);
        service.Stop();
    } catch (const server::DataDirectoryInUse& e) {
        std::cerr << e.what() << std::endl;
        return 1;
    } catch (const std::exception& e) {
        std::cerr << "tolmonetsync serve: " << e.what() << std::endl;
        return 1;
    }
    return 0;
}

}  // namespace cli
}  // namespace tolmonetsync
