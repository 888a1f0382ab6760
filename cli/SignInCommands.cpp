#include "cli/SignInCommands.h"

#include <condition_variable>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <memory>
#include <mutex>

#include "cli/PrintableName.h"
#include "cli/SyncJob.h"
#include "cli/SyncRun.h"
#include "foundation/core/Dir.h"
#include "foundation/core/HostConfig.h"
#include "foundation/core/Keychain.h"
#include "identity/OvraAuth.h"
#include "sync/SyncFilesService.h"
#include "tarnvault/LastUserFile.h"
#include "tarnvault/Tarnvault.h"

namespace tolmonetsync {
namespace cli {

namespace {

using tolmocore::utility::ToNarrow;
using tolmocore::utility::ToUTF16;

const char kLoginUsage[] = "usage: tolmonetsync [global options] login --user NAME [--password-stdin]\n";
const char kLoginHelp[] =
    "\n"
    "Signs in at the identity service and stores the sign-in for this host identity in the\n"
    "preference directory (the tokens in its keychain store, or with --keychain system in the\n"
    "desktop's Secret Service). The password comes from standard\n"
    "input with --password-stdin, or else from TOLMONETSYNC_PASSWORD; never from an argument.\n";
const char kLogoutUsage[] = "usage: tolmonetsync [global options] logout\n";
const char kStatusUsage[] = "usage: tolmonetsync [global options] status\n";
const char kStatusHelp[] =
    "\nPrints connected, not-logged-in or connection-failed for the stored sign-in; exit status 0\n"
    "only when connected.\n";

// The identity service gives every sign-in a device token; the command keeps
// it beside the library's tokens so that logout can withdraw it.
UTF16String DeviceTokenDomain()
{
    return OvraKeychainDomain(u"Device");
}
const char16_t kDeviceTokenAccount[] = u"last";

// The library's Logout forgets who signed in but leaves that user's tokens in
// the keychain; signing out on the command line removes them as well. Call it
// before Logout, which removes the last-user file that names the user. False
// if tokens may be left behind.
bool RemoveStoredTokens()
{
    const tolmocore::filesupport::Dir pref = tolmocore::filesupport::Dir::PrefDir();
    std::ifstream file(ToNarrow(pref.FullPath()) + "/tarnvaultuser.txt", std::ios::binary);
    if (!file) return true;  // nobody signed in
    const std::string text((std::istreambuf_iterator<char>(file)), std::istreambuf_iterator<char>());
    UTF8String user;
    try {
        user = tarnvault::ParseLastUserText(UTF8String(text));
    } catch (const std::exception&) {
        return false;
    }
    if (user.empty()) return true;
    using tolmocore::security::Keychain;
    const UTF16String account = tolmocore::utility::UTF8to16(user);
    const bool access = Keychain::RemovePassword(OvraKeychainDomain(u"Access"), account);
    const bool refresh = Keychain::RemovePassword(OvraKeychainDomain(u"Refresh"), account);
    return access && refresh;
}

UTF8String Utf8(const std::string& text)
{
    return UTF8String(text.begin(), text.end());
}

// Reads the options every sign-in command shares; only `login` takes more.
bool ReadCommandOptions(GlobalOptions& globals, const std::vector<std::string>& arguments, std::string* user,
                        bool* passwordStdin)
{
    for (std::size_t i = 0; i < arguments.size(); ++i) {
        if (ReadGlobalOption(arguments, i, globals)) continue;
        if (user != nullptr && arguments[i] == "--user") {
            *user = OptionValue(arguments, i);
        } else if (passwordStdin != nullptr && arguments[i] == "--password-stdin") {
            *passwordStdin = true;
        } else {
            throw UsageError(std::string("unknown option '") + arguments[i] + "'");
        }
    }
    return globals.mHelp;
}

boost::shared_ptr<SyncServer> MakeClient(const GlobalOptions& globals)
{
    SyncJob job;
    job.mServer = globals.mServer;
    job.mClientId = globals.mClientId;
    return CreateSyncFilesService(SyncServiceType_Tarnvault, MakeJobParameters(job))->GetApi();
}

OvraAuth_Scheme SchemeFor(const GlobalOptions& globals)
{
    return globals.mServer == tarnvault::kStaging.ToStdString() ? OvraAuth_Stage : OvraAuth_GM;
}

int Usage(const char* command, const char* usage, const std::string& why)
{
    std::cerr << "tolmonetsync " << command << ": " << why << "\n" << usage;
    return 2;
}

// The reason may quote the service's answer.
int Fail(const char* command, const std::string& why)
{
    std::cerr << "tolmonetsync " << command << ": " << PrintableName(why) << std::endl;
    return 1;
}

struct SignInAnswer {
    std::mutex mMutex;
    std::condition_variable mCame;
    bool mDone = false;
    OvraResponse mAnswer;
    boost::shared_ptr<tolmonet::Response> mResponse;
};

}  // namespace

UTF16String OvraKeychainDomain(const char16_t* kind)
{
    using namespace tolmocore::config;
    return GetCompanyName() + u" " + GetClientName() + u" " + GetClientInternalVersion() + u" OVRA " + kind;
}

const char* ConnectionStateName(SyncServer_ConnectionState state)
{
    switch (state) {
        case SyncServer_Connected:
            return "connected";
        case SyncServer_NotLoggedIn:
            return "not-logged-in";
        default:
            break;
    }
    return "connection-failed";
}

int RunLogin(GlobalOptions globals, const std::vector<std::string>& arguments)
{
    std::string user;
    bool passwordStdin = false;
    try {
        if (ReadCommandOptions(globals, arguments, &user, &passwordStdin)) {
            std::cout << kLoginUsage << kLoginHelp;
            return 0;
        }
        if (user.empty()) throw UsageError("--user is required");
    } catch (const UsageError& e) {
        return Usage("login", kLoginUsage, e.what());
    }
    ApplyGlobalOptions(globals);
    EnsurePrefDir();
    std::string password;
    if (passwordStdin) {
        std::getline(std::cin, password);
        if (!password.empty() && password.back() == '\r') password.pop_back();
    } else if (const char* fromEnvironment = std::getenv("TOLMONETSYNC_PASSWORD")) {
        password = fromEnvironment;
    }
    if (password.empty()) return Fail("login", "no password: give --password-stdin or set TOLMONETSYNC_PASSWORD");
    // Before signing in: a sign-in that cannot be kept would be lost.
    std::string keychainTrouble;
    if (globals.mSystemKeychain && !tolmocore::security::Keychain::SystemStoreUsable(keychainTrouble))
        return Fail("login", "the system keychain cannot keep the sign-in: " + keychainTrouble);

    const auto answer = std::make_shared<SignInAnswer>();
    const Guid sent = OvraAuthenticate(
        SchemeFor(globals),
        [answer](OvraAuth_Scheme, const OvraResponse& response, const boost::shared_ptr<tolmonet::Response>& http) {
            std::lock_guard<std::mutex> lock(answer->mMutex);
            answer->mAnswer = response;
            answer->mResponse = http;
            answer->mDone = true;
            answer->mCame.notify_all();
        },
        Utf8(user), Utf8(password), Utf8("tolmonetsync-cli"), UTF8String(), UTF8String(), UTF8String(), UTF8String(),
        UTF8String());
    if (sent.IsNil()) return Fail("login", "could not send the sign-in request");
    {
        std::unique_lock<std::mutex> lock(answer->mMutex);
        answer->mCame.wait(lock, [&] { return answer->mDone; });
    }
    const tolmonet::Response& http = *answer->mResponse;
    if (http.status < 200 || http.status > 299 || answer->mAnswer.access_token.empty()) {
        const std::string why = !answer->mAnswer.errorMessage.empty() ? ToNarrow(answer->mAnswer.errorMessage)
                                                                      : http.BodyText().ToStdString();
        return Fail("login", why.empty() ? "the sign-in was refused" : why);
    }

    OvraCredentials credentials;
    credentials.accessToken = answer->mAnswer.access_token;
    credentials.refreshToken = answer->mAnswer.refresh_token;
    credentials.userID = answer->mAnswer.userId;
    const boost::shared_ptr<SyncServer> client = MakeClient(globals);
    const SyncServer_ConnectionState state = WaitForConnectionState(
        [&](const ConnectionStateCallback& report) { return client->SetCredentials(report, credentials); });
    if (state != SyncServer_Connected)
        return Fail("login", std::string("signed in, but the asset service said ") + ConnectionStateName(state));
    tolmocore::security::Keychain::SetPassword(DeviceTokenDomain(), kDeviceTokenAccount,
                                               ToUTF16(answer->mAnswer.device_token.ToStdString()));
    if (!globals.mQuiet)
        std::cout << "signed in as " << PrintableName(user) << " (" << PrintableName(credentials.userID.ToStdString())
                  << ")\n";
    return 0;
}

int RunLogout(GlobalOptions globals, const std::vector<std::string>& arguments)
{
    try {
        if (ReadCommandOptions(globals, arguments, nullptr, nullptr)) {
            std::cout << kLogoutUsage << "\nForgets the stored sign-in and withdraws its device token.\n";
            return 0;
        }
    } catch (const UsageError& e) {
        return Usage("logout", kLogoutUsage, e.what());
    }
    ApplyGlobalOptions(globals);
    EnsurePrefDir();
    // The service forgets the device; the answer changes nothing here.
    const std::string device =
        ToNarrow(tolmocore::security::Keychain::GetPassword(DeviceTokenDomain(), kDeviceTokenAccount));
    if (!device.empty()) {
        const auto answered = std::make_shared<SignInAnswer>();
        const Guid sent = OvraLogout(
            SchemeFor(globals),
            [answered](OvraAuth_Scheme, const OvraResponse&, const boost::shared_ptr<tolmonet::Response>&) {
                std::lock_guard<std::mutex> lock(answered->mMutex);
                answered->mDone = true;
                answered->mCame.notify_all();
            },
            Utf8(device), UTF8String());
        if (!sent.IsNil()) {
            std::unique_lock<std::mutex> lock(answered->mMutex);
            answered->mCame.wait(lock, [&] { return answered->mDone; });
        }
        tolmocore::security::Keychain::RemovePassword(DeviceTokenDomain(), kDeviceTokenAccount);
    }
    const bool tokensRemoved = RemoveStoredTokens();
    const boost::shared_ptr<SyncServer> client = MakeClient(globals);
    WaitForConnectionState([&](const ConnectionStateCallback& report) { return client->Logout(report); });
    if (!tokensRemoved)
        return Fail("logout", "signed out, but the stored tokens could not be removed from the keychain");
    if (!globals.mQuiet) std::cout << "signed out\n";
    return 0;
}

int RunStatus(GlobalOptions globals, const std::vector<std::string>& arguments)
{
    try {
        if (ReadCommandOptions(globals, arguments, nullptr, nullptr)) {
            std::cout << kStatusUsage << kStatusHelp;
            return 0;
        }
    } catch (const UsageError& e) {
        return Usage("status", kStatusUsage, e.what());
    }
    ApplyGlobalOptions(globals);
    EnsurePrefDir();
    const boost::shared_ptr<SyncServer> client = MakeClient(globals);
    const SyncServer_ConnectionState state =
        WaitForConnectionState([&](const ConnectionStateCallback& report) { return client->CheckConnection(report); });
    std::cout << ConnectionStateName(state) << "\n";
    return state == SyncServer_Connected ? 0 : 1;
}

}  // namespace cli
}  // namespace tolmonetsync
