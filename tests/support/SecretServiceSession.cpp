#include "support/SecretServiceSession.h"

#include <signal.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <memory>
#include <mutex>
#include <sstream>

#include "support/LeakSuppressions.h"

namespace testsupport {
namespace {

// Prints the bus daemon's pid and address, then "ready" once the keyring
// daemon answers for the default collection. Its password is a fixed test
// one: an empty password leaves no default collection to store into.
const char kStartScript[] = R"sh(
set -e
export HOME="$1" XDG_RUNTIME_DIR="$1/run"
mkdir -m 700 -p "$XDG_RUNTIME_DIR"
bus=$(dbus-daemon --session --fork --print-address=1 --print-pid=1 2>>"$1/daemons.log")
address=$(printf '%s\n' "$bus" | sed -n 1p)
printf '%s\n' "$bus" | sed -n 2p
printf '%s\n' "$address"
export DBUS_SESSION_BUS_ADDRESS="$address"
printf 'test-keyring' | gnome-keyring-daemon --unlock --components=secrets >/dev/null 2>>"$1/daemons.log"
gdbus wait --session --timeout 20 org.freedesktop.secrets >>"$1/daemons.log" 2>&1
gdbus call --session --dest org.freedesktop.secrets --object-path /org/freedesktop/secrets \
    --method org.freedesktop.Secret.Service.ReadAlias default 2>>"$1/daemons.log" | grep -q collection/
echo ready
)sh";

std::string RunShell(const std::string& command, int& status)
{
    std::string text;
    FILE* output = ::popen(command.c_str(), "r");
    if (output == nullptr) {
        status = -1;
        return text;
    }
    char buffer[512];
    while (std::fgets(buffer, sizeof buffer, output) != nullptr) text += buffer;
    status = ::pclose(output);
    return text;
}

}  // namespace

SecretServiceSession::SecretServiceSession()
{
    const std::filesystem::path script = mHome / "start.sh";
    WriteFileBytes(script, kStartScript);
    int status = 0;
    const std::string text = RunShell("sh '" + script.string() + "' '" + mHome.Path().string() + "' 2>&1", status);
    std::istringstream lines(text);
    std::string pid, ready;
    std::getline(lines, pid);
    std::getline(lines, mAddress);
    std::getline(lines, ready);
    if (!pid.empty() && pid.find_first_not_of("0123456789") == std::string::npos) mBus = std::stoi(pid);
    if (status != 0 || ready != "ready" || mAddress.rfind("unix:", 0) != 0) {
        std::ifstream log(mHome / "daemons.log");
        std::ostringstream logText;
        logText << log.rdbuf();
        mWhyNot = "no private Secret Service (needs dbus-daemon, gnome-keyring and gdbus): " + text + logText.str();
    }
}

// The keyring daemon leaves when its bus goes.
SecretServiceSession::~SecretServiceSession()
{
    if (mBus > 0) ::kill(mBus, SIGTERM);
}

bool SecretServiceSession::Ready(std::string& whyNot) const
{
    whyNot = mWhyNot;
    return mWhyNot.empty();
}

bool SecretServiceSession::LockDefaultCollection() const
{
    int status = 0;
    const std::string answer =
        RunShell(BusVariable() +
                     " gdbus call --session --dest org.freedesktop.secrets --object-path /org/freedesktop/secrets"
                     " --method org.freedesktop.Secret.Service.Lock \"['/org/freedesktop/secrets/collection/login']\"",
                 status);
    return status == 0 && answer.find("collection/login") != std::string::npos;
}

bool StartSecretServiceSession(std::string& whyNot)
{
    static std::once_flag sOnce;
    static std::unique_ptr<SecretServiceSession> sSession;
    std::call_once(sOnce, [] {
        sSession = std::make_unique<SecretServiceSession>();
        std::string unused;
        if (!sSession->Ready(unused)) return;
        ::setenv("DBUS_SESSION_BUS_ADDRESS", sSession->BusVariable().substr(sizeof "DBUS_SESSION_BUS_ADDRESS").c_str(),
                 1);
        const std::string suppressions = (sSession->Home() / "lsan.supp").string();
        WriteFileBytes(suppressions, kLeakSuppressions);
        const char* options = std::getenv("LSAN_OPTIONS");
        const std::string combined =
            (options != nullptr && *options != '\0' ? std::string(options) + ":" : "") + "suppressions=" + suppressions;
        ::setenv("LSAN_OPTIONS", combined.c_str(), 1);
    });
    return sSession->Ready(whyNot);
}

}  // namespace testsupport
