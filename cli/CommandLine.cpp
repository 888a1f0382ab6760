#include "cli/CommandLine.h"

#include <cstdlib>
#include <filesystem>
#include <iostream>

#include "cli/TokenFile.h"
#include "foundation/core/Dir.h"
#include "foundation/core/HostConfig.h"
#include "foundation/core/Keychain.h"
#include "foundation/core/Trace.h"
#include "identity/OvraAuth.h"

namespace tolmonetsync {
namespace cli {

using tolmocore::utility::ToUTF16;

const char kGlobalOptionsHelp[] =
    "global options (before or after the command):\n"
    "  --server URL             asset service base URL (for instance http://127.0.0.1:8080/api)\n"
    "  --identity-server URL    identity service base URL (for instance http://127.0.0.1:8080/ovra)\n"
    "  --client-id ID           client identifier: the name of this client's root collection\n"
    "                           (default tolmonetsync)\n"
    "  --token TOKEN            use this access token as given (also TOLMONETSYNC_TOKEN); other\n"
    "                           local users can read arguments: prefer the variable or --token-file\n"
    "  --token-file FILE        read the access token from the first line of FILE, which only its\n"
    "                           owner may read (chmod 600)\n"
    "  --auto-login             sign in from TOLMONETSYNC_USERNAME and TOLMONETSYNC_PASSWORD\n"
    "  --pref-dir DIR           host preference directory: cache file, last-user file, backups,\n"
    "                           keychain store\n"
    "  --allow-shared-pref-dir  use a preference directory that another user owns or can write\n"
    "  --keychain file|system   where the sign-in's tokens are kept: the private store in the\n"
    "                           preference directory (default) or the desktop's Secret Service;\n"
    "                           reads fall back to the store in the preference directory\n"
    "  --company NAME --app NAME --app-version X.Y\n"
    "                           host identity (default Tolmonet, tolmonetsync, 1.0)\n"
    "  --ca-file FILE           trust the certificates in this PEM file instead of the system's\n"
    "                           (also TOLMONETSYNC_CA_FILE), for a service with its own certificate\n"
    "  --trace SPEC             as TOLMONETSYNC_TRACE; lines go to stderr\n"
    "  --json                   machine-readable results on stdout\n"
    "  -q, --quiet              print nothing but errors\n";

const std::string& OptionValue(const std::vector<std::string>& arguments, std::size_t& index)
{
    if (index + 1 >= arguments.size()) throw UsageError(arguments[index] + " needs a value");
    return arguments[++index];
}

bool ReadGlobalOption(const std::vector<std::string>& arguments, std::size_t& index, GlobalOptions& options)
{
    const std::string& option = arguments[index];
    if (option == "--server") {
        options.mServer = OptionValue(arguments, index);
    } else if (option == "--identity-server") {
        options.mIdentityServer = OptionValue(arguments, index);
        if (options.mIdentityServer.empty()) throw UsageError("--identity-server must not be empty");
    } else if (option == "--client-id") {
        options.mClientId = OptionValue(arguments, index);
        if (options.mClientId.empty()) throw UsageError("--client-id must not be empty");
    } else if (option == "--token") {
        if (!options.mTokenFile.empty()) throw UsageError("give --token or --token-file, not both");
        options.mToken = OptionValue(arguments, index);
        if (options.mToken.empty()) throw UsageError("--token must not be empty");
    } else if (option == "--token-file") {
        if (!options.mToken.empty() && options.mTokenFile.empty())
            throw UsageError("give --token or --token-file, not both");
        options.mTokenFile = OptionValue(arguments, index);
        options.mToken = ReadTokenFile(options.mTokenFile);
    } else if (option == "--auto-login") {
        options.mAutoLogin = true;
    } else if (option == "--pref-dir") {
        options.mPrefDir = OptionValue(arguments, index);
    } else if (option == "--keychain") {
        const std::string& store = OptionValue(arguments, index);
        if (store != "file" && store != "system") throw UsageError("--keychain takes file or system");
        options.mSystemKeychain = store == "system";
    } else if (option == "--allow-shared-pref-dir") {
        options.mAllowSharedPrefDir = true;
    } else if (option == "--company") {
        options.mCompany = OptionValue(arguments, index);
    } else if (option == "--app") {
        options.mApp = OptionValue(arguments, index);
    } else if (option == "--app-version") {
        options.mAppVersion = OptionValue(arguments, index);
    } else if (option == "--ca-file") {
        options.mCaFile = OptionValue(arguments, index);
        if (!std::filesystem::is_regular_file(options.mCaFile))
            throw UsageError("--ca-file: no such file " + options.mCaFile);
    } else if (option == "--trace") {
        options.mTrace = OptionValue(arguments, index);
    } else if (option == "--json") {
        options.mJson = true;
    } else if (option == "-q" || option == "--quiet") {
        options.mQuiet = true;
    } else if (option == "-h" || option == "--help") {
        options.mHelp = true;
    } else {
        return false;
    }
    return true;
}

void ApplyGlobalOptions(GlobalOptions& options)
{
    using namespace tolmocore::config;
    SetCompanyName(ToUTF16(options.mCompany));
    SetClientName(ToUTF16(options.mApp));
    SetClientInternalVersion(ToUTF16(options.mAppVersion));
    using tolmocore::filesupport::Dir;
    if (!options.mPrefDir.empty())
        Dir::SetPrefDir(Dir(ToUTF16(std::filesystem::absolute(options.mPrefDir).lexically_normal().string())));
    Dir::SetAllowSharedPrefDir(options.mAllowSharedPrefDir);
    tolmocore::Keychain::SetStore(options.mSystemKeychain ? tolmocore::KeychainStore_System
                                                          : tolmocore::KeychainStore_File);
    if (!options.mTrace.empty()) tolmocore::debug::SetTraceSpec(options.mTrace);
    if (!options.mCaFile.empty())
        ::setenv("TOLMONETSYNC_CA_FILE", std::filesystem::absolute(options.mCaFile).string().c_str(), 1);
    if (!options.mIdentityServer.empty())
        SetOvraServiceURL(UTF8String(options.mIdentityServer.begin(), options.mIdentityServer.end()));
    if (!options.mToken.empty() && options.mTokenFile.empty())
        std::cerr << "tolmonetsync: warning: other local users can read the --token argument; use "
                     "TOLMONETSYNC_TOKEN or --token-file instead\n";
    if (options.mToken.empty()) {
        const char* token = std::getenv("TOLMONETSYNC_TOKEN");
        if (token != nullptr) options.mToken = token;
    }
}

void EnsurePrefDir()
{
    using tolmocore::filesupport::Dir;
    Dir::CheckPrefDir();
    Dir::PrefDir().CreatePrivate();
}

}  // namespace cli
}  // namespace tolmonetsync
