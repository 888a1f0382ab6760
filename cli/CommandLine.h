#pragma once
// What every command shares: the global options, how a person's mistake in
// the arguments is reported, and the host identity the options set.

#include <stdexcept>
#include <string>
#include <vector>

namespace tolmonetsync {
namespace cli {

// Bad usage: the command prints the message and its usage line, and exits 2.
struct UsageError : std::invalid_argument {
    using std::invalid_argument::invalid_argument;
};

struct GlobalOptions {
    std::string mServer;          // asset service base URL; empty: the built-in one
    std::string mIdentityServer;  // identity service base URL; empty: the built-in one
    std::string mClientId = "tolmonetsync";
    std::string mToken;      // --token or --token-file, else TOLMONETSYNC_TOKEN
    std::string mTokenFile;  // --token-file: mToken was read from it
    bool mAutoLogin = false;
    std::string mPrefDir;
    bool mAllowSharedPrefDir = false;  // --allow-shared-pref-dir
    bool mSystemKeychain = false;      // --keychain system
    std::string mCompany = "Tolmonet";
    std::string mApp = "tolmonetsync";
    std::string mAppVersion = "1.0";
    std::string mTrace;
    std::string mCaFile;  // --ca-file: certificates to trust instead of the system's
    bool mJson = false;
    bool mQuiet = false;
    bool mHelp = false;
};

// Reads the global option at arguments[index], if it is one, advancing index
// past its value. False if arguments[index] is not a global option. Throws
// UsageError for a global option without its value.
bool ReadGlobalOption(const std::vector<std::string>& arguments, std::size_t& index, GlobalOptions& options);

// The value of the option at arguments[index], advancing past it; UsageError
// if there is none.
const std::string& OptionValue(const std::vector<std::string>& arguments, std::size_t& index);

// Sets the host identity, the preference directory and tracing from the
// options, and the token from TOLMONETSYNC_TOKEN when neither --token nor
// --token-file was given. Warns on stderr about a token given as an argument.
// --ca-file becomes TOLMONETSYNC_CA_FILE, which the request processor reads
// when it is made: call this before anything sends a request.
void ApplyGlobalOptions(GlobalOptions& options);

// Makes the preference directory if it is missing (0700): the library keeps
// the cache file, backups and stored sign-in there and expects it to exist,
// as a host's does. Throws, naming it, for a directory that another user owns
// or could write, unless --allow-shared-pref-dir was given.
void EnsurePrefDir();

extern const char kGlobalOptionsHelp[];

}  // namespace cli
}  // namespace tolmonetsync
